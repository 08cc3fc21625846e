#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "program/reports/json_text.h"
#include "program/reports/terminal_text.h"

namespace {

using ipmisel::JsonText;
using ipmisel::TerminalText;

TEST(Text, NothingSteersATerminalOrBreaksJson) {
    const struct {
        std::string text;
        const char* terminal;
        const char* json;  ///< as written; empty when it reads back as the text
    } cases[] = {
        {"plain text", "plain text", ""},
        {"  folded \n\t blanks \n", "folded blanks", ""},
        {"Grad \u00B0C \U0001F321", "Grad \u00B0C \U0001F321", ""},
        {"\"quoted\\\"", "\"quoted\\\"", "\"\\\"quoted\\\\\\\"\""},
        {"\x1b[31m\r\x07\x7f", "\uFFFD[31m\uFFFD\uFFFD\uFFFD",
         "\"\\u001b[31m\\u000d\\u0007\\u007f\""},
        {"\u009B31m", "\uFFFD31m", "\"\\u009b31m\""},          // CSI as one character
        {"\u202Ecba", "\uFFFDcba", "\"\\u202ecba\""},          // right to left
        {"\xF3\xA0\x80\xA1", "\uFFFD", "\"\\udb40\\udc21\""},  // a tag
        {"\xff\xfe", "\uFFFD\uFFFD", "\"\uFFFD\uFFFD\""},
        {"\x80z", "\uFFFDz", "\"\uFFFDz\""},               // nothing to continue
        {"\xC3", "\uFFFD", "\"\uFFFD\""},                  // cut
        {"\xC3(", "\uFFFD(", "\"\uFFFD(\""},               // broken off
        {"\xC0\xAF", "\uFFFD\uFFFD", "\"\uFFFD\uFFFD\""},  // longer than needed
        {"\xE0\x80\xAF", "\uFFFD\uFFFD\uFFFD", "\"\uFFFD\uFFFD\uFFFD\""},
        {"\xED\xA0\x80", "\uFFFD\uFFFD\uFFFD", "\"\uFFFD\uFFFD\uFFFD\""},  // a surrogate
        {"\xF4\x90\x80\x80", "\uFFFD\uFFFD\uFFFD\uFFFD", "\"\uFFFD\uFFFD\uFFFD\uFFFD\""},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(TerminalText(c.text), c.terminal) << testing::PrintToString(c.text);
        const auto read = nlohmann::json::parse(JsonText(c.text), nullptr, false);
        if (*c.json == '\0') {
            EXPECT_EQ(read, c.text);
        } else {
            EXPECT_EQ(JsonText(c.text), c.json) << testing::PrintToString(c.text);
            EXPECT_TRUE(read.is_string());
        }
    }
}

TEST(Text, LinesBreakAtBlanksWhereTheyCan) {
    const struct {
        const char* text;
        std::size_t width;
        std::vector<std::string> lines;
    } cases[] = {
        {"", 5, {""}},
        {"exact", 5, {"exact"}},
        {"one two three", 7, {"one two", "three"}},
        {"one two three", 8, {"one two", "three"}},
        {"longest word", 4, {"long", "est", "word"}},
        {"OS Boot/Installation", 12, {"OS", "Boot/", "Installation"}},
        {"OS Boot/Installation", 11, {"OS", "Boot/Instal", "lation"}},
        {"/longest", 4, {"/lon", "gest"}},
        {"\u00B0\u00B0\u00B0\u00B0 \u00B0", 3, {"\u00B0\u00B0\u00B0", "\u00B0 \u00B0"}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(ipmisel::Wrap(c.text, c.width), c.lines) << c.text << ", " << c.width;
    }
    EXPECT_EQ(ipmisel::Fit("\u00B0\u00B0\u00B0", 2), "\u00B0\u00B0");
    EXPECT_EQ(ipmisel::Fit("\u00B0", 3), "\u00B0  ");
}

TEST(Text, AnInstanceKeepsItsOrderAndItsDoubles) {
    const NQORTQR20::Instance instance{
        "QORSG_X",
        {{"B", std::string("1")},
         {"A", std::vector<std::uint8_t>{0, 255}},
         {"Empty", std::vector<std::uint8_t>{}},
         {"R", NQORTQR20::ObjectPath{"QORSG_Y", {{"K", "1"}, {"J", "\"2"}}}},
         {"B", std::string("2")}}};
    EXPECT_EQ(ipmisel::JsonInstance(instance),
              R"({"class": "QORSG_X", "properties": {"B": "1", "A": [0, 255], "Empty": [], )"
              R"("R": {"class": "QORSG_Y", "keys": {"K": "1", "J": "\"2"}}, "B": "2"}})");
}

}  // namespace
