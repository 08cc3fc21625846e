#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

namespace ipmisel {

/// Base64 with padding (RFC 4648, clause 4).
std::string Base64(std::span<const std::uint8_t> bytes);
/// SHA-256 of a text in Base64, as a Content-Security-Policy names a style or a script.
std::string Sha256Base64(std::string_view text);

}  // namespace ipmisel
