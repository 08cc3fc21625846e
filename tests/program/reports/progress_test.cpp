#include "program/reports/progress.h"

#include <gtest/gtest.h>

namespace ipmisel {
namespace {

TEST(Progress, SaysWhatIsKnown) {
    const struct {
        ProgressCount count;
        std::optional<double> secondsLeft;
        const char* text;
    } cases[] = {
        {{"event log", 120, 512, "records"}, 7.6, "event log: 120 of 512 records, about 8 s left"},
        {{"event log", 120, {}, "records"}, {}, "event log: 120 records"},
        {{"all", 3, 9, "controllers", "1 failed"}, {}, "all: 3 of 9 controllers, 1 failed"},
        {{"a", 1, 2, "b"}, 0.1, "a: 1 of 2 b, about 1 s left"},
        {{"a", 1, 2, "b"}, 59.4, "a: 1 of 2 b, about 59 s left"},
        {{"a", 1, 2, "b"}, 130, "a: 1 of 2 b, about 2 min 10 s left"},
        {{"a", 1, 2, "b"}, 3600 + 61, "a: 1 of 2 b, about 1 h 1 min left"},
        {{"a", 1, 2, "b"}, 1e300, "a: 1 of 2 b"},
        {{"a\x1b[2Jb", 1, {}, "c"}, {}, "a\xEF\xBF\xBD[2Jb: 1 c"},
    };
    for (const auto& c : cases) EXPECT_EQ(ProgressText(c.count, c.secondsLeft), c.text);
}

}  // namespace
}  // namespace ipmisel
