#include "plugins/ipmisel/log.h"

#include "tests/support/bmc_fixture.h"

namespace ipmisel {
namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

TEST(Trace, FailureHasNoCompletedLine) {
    const ipmiseltest::LogRecorder log;
    EXPECT_EQ(TraceScope("A::B()").Fail("no answer"), kFailed);
    EXPECT_THAT(log.All(), ElementsAre(Pair(4, "A::B() entered."), Pair(0, "no answer")));
}

TEST(Trace, IsSilentWhileAnExceptionUnwindsAndNotInItsHandler) {
    const ipmiseltest::LogRecorder log;
    try {
        const TraceScope trace("thrown()");
        throw 1;
    } catch (int) {
        const TraceScope trace("handler()", TraceScope::kFunction);
    }
    EXPECT_THAT(log.Lines(4), ElementsAre("thrown() entered.", "handler() function entered.",
                                          "handler() function completed."));
}

}  // namespace
}  // namespace ipmisel
