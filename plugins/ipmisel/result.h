#pragma once

namespace ipmisel {

/// Results of request and decoding operations.
constexpr unsigned kOk = 0;
constexpr unsigned kFailed = 1;
constexpr unsigned kEndOfData = 2;

}  // namespace ipmisel
