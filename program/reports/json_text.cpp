#include "program/reports/json_text.h"

#include <algorithm>
#include <cstdint>
#include <variant>
#include <vector>

#include "base/text.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

constexpr auto kReplace = Json::error_handler_t::replace;

/// Nothing but ASCII and nothing to escape but line feeds, as nearly every text.
bool IsPlain(std::string_view text) {
    return std::all_of(text.begin(), text.end(), [](char c) {
        // A byte beyond ASCII is negative.
        return (c >= ' ' && c <= '~' && c != '"' && c != '\\') || c == '\n';
    });
}

void AppendPlain(std::string& out, std::string_view text) {
    for (auto end = text.find('\n'); end != std::string_view::npos; end = text.find('\n')) {
        out += text.substr(0, end);
        out += "\\n";
        text.remove_prefix(end + 1);
    }
    out += text;
}

std::string Escaped(char32_t c) {
    if (c < 0x10000) return Format("\\u%04x", static_cast<unsigned>(c));
    // Beyond the first plane JSON wants a pair of surrogates (RFC 8259, clause 7).
    const auto rest = static_cast<unsigned>(c) - 0x10000;
    return Format("\\u%04x\\u%04x", 0xD800 + (rest >> 10), 0xDC00 + (rest & 0x3FF));
}

void AppendQuoted(std::string& out, std::string_view text) {
    if (IsPlain(text)) {
        out += '"';
        AppendPlain(out, text);
        out += '"';
        return;
    }
    // The library leaves DEL, C1 and the marks of direction as they are, and has short forms for
    // some controls, of which only that of a line feed has ever stood in a report.
    const std::string json = Json(text).dump(-1, ' ', false, kReplace);
    for (std::string_view rest = json; !rest.empty();) {
        const Character character = FirstCharacter(rest);
        constexpr std::string_view kShort = "bfrt";
        const std::size_t form =
            character.value == U'\\' ? kShort.find(rest[1]) : std::string_view::npos;
        if (form != std::string_view::npos) {
            out += Escaped(U"\b\f\r\t"[form]);
            rest.remove_prefix(2);
            continue;
        }
        if (character.value == U'\\') {  // another escape, whose second character is none
            out += rest.substr(0, 2);
            rest.remove_prefix(2);
            continue;
        }
        if (IsControl(character.value)) {
            out += Escaped(character.value);
        } else {
            out += rest.substr(0, character.length);
        }
        rest.remove_prefix(character.length);
    }
}

void AppendValue(std::string& out, const std::string& text) { AppendQuoted(out, text); }
void AppendValue(std::string& out, std::int64_t number) { out += std::to_string(number); }
void AppendValue(std::string& out, std::uint8_t byte) { out += std::to_string(byte); }
/// The shortest text that reads back as the same number; 20 stands as 20.0.
void AppendValue(std::string& out, double number) { out += Json(number).dump(); }
void AppendValue(std::string& out, bool truth) { out += truth ? "true" : "false"; }
void AppendValue(std::string& out, NQORTQR20::Time time) { AppendQuoted(out, TimeText(time)); }

template <typename Element>
void AppendValue(std::string& out, const std::vector<Element>& list) {
    out += '[';
    for (std::size_t i = 0; i < list.size(); ++i) {
        if (i > 0) out += ", ";
        AppendValue(out, list[i]);
    }
    out += ']';
}

void AppendValue(std::string& out, const NQORTQR20::ObjectPath& path) {
    out += "{\"class\": ";
    AppendQuoted(out, path.className);
    out += ", \"keys\": {";
    for (std::size_t i = 0; i < path.keys.size(); ++i) {
        if (i > 0) out += ", ";
        AppendQuoted(out, path.keys[i].first);
        out += ": ";
        AppendQuoted(out, path.keys[i].second);
    }
    out += "}}";
}

}  // namespace

std::string JsonText(std::string_view text) {
    std::string out;
    AppendQuoted(out, text);
    return out;
}

std::string JsonLine(const Json& value) { return value.dump(-1, ' ', true, kReplace); }

// Written property by property: an object of the library would keep one of two of the same name.
std::string JsonProperties(const NQORTQR20::Instance& instance) {
    std::string out;
    for (const auto& [name, value] : instance.properties) {
        if (!out.empty()) out += ", ";
        AppendQuoted(out, name);
        out += ": ";
        std::visit([&](const auto& each) { AppendValue(out, each); }, value);
    }
    return out;
}

std::string JsonInstance(const NQORTQR20::Instance& instance) {
    return "{\"class\": " + JsonText(instance.className) + ", \"properties\": {" +
           JsonProperties(instance) + "}}";
}

}  // namespace ipmisel
