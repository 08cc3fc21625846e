#pragma once

#include <optional>
#include <string>

namespace ipmisel {

/// The password: the first line of the file, else the environment variable IPMISEL_PASSWORD, else
/// what is typed at the terminal. Throws Failure when there is none to be had.
std::string ReadPassword(const std::optional<std::string>& file);

}  // namespace ipmisel
