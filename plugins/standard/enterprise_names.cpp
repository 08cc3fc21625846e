#include "plugins/standard/enterprise_names.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstring>
#include <fstream>
#include <optional>
#include <string_view>

namespace standard {
namespace {

constexpr std::streamoff kPart = 1 << 13;

/// A line that is a number, and where the line feed before it stands.
struct NumberLine {
    std::streamoff at;
    std::uint32_t number;
};

/// The first whole one in a part of the list.
std::optional<NumberLine> FirstNumber(std::string_view part) {
    for (auto at = part.find('\n'); at != std::string_view::npos; at = part.find('\n', at + 1)) {
        const char* const end = part.data() + part.size();
        std::uint32_t number = 0;
        const auto read = std::from_chars(part.data() + at + 1, end, number);
        if (read.ec == std::errc() && read.ptr != end && *read.ptr == '\n') {
            return NumberLine{static_cast<std::streamoff>(at), number};
        }
    }
    return std::nullopt;
}

/// Where to search from, as far as the list is in the order of its numbers, as IANA's is: it has
/// some million bytes.
std::streamoff Approach(std::ifstream& in, std::uint32_t number) {
    std::array<char, kPart> part;
    std::streamoff low = 0;
    std::streamoff high = in.seekg(0, std::ios::end).tellg();
    while (high - low > kPart) {
        const std::streamoff middle = low + (high - low) / 2;
        in.clear();
        in.seekg(middle).read(part.data(), part.size());
        const auto line =
            FirstNumber(std::string_view(part.data(), static_cast<std::size_t>(in.gcount())));
        if (!line || line->number > number) {
            high = middle;
        } else {
            low = middle + line->at;
        }
    }
    return low;
}

/// The line behind that of the number, from the line feed at `from` or the file's beginning on.
std::string LineBehind(std::ifstream& in, std::uint32_t number, std::streamoff from) {
    const std::string wanted = "\n" + std::to_string(number) + "\n";
    std::string text = from == 0 ? "\n" : "";
    std::size_t found = std::string::npos;
    std::size_t end = std::string::npos;
    std::array<char, kPart> part;
    in.clear();
    in.seekg(from);
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
    found += wanted.size();
    return text.substr(found, end - std::min(end, found));
}

}  // namespace

std::string EnterpriseName(std::uint32_t number, const std::string& file) {
    std::ifstream in;
    in.rdbuf()->pubsetbuf(nullptr, 0);  // parts are read as they are
    in.open(file);
    if (!in) return "";
    const std::streamoff from = Approach(in, number);
    std::string name = LineBehind(in, number, from);
    if (name.empty() && from > 0) name = LineBehind(in, number, 0);
    const auto begin = name.find_first_not_of(" \t");
    if (begin == 0 || begin == std::string::npos) return "";
    return name.substr(begin, name.find_last_not_of(" \t\r") + 1 - begin);
}

}  // namespace standard
