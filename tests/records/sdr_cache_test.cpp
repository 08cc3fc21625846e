#include <gmock/gmock.h>

#include <memory>

#include "tests/records/sensor_texts.h"
#include "tests/support/bmc_fixture.h"

namespace {

using ipmiseltest::Bytes;
using ipmiseltest::Fill;
using ipmiseltest::SensorTexts;
using ::testing::ElementsAre;

/// Leaks and double frees show under the sanitizer.
class SdrCache : public ::testing::Test {
protected:
    ipmiseltest::LogRecorder log;
    SDRCache cache;
    std::unique_ptr<IPMISDREntry> first = std::make_unique<IPMISDREntry>();
    std::vector<s_SDR_entry> texts;

    ~SdrCache() override { DeleteSDRCache(nullptr, &cache); }
    int Create(const char* info = "00 51 ") {
        const int result = CreateSDRCache(nullptr, first.get(), &cache, &texts, Bytes(info));
        if (!cache.empty()) {
            EXPECT_EQ(cache.back(), first.get());
            static_cast<void>(first.release());
        }
        return result;
    }
    std::vector<int> Numbers() const {
        std::vector<int> numbers;
        for (const IPMISDREntry* entry : cache) numbers.push_back(entry->sensorNumber);
        return numbers;
    }
};

TEST_F(SdrCache, HoldsTheLastRecordOfTheRepositoryFirst) {
    texts = {SensorTexts(0x30), SensorTexts(0x31), SensorTexts(0x30)};
    EXPECT_EQ(Create(), 0);
    EXPECT_THAT(Numbers(), ElementsAre(0x30, 0x31, 0x30));
    EXPECT_EQ(GetSensorSDR(0x30, &cache), cache.front());
    EXPECT_EQ(GetSensorSDR(0x32, &cache), nullptr);
}

TEST_F(SdrCache, KeepsARecordOfAnotherVersion) {
    texts = {SensorTexts(0x30), SensorTexts(0x31)};
    Fill(texts[0].SDRHeaderData, "00 F1 F2 04 03 02 01 35 20 10 30 07 61 ");
    EXPECT_EQ(Create(), 0);
    EXPECT_THAT(Numbers(), ElementsAre(0x31, 0x30));
}

TEST_F(SdrCache, EmptyTextEndsItWithWhatItHas) {
    texts = {SensorTexts(0x30), SensorTexts(0x31), SensorTexts(0x32)};
    Fill(texts[1].SDRStringData, "");
    EXPECT_EQ(Create(), 0);
    EXPECT_THAT(Numbers(), ElementsAre(0x30));
    EXPECT_THAT(log.Lines(1), ElementsAre("Failed to scan all SDRs from buffer."));
    EXPECT_EQ(log.All().back().second, "CreateSDRCache() function completed.");
}

TEST_F(SdrCache, FirstStaysTheCallersWhereNothingIsCached) {
    EXPECT_EQ(Create(), 0);
    EXPECT_EQ(GetSensorSDR(0, &cache), nullptr);
    texts = {SensorTexts()};
    log.Clear();
    EXPECT_EQ(Create("00 20 "), 1);
    EXPECT_THAT(log.Lines(0), ElementsAre("Failed to obtain correct SDR info."));
    Fill(texts[0].SDRHeaderData, "");
    EXPECT_EQ(Create(), 0);
    EXPECT_TRUE(cache.empty());
}

TEST_F(SdrCache, IsDeletedOnceHoweverOftenItIsAsked) {
    texts = {SensorTexts(0x30), SensorTexts(0x31)};
    Create();
    log.Clear();
    DeleteSDRCache(nullptr, &cache);
    EXPECT_THAT(log.Lines(4), ElementsAre("DeleteSDRCacheSDRCache() function entered.",
                                          "DeleteSDRCacheSDRCache() function completed."));
    EXPECT_EQ(GetSensorSDR(0x30, &cache), nullptr);
}

}  // namespace
