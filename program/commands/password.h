#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace ipmisel {

// A file "credential:NAME" is the credential that a service has under this name.

/// The password: the first line of the file, else the environment variable IPMISEL_PASSWORD, else
/// what is typed at the terminal. Throws Failure when there is none to be had.
std::string ReadPassword(const std::optional<std::string>& file);
/// The key of the BMC (Kg): the first line of the file, else the environment variable IPMISEL_KG,
/// as text or as 0x with hexadecimal digits; empty when there is neither. Throws Failure when it is
/// no key.
std::vector<std::uint8_t> ReadKg(const std::optional<std::string>& file);

}  // namespace ipmisel
