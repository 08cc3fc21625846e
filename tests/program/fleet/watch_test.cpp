#include "program/fleet/event_stream.h"
#include "program/fleet/watch_schedule.h"

namespace ipmisel {
namespace {

using namespace ::testing;
using namespace std::chrono_literals;

class Schedule : public Test {
protected:
    using Time = WatchSchedule::Clock::time_point;

    const Time start{1000h};
    WatchSchedule schedule{60s};

    /// Those that are due at that time, which are then under way.
    std::vector<std::string> Due(Time now) {
        std::vector<std::string> sources;
        while (const auto source = schedule.TakeDue(now)) sources.push_back(*source);
        return sources;
    }
};

TEST_F(Schedule, AControllerIsVisitedAtOnceAndThenNoOftenerThanItsTime) {
    schedule.Set({"a", "b"}, start);
    EXPECT_THAT(Due(start), ElementsAre("a", "b"));
    EXPECT_THAT(Due(start + 1h), IsEmpty());  // under way
    schedule.Done("a", true, start + 5s);
    schedule.Done("b", true, start + 90s);  // took longer
    EXPECT_THAT(Due(start + 60s - 1ns), IsEmpty());
    EXPECT_EQ(schedule.NextDue(), start + 60s);
    EXPECT_THAT(Due(start + 60s), ElementsAre("a"));
    EXPECT_THAT(Due(start + 90s), ElementsAre("b"));
}

TEST_F(Schedule, OneThatCannotBeReadIsLeftAloneLongerEachTimeUntilItIsReadAgain) {
    schedule.Set({"a"}, start);
    Time begun = start;
    for (const auto pause : {120s, 240s, 480s, 960s, 1920s, 3600s, 3600s}) {
        EXPECT_THAT(Due(begun), ElementsAre("a"));
        schedule.Done("a", false, begun + 20s);
        EXPECT_EQ(schedule.NextDue(), begun + pause);
        begun += pause;
    }
    EXPECT_THAT(Due(begun), ElementsAre("a"));
    schedule.Done("a", true, begun + 1s);
    EXPECT_EQ(schedule.NextDue(), begun + 60s);
}

TEST_F(Schedule, ANewListKeepsTheTimesOfThoseThatStay) {
    schedule.Set({"gone", "stays", "under way"}, start);
    Due(start);
    schedule.Done("gone", true, start + 1s);
    schedule.Done("stays", true, start + 1s);
    schedule.Set({"new", "stays"}, start + 10s);
    EXPECT_THAT(Due(start + 10s), ElementsAre("new"));
    schedule.Done("under way", true, start + 20s);
    EXPECT_THAT(Due(start + 60s), ElementsAre("stays"));
    schedule.Done("gone", true, start + 70s);  // nobody waits for it
    EXPECT_EQ(schedule.NextDue(), std::nullopt);
}

TEST(JournalEntries, HaveThePriorityOfTheSeverityAndAnyTextWithItsLength) {
    Event event;
    event.key = "0123";
    event.sentence = "Fan 3:\nbelow\x1b";
    event.severity = Severity::kCritical;
    const std::string entry = JournalEntry(event, {"node7", "", "", "", "", ""});
    const auto field = [](const std::string& name, const std::string& value) {
        return name + "\n" + std::string(1, static_cast<char>(value.size())) +
               std::string(7, '\0') + value + "\n";
    };
    EXPECT_EQ(entry, field("MESSAGE", "node7: Fan 3: below\uFFFD") + field("PRIORITY", "2") +
                         field("SYSLOG_IDENTIFIER", "ipmisel") + field("IPMISEL_SYSTEM", "node7") +
                         field("IPMISEL_KEY", "0123") + field("IPMISEL_SEVERITY", "critical"));
}

}  // namespace
}  // namespace ipmisel
