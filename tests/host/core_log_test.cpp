#include <gmock/gmock.h>

#include <set>
#include <stdexcept>

#include "host/core/host.h"
#include "tqr/log.h"
#include "tqr/status.h"

namespace {

using namespace NQORTQR20;
using ::testing::ElementsAre;
using namespace tqrhost;

TEST(Log, EachConsumerReadsUpToItsSeverity) {
    std::vector<std::string> warnings;
    std::vector<std::string> all;
    EXPECT_FALSE(fdrLogEnabled(ILogger::kError));
    const int first = AddLogConsumer(
        ILogger::kWarning, [&](auto, std::string_view text) { warnings.emplace_back(text); });
    EXPECT_TRUE(fdrLogEnabled(ILogger::kWarning));
    EXPECT_FALSE(fdrLogEnabled(ILogger::kNotice));
    const int second = AddLogConsumer(ILogger::kTrace,
                                      [&](auto, std::string_view text) { all.emplace_back(text); });
    EXPECT_TRUE(TRootObject::GetCoreLogger()->Enabled(ILogger::kTrace));
    fdrWriteLog(ILogger::kError, "error\n");
    fdrWriteLog(ILogger::kTrace, nullptr);
    RemoveLogConsumer(second);
    EXPECT_FALSE(fdrLogEnabled(ILogger::kTrace));
    TRootObject::GetCoreLogger()->Write(ILogger::kWarning, "%s");
    RemoveLogConsumer(first);
    fdrWriteLog(ILogger::kError, "unread");
    EXPECT_THAT(warnings, ElementsAre("error\n", "%s"));
    EXPECT_THAT(all, ElementsAre("error\n", ""));
}

TEST(Log, ConsumerMayFailAndMayRemoveItself) {
    std::vector<std::string> lines;
    int once = 0;
    once = AddLogConsumer(ILogger::kTrace, [&](auto, std::string_view) {
        RemoveLogConsumer(once);
        throw std::runtime_error("disk full");
    });
    const int other = AddLogConsumer(
        ILogger::kTrace, [&](auto, std::string_view text) { lines.emplace_back(text); });
    fdrWriteLog(ILogger::kInfo, "one");
    fdrWriteLog(ILogger::kInfo, "two");
    RemoveLogConsumer(other);
    EXPECT_THAT(lines, ::testing::Contains("two"));
}

TEST(Status, ExceptionSaysWhatItsCodeMeans) {
    std::vector<std::string> texts;
    for (const int code : {0, 3, 4, 21, 99}) {
        texts.emplace_back(TTQRStatusCode{code}.TranslateStatusCode());
        EXPECT_EQ(TTQRException({code}).what(), texts.back());
    }
    EXPECT_EQ(std::set<std::string>(texts.begin(), texts.end()).size(), texts.size());
    EXPECT_STREQ(TTQRStatusCode{-1}.TranslateStatusCode(), texts.back().c_str());
}

}  // namespace
