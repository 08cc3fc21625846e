#include "program/reports/json_text.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <type_traits>
#include <variant>

#include "base/text.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

std::string Escaped(char32_t c) {
    if (c < 0x10000) return Format("\\u%04x", static_cast<unsigned>(c));
    // Beyond the first plane JSON wants a pair of surrogates (RFC 8259, clause 7).
    const auto rest = static_cast<unsigned>(c) - 0x10000;
    return Format("\\u%04x\\u%04x", 0xD800 + (rest >> 10), 0xDC00 + (rest & 0x3FF));
}

/// The length of what stands as it is and is nothing but ASCII, as nearly every text.
std::size_t PlainLength(std::string_view text) {
    const auto* const end = std::find_if(text.begin(), text.end(), [](char c) {
        return c < ' ' || c > '~' || c == '"' ||
               c == '\\';  // a byte beyond ASCII is below or above
    });
    return static_cast<std::size_t>(end - text.begin());
}

void AppendText(std::string& out, std::string_view text) {
    out += '"';
    while (true) {
        const std::size_t plain = PlainLength(text);
        out += text.substr(0, plain);
        text.remove_prefix(plain);
        if (text.empty()) break;
        const Character character = FirstCharacter(text);
        if (!character.valid) {
            out += "\uFFFD";
        } else if (character.value == U'"' || character.value == U'\\') {
            out += '\\';
            out += text.front();
        } else if (character.value == U'\n') {
            out += "\\n";
        } else if (IsControl(character.value)) {
            out += Escaped(character.value);
        } else {
            out += text.substr(0, character.length);
        }
        text.remove_prefix(character.length);
    }
    out += '"';
}

void AppendPair(std::string& out, std::string_view name, std::string_view text, bool first) {
    if (!first) out += ", ";
    AppendText(out, name);
    out += ": ";
    AppendText(out, text);
}

void AppendValue(std::string& out, const std::string& text) { AppendText(out, text); }

void AppendValue(std::string& out, std::uint8_t byte) { out += std::to_string(byte); }

void AppendValue(std::string& out, std::int64_t number) { out += std::to_string(number); }

/// The shortest text that reads back as the same number; 20 stands as 20.0.
void AppendValue(std::string& out, double number) { out += nlohmann::json(number).dump(); }

void AppendValue(std::string& out, bool truth) { out += truth ? "true" : "false"; }

void AppendValue(std::string& out, tqrhost::Time time) { AppendText(out, TimeText(time)); }

template <typename Element>
void AppendValue(std::string& out, const std::vector<Element>& list) {
    out += '[';
    for (std::size_t i = 0; i < list.size(); ++i) {
        if (i > 0) out += ", ";
        AppendValue(out, list[i]);
    }
    out += ']';
}

void AppendValue(std::string& out, const tqrhost::ObjectPath& path) {
    out += '{';
    AppendPair(out, "class", path.className, true);
    out += ", \"keys\": {";
    for (std::size_t i = 0; i < path.keys.size(); ++i) {
        AppendPair(out, path.keys[i].first, path.keys[i].second, i == 0);
    }
    out += "}}";
}

}  // namespace

std::string JsonText(std::string_view text) {
    std::string out;
    AppendText(out, text);
    return out;
}

std::string JsonInstance(const tqrhost::Instance& instance) {
    std::string out = "{";
    AppendPair(out, "class", instance.className, true);
    out += ", \"properties\": {";
    bool first = true;
    for (const auto& [name, value] : instance.properties) {
        if (!first) out += ", ";
        first = false;
        AppendText(out, name);
        out += ": ";
        std::visit([&](const auto& each) { AppendValue(out, each); }, value);
    }
    out += "}}";
    return out;
}

}  // namespace ipmisel
