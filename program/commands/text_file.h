#pragma once

#include <cstddef>
#include <string>

namespace ipmisel {

/// The whole text of a file that an option names. Throws Failure with the option's name when it
/// cannot be read, is no regular file, holds a NUL or has more than `maxSize` bytes.
std::string ReadTextFile(const std::string& name, const std::string& option, std::size_t maxSize);

}  // namespace ipmisel
