#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>

namespace ipmi {

/// The answer of Get Self Test Results (IPMI 2.0, 20.4) in words: "passed", "not implemented", or
/// what failed, pieces separated by ", ". What the standard leaves to the manufacturer is given as
/// such with its bytes. Empty when there are fewer than two bytes.
std::optional<std::string> SelfTestText(std::span<const std::uint8_t> data);

}  // namespace ipmi
