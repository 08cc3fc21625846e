#include "plugins/standard/enterprise_names.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <fstream>
#include <string_view>

namespace standard {
namespace {

/// The list has some million bytes, of which a name is looked for in each collection.
constexpr std::size_t kPart = 1 << 16;

}  // namespace

std::string EnterpriseName(std::uint32_t number, const std::string& file) {
    std::ifstream in;
    in.rdbuf()->pubsetbuf(nullptr, 0);  // parts are read as they are
    in.open(file);
    const std::string wanted = "\n" + std::to_string(number) + "\n";
    std::string text = "\n";
    std::size_t found = std::string::npos;
    std::size_t end = std::string::npos;
    std::array<char, kPart> part;
    while (end == std::string::npos && in) {
        in.read(part.data(), part.size());
        text.append(part.data(), static_cast<std::size_t>(in.gcount()));
        if (found == std::string::npos) {
            const void* const at = memmem(text.data(), text.size(), wanted.data(), wanted.size());
            if (at != nullptr) {
                found = static_cast<std::size_t>(static_cast<const char*>(at) - text.data());
            }
            // The number may begin in this part and end in the next one.
            if (found == std::string::npos) {
                text.erase(0, text.size() - std::min(text.size(), wanted.size()));
            }
        }
        if (found != std::string::npos) end = text.find('\n', found + wanted.size());
    }
    if (found == std::string::npos) return "";
    const auto name = std::string_view(text).substr(found + wanted.size(),
                                                    end - std::min(end, found + wanted.size()));
    const auto begin = name.find_first_not_of(" \t");
    if (begin == 0 || begin == std::string_view::npos) return "";
    return std::string(name.substr(begin, name.find_last_not_of(" \t\r") + 1 - begin));
}

}  // namespace standard
