#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "base/text.h"
#include "host/core/host.h"
#include "plugins/ipmisel/texts/ipmi_mapping.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/temporary_folder.h"

namespace ipmiseltest {

constexpr const char* kFifteenBlanks = "               ";

/// A folder with an "ipmisel.INI". Its path has the plug-in's word in it, as that of a source tree
/// may.
struct TextFolder : TemporaryFolder {
    explicit TextFolder(const std::string& contents) { Write("ipmisel.INI", contents); }
};

/// Every number's text is the number in angle brackets; the formats show their integers.
inline std::string MarkerTexts() {
    std::string texts;
    for (int number = 0; number <= 1040; ++number) {
        const char* const values = number == 286 ? ":%d" : number == 347 ? ":%d:%d" : "";
        texts += ipmisel::Format("%d=<%d%s>\n", number, number, values);
    }
    return texts;
}

/// A mapping over marker texts, so that cases say which number they want.
class MappingTest : public ::testing::Test {
protected:
    static constexpr unsigned kRoom = 256;
    LogRecorder log;
    IPMIMapping mapping;
    TextFolder folder{MarkerTexts()};
    NQORTQR20::PluginContext context{folder.path()};

    std::string Sensor(int sensorType, int data1, int data2 = 0, int data3 = 0) {
        char out[kRoom] = {};
        EXPECT_EQ(0, mapping.GetSensorOffset(context.get(), sensorType, data1, data2, data3, 0x6F,
                                             out, kRoom));
        return out;
    }
    std::string Generic(int readingType, int data1, int data2 = 0, int data3 = 0,
                        int sensorType = 0x01, int sensorNumber = 0) {
        char out[kRoom] = {};
        EXPECT_EQ(0, mapping.GetGenericOffset(context.get(), data1, data2, data3, readingType,
                                              sensorType, sensorNumber, out, kRoom));
        return out;
    }
    std::string Threshold(int data1, int data2 = 0, int data3 = 0,
                          const s_SDR_Mod_Units* units = nullptr) {
        char out[kRoom] = {};
        EXPECT_EQ(
            0, mapping.GetThresholdOffset(context.get(), data1, data2, data3, out, kRoom, units));
        return out;
    }
    std::string Units(const s_SDR_Mod_Units* units, int reading) {
        char out[kRoom] = "stale";
        EXPECT_EQ(mapping.GetSensorUnits(context.get(), units, reading, out, kRoom), 0);
        return out;
    }
};

}  // namespace ipmiseltest
