#include "base/text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <memory>

using ipmisel::BoundedView;
using ipmisel::CopyOut;
using ipmisel::FixedText;
using ipmisel::Format;
using ipmisel::FormatIntegers;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

/// A buffer on the heap, so that the address sanitizer sees a write outside of it. Behind the NUL
/// of its content stands '#'.
struct Buffer {
    Buffer(unsigned int size, const std::string& content) : bytes(new char[size]), length(size) {
        std::memset(bytes.get(), '#', size);
        std::string(content.c_str(), content.size() + 1).copy(bytes.get(), size);
    }
    std::string Text() const { return std::string(BoundedView(bytes.get(), length)); }
    std::unique_ptr<char[]> bytes;
    unsigned int length;
};

TEST(StringCch, CopyCutsTerminatesAndPads) {
    Buffer cut(4, "");
    StringCchCopy(cut.bytes.get(), 4, "ABCDEFGH");
    EXPECT_EQ(std::string(cut.bytes.get(), 4), std::string("ABC\0", 4));
    Buffer padded(8, "#######");
    StringCchCopy(padded.bytes.get(), 8, "AB");
    EXPECT_EQ(std::string(padded.bytes.get(), 8), std::string("AB\0\0\0\0\0\0", 8));
}

TEST(StringCch, CatStaysInsideTheBuffer) {
    constexpr unsigned int kAll = UINT_MAX;
    const struct {
        unsigned int size;
        const char *before, *source;
        unsigned int count;
        const char* after;
    } cases[] = {{8, "AB", "CD", kAll, "ABCD"},          {8, "AB", "CDEFG", kAll, "ABCDEFG"},
                 {8, "AB", "CDEFGHIJ", kAll, "ABCDEFG"}, {8, "ABCDEFG", "H", kAll, "ABCDEFG"},
                 {8, "ABCDEFGH", "I", kAll, "ABCDEFG"},  // was not terminated
                 {8, "AB", "CDEFG", 2, "ABCD"},          {8, "AB", "CDEFG", 0, "AB"},
                 {8, "AB", "CDEFGHIJKL", 9, "ABCDEFG"},  {1, "", "A", kAll, ""}};
    for (const auto& c : cases) {
        Buffer buffer(c.size, c.before);
        if (c.count == kAll) {
            StringCchCat(buffer.bytes.get(), c.size, c.source);
            EXPECT_EQ(buffer.Text(), c.after) << c.before << '+' << c.source;
        }
        Buffer counted(c.size, c.before);
        StringCchCatN(counted.bytes.get(), c.size, c.source, c.count);
        EXPECT_EQ(counted.Text(), c.after) << c.before << '+' << c.source << ',' << c.count;
        EXPECT_EQ(counted.bytes[c.size - 1], '\0');
    }
}

TEST(StringCch, PrintfFormatsAndCuts) {
    Buffer buffer(4, "");
    StringCchPrintf(buffer.bytes.get(), 4, "%02X ", 5);
    EXPECT_EQ(buffer.Text(), "05 ");
    StringCchPrintf(buffer.bytes.get(), 4, "%d", 123456);
    EXPECT_EQ(buffer.Text(), "123");
}

TEST(StringCch, NoBufferIsNoWork) {
    char untouched = '#';
    for (char* const buffer : {&untouched, static_cast<char*>(nullptr)}) {
        const unsigned int size = buffer == nullptr ? 4 : 0;
        StringCchCopy(buffer, size, "A");
        StringCchCat(buffer, size, "A");
        StringCchCatN(buffer, size, "A", 1);
        StringCchPrintf(buffer, size, "%d", 1);
        CopyOut(buffer, size, "A");
    }
    EXPECT_EQ(untouched, '#');
}

TEST(GetString, FirstStringWithoutAndLaterOnesWithTheirNul) {
    const unsigned char block[] = {'A', 'B', 0, 'C', 'D', 0, 0};
    const struct {
        int length, index, result;
        std::string out;  // over a buffer of '#'
    } cases[] = {{7, 1, 1, "AB##"},
                 {7, 2, 1, std::string("CD\0#", 4)},
                 {7, 3, 1, std::string("\0###", 4)},
                 {7, 4, 0, "####"},
                 {7, 0, 0, "####"},
                 {7, -1, 0, "####"},
                 {5, 2, 0, "####"},  // the block ends before its NUL
                 {0, 1, 0, "####"},
                 {-1, 1, 0, "####"}};
    for (const auto& c : cases) {
        for (const auto get : {getString, IPMIselGetString}) {
            std::string out = "####";
            EXPECT_EQ(get(block, out.data(), c.length, c.index), c.result) << c.index;
            EXPECT_EQ(out, c.out) << c.length << ',' << c.index;
        }
    }
}

TEST(PrintableText, KeepsWhatCanBeRead) {
    EXPECT_EQ(GetPrintableString("Memory Card 2 of 4"), "Memory Card 2");
    EXPECT_EQ(GetPrintableString("\tA Memory Card 2"), "\tA Memory Car");
    EXPECT_EQ(GetPrintableString("\tAB\xC3"), "AB");
    EXPECT_EQ(GetPrintableString(" ~\x7F"), " ~\x7F");
    EXPECT_EQ(GetPrintableString('\t' + std::string(101, 'x')), std::string(100, 'x'));
}

TEST(PrintableText, NeedsOneVisibleCharacter) {
    for (const char* text : {" x ", "!", "~", "\xC3z"}) EXPECT_TRUE(isPrintable(text)) << text;
    for (const char* text : {"", "   ", "\t\n\x7F", "\xC3\xA4"}) {
        EXPECT_FALSE(isPrintable(text)) << text;
    }
}

TEST(MultiStringTok, GivesThePiecesThatAreEnded) {
    char nuls[] = {'A', 0, 0, 'B', 0};
    EXPECT_THAT(multiStringTok(nuls, 5, '\0'), ElementsAre("A", "", "B"));
    char comma[] = {'A', ',', 'B'};
    EXPECT_THAT(multiStringTok(comma, 3, ','), ElementsAre("A"));
    EXPECT_THAT(multiStringTok(comma, 0, ','), IsEmpty());
    EXPECT_THAT(multiStringTok(nullptr, 3, ','), IsEmpty());
}

TEST(CopyOut, CutsWithoutANulAndPadsWithNuls) {
    Buffer cut(3, "");
    CopyOut(cut.bytes.get(), 3, "ABCDE");
    EXPECT_EQ(std::string(cut.bytes.get(), 3), "ABC");
    Buffer padded(4, "####");
    CopyOut(padded.bytes.get(), 4, std::string_view("A\0B", 3));
    EXPECT_EQ(std::string(padded.bytes.get(), 4), std::string("A\0\0\0", 4));
}

TEST(Format, HoldsAnyLength) {
    for (const int length : {0, 255, 256, 1000}) {
        EXPECT_EQ(Format("%*d|", length, 7).size(), std::max<std::size_t>(2, length + 1));
    }
}

// Expected texts: what printf gives for the conversions that are honoured.
TEST(FormatIntegers, FillsOnlyPlainIntegerConversions) {
    const int values[] = {-5, 0xAB};
    const struct {
        const char *format, *text;
    } cases[] = {{"a %d b %x c", "a -5 b ab c"},
                 {"%i/%X", "-5/AB"},
                 {"%u", "4294967291"},
                 {"%4d|%-5x|", "  -5|ab   |"},
                 {"%04d|%#06X", "-005|0X00AB"},
                 {"%+d %+d % d", "-5 +171 % d"},
                 {"%-04d|% d", "-5  | 171"},
                 {"100%% %d", "100% -5"},
                 {"%d %d %d", "-5 171 %d"},
                 {"%s %n %p %d", "%s %n %p -5"},
                 {"%ld %hhd %.2d %*d", "%ld %hhd %.2d %*d"},
                 {"%9999d", "%9999d"},
                 {"%", "%"},
                 {"%-0", "%-0"}};
    for (const auto& c : cases) EXPECT_EQ(FormatIntegers(c.format, values, 2), c.text) << c.format;
    const int least = INT_MIN;
    EXPECT_EQ(FormatIntegers("%d", &least, 1), "-2147483648");
    EXPECT_EQ(FormatIntegers("%d", nullptr, 0), "%d");
}

TEST(FixedText, CutsAtItsCapacity) {
    FixedText<6> text;
    text.Append("abc");
    text.Append("defg");
    text.Append("h");
    EXPECT_EQ(text.view(), "abcde");
}

}  // namespace
