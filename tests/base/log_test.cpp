#include "base/log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

#include "host/core/host.h"

namespace ipmisel {
namespace {

using ::testing::ElementsAre;

class Trace : public ::testing::Test {
protected:
    void SetUp() override {
        consumer_ =
            tqrhost::AddLogConsumer(kTrace, [this](Severity severity, std::string_view text) {
                lines.push_back(std::to_string(severity) + ' ' + std::string(text));
            });
    }
    void TearDown() override { tqrhost::RemoveLogConsumer(consumer_); }
    std::vector<std::string> lines;

private:
    int consumer_ = 0;
};

TEST_F(Trace, FailureHasNoCompletedLine) {
    {
        TraceScope trace("A::B()");
        EXPECT_EQ(trace.Fail("no answer"), kFailed);
    }
    EXPECT_THAT(lines, ElementsAre("4 A::B() entered.", "0 no answer"));
}

TEST_F(Trace, IsSilentWhileAnExceptionUnwindsAndNotInItsHandler) {
    try {
        const TraceScope trace("thrown()");
        throw 1;
    } catch (int) {
        const TraceScope trace("handler()", TraceScope::kFunction);
    }
    EXPECT_THAT(lines, ElementsAre("4 thrown() entered.", "4 handler() function entered.",
                                   "4 handler() function completed."));
}

}  // namespace
}  // namespace ipmisel
