#include "plugins/standard/enterprise_names.h"

#include <fstream>

namespace standard {

std::string EnterpriseName(std::uint32_t number, const std::string& file) {
    std::ifstream in(file);
    const std::string wanted = std::to_string(number);
    std::string line;
    while (std::getline(in, line)) {
        if (line != wanted) continue;
        if (!std::getline(in, line)) break;
        const auto begin = line.find_first_not_of(" \t");
        if (begin == 0 || begin == std::string::npos) break;
        return line.substr(begin, line.find_last_not_of(" \t\r") + 1 - begin);
    }
    return "";
}

}  // namespace standard
