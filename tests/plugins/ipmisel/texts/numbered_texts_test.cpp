#include "plugins/ipmisel/texts/numbered_texts.h"

#include <dlfcn.h>

#include <algorithm>
#include <optional>

#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

using ipmiseltest::TextFolder;
using ::testing::ElementsAre;

/// The path that the host gives, when it is not its own.
std::optional<const char*> gPath;

}  // namespace

/// In place of the host's own, to which it leads on.
NQORTQR20::TTQRStatusCode NQORTQR20::fdrGetPluginPath(TCPluginCallbacks* context,
                                                      const char** path) {
    if (gPath) {
        *path = *gPath;
        return {kStatusOk};
    }
    using Operation = TTQRStatusCode (*)(TCPluginCallbacks*, const char**);
    static const auto next = reinterpret_cast<Operation>(
        dlsym(RTLD_NEXT, "_ZN9NQORTQR2016fdrGetPluginPathEPNS_17TCPluginCallbacksEPPKc"));
    return next(context, path);
}

namespace {

TEST(NumberedTexts, LookupRules) {
    const auto filler = [](std::size_t length, const char* rest) {
        return std::string(length, 'x') + rest;
    };
    const std::tuple<std::string, std::size_t, const char*> cases[] = {
        {"4=four\n5=five\n6=six\n", 256, "five"},
        {"535=longer\n15=other\n5=own\n", 256, "longer"},  // the key counts anywhere
        {"; see 5= here\n5=own\n", 256, " here"},
        {"a=5=b\n", 256, "5=b"},  // after the first equals sign of the line
        {"5=a=b\n", 256, "a=b"},
        {"5 =blank\n", 256, ""},
        {"5=carriage\r\n", 256, "carriage"},
        {"5=last", 256, "las"},  // the last character goes whatever it is
        {"5=\n5=second\n", 256, ""},
        {"5=", 256, ""},
        {"", 256, ""},
        {std::string("5=ab\0cd\n", 8), 256, "a"},  // a NUL ends what a line shows
        {std::string("x\0 5=no\n5=yes\n", 14), 256, "yes"},
        // A long line is read in pieces of 511 bytes.
        {filler(511, "5=tail\n"), 256, "tail"},
        {filler(510, "5=tail\n"), 256, ""},
        {filler(509, "5=tail\n"), 256, ""},
        {filler(505, "5=abcdefg\n"), 256, "abc"},
        {"first line\n" + filler(511, "5=tail\n"), 256, "tail"},
        {"5=abcdef\n", 8, "abcdef"},
        {"5=abcdef\n", 7, "abcde"},  // the cut takes the line end, and then one more goes
        {"5=abcdef\n", 2, ""},
        {"5=abcdef\n", 0, ""},
    };
    for (const auto& [contents, capacity, text] : cases) {
        EXPECT_EQ(ipmisel::FindNumberedText(contents, 5, capacity), text)
            << contents << " " << capacity;
    }
}

TEST(NumberedTexts, EveryNumberFindsItsOwnLine) {
    IPMIMapping mapping;
    const NQORTQR20::PluginContext context(IPMISEL_TEXTS);
    std::ifstream file(IPMISEL_TEXTS "/ipmisel.INI");
    int previous = -1;
    for (std::string line; std::getline(file, line);) {
        if (line.starts_with(';')) continue;
        SCOPED_TRACE(line);
        const std::size_t equals = line.find('=');
        ASSERT_NE(equals, std::string::npos);
        const int number = std::stoi(line.substr(0, equals));
        const std::string text = line.substr(equals + 1);
        EXPECT_GT(number, previous);
        previous = number;

        const bool isUnit = number >= 721 && number <= 822;
        char out[128];
        EXPECT_EQ(mapping.GetString(context.get(), number, out, isUnit ? 64 : 128), 0);
        EXPECT_EQ(out, text);
        // The only formats are those whose integers are given.
        const int integers = number == 347                                     ? 2
                             : number == 286 || number == 543 || number == 544 ? 1
                                                                               : 0;
        EXPECT_EQ(std::count(text.begin(), text.end(), '%'), integers);
    }
    // The message puts the sensor's own name in the place of an entity of this name.
    EXPECT_EQ(ipmisel::FetchText(context.get(), 1002), "Unknown");
}

TEST(NumberedTexts, NoneThatIsAskedForIsMissing) {
    const ipmiseltest::LogRecorder log;
    const ipmiseltest::Machine machine("SIM-1");
    IPMIMapping mapping;
    const NQORTQR20::PluginContext context(IPMISEL_TEXTS);
    char out[256];
    const auto decode = [&](int type, int data1, int data2, int data3) {
        out[0] = '\0';
        mapping.GetSensorOffset(context.get(), type, data1, data2, data3, 0x6F, out, sizeof out);
    };
    for (int data1 = 0; data1 <= 0xFF; ++data1) {
        mapping.GetThresholdOffset(context.get(), data1, 0, 0, out, sizeof out, nullptr);
        for (int type = 0; type <= 0x0F; ++type) {
            mapping.GetGenericOffset(context.get(), data1, 0x21, 0xFF, type, 0x02, 0xA0, out,
                                     sizeof out);
        }
    }
    for (int type = 0; type <= 0xFF; ++type) {
        for (int data1 = 0; data1 <= 0x0F; ++data1) decode(type, 0x40 | data1, 0x21, 0);
        decode(type, 0xA0, 0, 0);
        decode(type, 0xF0, 0, 0);
    }
    for (const int type : {0x0F, 0x10, 0x12, 0x21, 0x23}) {
        for (int offset = 0; offset <= 8; ++offset) {
            for (int data2 = 0; data2 <= 0xFF; ++data2) decode(type, 0xC0 | offset, data2, 0x20);
        }
    }
    for (int code = 0; code <= 0xFF; ++code) {
        const auto byte = static_cast<std::uint8_t>(code);
        const s_SDR_Mod_Units units{
            1, static_cast<std::uint8_t>((byte & 0x38) | 0x02), byte, byte, 0, 1, 0, 0, 0};
        mapping.GetSensorUnits(context.get(), &units, 1, out, sizeof out);
    }
    // The sources of events, but for one number, and the entities.
    for (int number = 535; number <= 1040; number = number == 544 ? 1000 : number + 1) {
        if (number != 542) ipmisel::FetchText(context.get(), number);
    }
    EXPECT_THAT(log.Lines(0), ElementsAre());
}

TEST(GetString, LogsWhyThereIsNoTextAndLeavesTheBufferEmpty) {
    const ipmiseltest::LogRecorder log;
    IPMIMapping mapping;
    char out[16] = "stale";
    EXPECT_NE(mapping.GetString(nullptr, 7, out, sizeof out), 0);
    EXPECT_STREQ(out, "");
    EXPECT_THAT(log.Lines(0), ElementsAre("fdrGetPluginPath failed."));

    const ipmiseltest::TemporaryFolder folder;
    const auto file = folder.path() / "ipmisel.INI";
    const NQORTQR20::PluginContext context(folder.path());
    EXPECT_NE(mapping.GetString(context.get(), 7, out, sizeof out), 0);
    std::filesystem::create_directory(file);  // no file, though it can be opened
    EXPECT_NE(mapping.GetString(context.get(), 8, out, sizeof out), 0);
    const std::string could = "Could not open file " + file.string();
    EXPECT_THAT(log.Lines(1), ElementsAre(could + ". Did not obtain string #7\n",
                                          could + ". Did not obtain string #8\n"));

    const TextFolder texts("1=a\n");
    const NQORTQR20::PluginContext other(texts.path());
    EXPECT_NE(mapping.GetString(other.get(), 7, out, sizeof out), 0);
    EXPECT_EQ(log.Lines(0).back(), "Could not find data_number 7");
    EXPECT_EQ(log.Lines(3).back(),
              "Path found for ipmisel INI file: " + (texts.path() / "ipmisel.INI").string());
}

TEST(GetString, NeedsThePlugInsWordInThePath) {
    const TextFolder folder("7=seven\n");
    const NQORTQR20::PluginContext context(folder.path());
    IPMIMapping mapping;
    for (const char* const path : {static_cast<const char*>(nullptr), "", "/usr/lib/ipmi/sel"}) {
        const ipmiseltest::LogRecorder log;
        char out[16] = "stale";
        gPath = path;
        EXPECT_NE(mapping.GetString(context.get(), 7, out, sizeof out), 0);
        gPath.reset();
        EXPECT_STREQ(out, "");
        EXPECT_THAT(log.All(),
                    ElementsAre(::testing::Pair(1, "Path not found for ipmisel INI file.")));
    }
}

TEST(GetString, ReadsTheFileAnewAndKeepsNoDescriptor) {
    const auto descriptors = [] {
        return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
    };
    const TextFolder folder("");
    const NQORTQR20::PluginContext context(folder.path());
    IPMIMapping mapping;
    const auto open = descriptors();
    // Each change has effect at the next text, wherever in the file it is.
    const std::pair<const char*, const char*> states[] = {
        {"1=a\n", ""},         {"1=a\n5=b\n", "b"},        {"1=a\n5=b\n6=c\n", "b"},
        {"1=a\n5=bb\n", "bb"}, {"1=a\n5=bb", "b"},         {"1=a\n5=bbc", "bb"},
        {"5=0\n5=bb\n", "0"},  {"1=a\n5=bb\n6=d\n", "bb"}, {"1=a\n5=", ""},
    };
    for (const auto& [contents, five] : states) {
        folder.Write("ipmisel.INI", contents);
        for (const int number : {5, 1, 6, 5}) {
            char out[16];
            const int failed = mapping.GetString(context.get(), number, out, sizeof out);
            EXPECT_EQ(out, ipmisel::FindNumberedText(contents, number, sizeof out)) << contents;
            EXPECT_EQ(failed == 0, out[0] != '\0');
            EXPECT_TRUE(number != 5 || out == std::string(five)) << contents << out;
        }
    }
    EXPECT_EQ(descriptors(), open);
}

}  // namespace
