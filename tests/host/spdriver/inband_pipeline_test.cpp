#include "host/spdriver/inband_pipeline.h"

#include <gmock/gmock.h>

#include <cerrno>

namespace {

using namespace std::chrono_literals;
using namespace tqrhost;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// A driver whose messages a case hands out by hand.
struct Driver {
    std::vector<std::pair<long, ipmi::Command>> sent;
    std::deque<IpmiDevice::Message> waiting;
    int sendError = 0;
    int receiveError = 0;
};
class FakeDevice : public IpmiDevice {
public:
    explicit FakeDevice(Driver* driver) : driver_(driver) {}
    int Send(long id, const ipmi::Command& command) override {
        if (driver_->sendError == 0) driver_->sent.emplace_back(id, command);
        return driver_->sendError;
    }
    std::optional<Message> Receive(int* error) override {
        *error = driver_->receiveError;
        if (*error != 0 || driver_->waiting.empty()) return std::nullopt;
        Message message = driver_->waiting.front();
        driver_->waiting.pop_front();
        return message;
    }
    int Descriptor() const override { return -1; }

private:
    Driver* driver_;
};

class Inband : public ::testing::Test {
protected:
    Driver driver;
    InbandPipeline pipeline{std::make_unique<FakeDevice>(&driver), 1000ms};
    RequestPipeline::Clock::time_point start = RequestPipeline::Clock::now();
    std::vector<std::string> ended;  ///< sensor number and answer, in the order in which they came

    void Submit(std::uint8_t sensor) {
        pipeline.Submit(ipmi::GetSensorReading(sensor), [this, sensor](std::optional<Response> r) {
            ended.push_back(std::to_string(sensor) + ":" +
                            (r ? std::to_string(r->back()) : "none"));
        });
    }
    void Answer(std::size_t position, std::uint8_t value) {
        driver.waiting.push_back({driver.sent.at(position).first, {0, value}});
    }
    void At(std::chrono::milliseconds time) { pipeline.Advance(start + time); }
};

TEST_F(Inband, AnswersFindTheirRequestsInWhateverOrderTheyCome) {
    for (std::uint8_t i = 1; i <= 6; ++i) Submit(i);
    EXPECT_EQ(driver.sent.size(), 4u);  // more do not wait in the driver
    EXPECT_EQ(pipeline.Room(), 0u);
    Answer(2, 30);
    Answer(0, 10);
    driver.waiting.push_back({4711, {0, 99}});  // nobody's
    At(1ms);
    EXPECT_THAT(ended, ElementsAre("3:30", "1:10"));
    EXPECT_EQ(driver.sent.size(), 6u);
    EXPECT_EQ(pipeline.Pending(), 4u);
}

TEST_F(Inband, OneRequestThatIsNotAnsweredLeavesTheOthers) {
    Submit(1);
    Submit(2);
    At(600ms);
    Answer(1, 20);
    At(700ms);
    At(1100ms);
    EXPECT_THAT(ended, ElementsAre("2:20", "1:none"));
    EXPECT_FALSE(pipeline.Dead());
    Answer(0, 10);  // too late
    At(1200ms);
    EXPECT_EQ(ended.size(), 2u);
}

TEST_F(Inband, ASilentControllerCostsOneTimeout) {
    for (std::uint8_t i = 1; i <= 5; ++i) Submit(i);
    At(900ms);
    EXPECT_THAT(ended, IsEmpty());
    At(1100ms);
    EXPECT_EQ(ended.size(), 5u);
    EXPECT_TRUE(pipeline.Dead());
    Submit(6);
    At(1101ms);
    EXPECT_EQ(ended.back(), "6:none");
}

TEST_F(Inband, ADriverThatFailsAnswersNobody) {
    for (const bool sending : {true, false}) {
        driver = {};
        ended.clear();
        InbandPipeline fresh(std::make_unique<FakeDevice>(&driver), 1000ms);
        (sending ? driver.sendError : driver.receiveError) = ENODEV;
        bool answered = false;
        fresh.Submit(ipmi::GetDeviceId(), [&](const auto& response) {
            answered = true;
            EXPECT_EQ(response, std::nullopt);
        });
        fresh.Advance(start);
        EXPECT_TRUE(answered);
        EXPECT_TRUE(fresh.Dead());
    }
}

}  // namespace
