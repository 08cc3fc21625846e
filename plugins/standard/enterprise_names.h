#pragma once

#include <cstdint>
#include <string>

namespace standard {

/// Where systems that have IANA's list of enterprise numbers keep it (package ieee-data and
/// others).
inline constexpr const char* kEnterpriseNumbers = "/usr/share/misc/enterprise-numbers.txt";

/// The name of an enterprise by its number, from a file in the form of IANA's list: a line with the
/// decimal number, then a line of two blanks and the name. Empty when there is no such file, or no
/// such number in it.
std::string EnterpriseName(std::uint32_t number, const std::string& file = kEnterpriseNumbers);

}  // namespace standard
