#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>

#include "host/core/host.h"
#include "tqr/datetime.h"

namespace {

using NQORTQR20::TCIMDateTime;
using NQORTQR20::TOSSpecific;

constexpr const char* kNoTime = "19700101000000.000000+000";

TEST(DateTime, KeepsItsTextFormThroughParsing) {
    for (const char* text :
         {kNoTime, "20240305120304.000567+060", "99991231235960.999999-999",
          "00000101000000.000000-005", "00000000000000.000000:000", "99999999235959.999999:000"}) {
        EXPECT_EQ(TCIMDateTime(text).ToString(), text);
    }
    EXPECT_EQ(TCIMDateTime("20240305120304.000567-330").GetUTCOffset(), -330);
    EXPECT_TRUE(TCIMDateTime("00000001000000.000000:000").IsInterval());
}

TEST(DateTime, TextOfNeitherFormIsNoTime) {
    EXPECT_EQ(TCIMDateTime().ToString(), kNoTime);
    EXPECT_EQ(TCIMDateTime(nullptr).ToString(), kNoTime);
    const std::string good = "20240305120304.000567+060";
    for (std::size_t length = 0; length < good.size(); ++length) {
        EXPECT_EQ(TCIMDateTime(good.substr(0, length).c_str()).ToString(), kNoTime) << length;
    }
    EXPECT_EQ(TCIMDateTime((good + "0").c_str()).ToString(), kNoTime);
    for (std::size_t at = 0; at < good.size(); ++at) {
        std::string bad = good;
        bad[at] = 'x';
        EXPECT_EQ(TCIMDateTime(bad.c_str()).ToString(), kNoTime) << bad;
    }
    for (const char* text :
         {"20240005120304.000567+060", "20241305120304.000567+060", "20240300120304.000567+060",
          "20240332120304.000567+060", "20240305240304.000567+060", "20240305126004.000567+060",
          "20240305120361.000567+060", "00000001000000.000000:060"}) {
        EXPECT_EQ(TCIMDateTime(text).ToString(), kNoTime) << text;
    }
}

TEST(DateTime, KeepsFieldsAsGivenAndItsTextAtItsLength) {
    TCIMDateTime time;
    time.Set(7, 0, 0, 25, 61, 62, 5, -90);
    EXPECT_EQ(time.ToString(), "00070000256162.000005-090");
    time.Set(2024, 0, 31, 0, 0, 0, 0, 0);  // the month before January is December
    EXPECT_EQ((TCIMDateTime("20240101000000.000000+000") - time).ToString(),
              "00000001000000.000000:000");
    time.Set(65535, 65535, 4294967295U, 65535, 65535, 65535, 4294967295U, -32768);
    EXPECT_EQ(time.ToString(), "99999999999999.999999-999");
    EXPECT_FALSE(time < time);
    EXPECT_EQ((time - time).ToString(), "00000000000000.000000:000");
    EXPECT_EQ((TCIMDateTime() - time).ToString().size(), 25U);
    time.Set(4294967295U, 65535, 65535, 65535, 4294967295U);
    EXPECT_EQ(time.ToString(), "99999999999999.999999:000");
    EXPECT_TRUE(TCIMDateTime() < time);
}

// Differences: the days by the Gregorian calendar.
TEST(DateTime, ComparesInstantsAndCountsBetweenThem) {
    const struct {
        const char *earlier, *later, *difference;
    } cases[] = {
        {"20231231235959.999999+000", "20240101000000.000000+000", "00000000000000.000001:000"},
        {"20240228000000.000000+000", "20240301000000.000000+000", "00000002000000.000000:000"},
        {"20230228000000.000000+000", "20230301000000.000000+000", "00000001000000.000000:000"},
        {"19000228000000.000000+000", "19000301000000.000000+000", "00000001000000.000000:000"},
        {"20000101000000.000000+000", "20010101000000.000000+000", "00000366000000.000000:000"},
        {kNoTime, "20240305120304.000567+000", "00019787120304.000567:000"},
        {"19691231235959.000000+000", kNoTime, "00000000000001.000000:000"},
        {"00000101000000.000000+000", kNoTime, "00719528000000.000000:000"},
        // 13:00 one hour east is noon in Greenwich; half an hour east of it is earlier.
        {"20240305130000.000000+060", "20240305120100.000000+000", "00000000000100.000000:000"},
        {"20240101003000.000000+090", "20231231200000.000000-300", "00000000020000.000000:000"},
        {"00000000235959.999999:000", "00000001000000.000000:000", "00000000000000.000001:000"}};
    for (const auto& c : cases) {
        const TCIMDateTime earlier(c.earlier);
        const TCIMDateTime later(c.later);
        EXPECT_TRUE(earlier < later) << c.earlier;
        EXPECT_FALSE(later < earlier) << c.earlier;
        EXPECT_EQ((later - earlier).ToString(), c.difference) << c.earlier;
        EXPECT_EQ((earlier - later).ToString(), c.difference) << c.earlier;
    }
    const TCIMDateTime here("20240305130000.000000+060");
    const TCIMDateTime there("20240305120000.000000+000");
    EXPECT_FALSE(here < there || there < here);
}

TEST(LocalTime, IsHeldStillOrTheClockWithItsOffset) {
    NQORTQR20::MachineFacts facts;
    facts.machineType = "SIM-1";
    facts.localTime = "20240305120000.000000+060";
    NQORTQR20::SetMachineFacts(facts);
    EXPECT_EQ(TOSSpecific::GetLocalTime().ToString(), "20240305120000.000000+060");
    EXPECT_EQ(TOSSpecific::GetMachineTypeFromID(), "SIM-1");
    NQORTQR20::SetMachineFacts({});

    setenv("TZ", "XYZ-05:30", 1);  // east of Greenwich
    tzset();
    const TCIMDateTime now = TOSSpecific::GetLocalTime();
    unsetenv("TZ");
    tzset();
    EXPECT_EQ(now.GetUTCOffset(), 330);
    const std::time_t seconds = std::time(nullptr);
    char utc[32];
    std::strftime(utc, sizeof utc, "%Y%m%d%H%M%S.000000+000", std::gmtime(&seconds));
    EXPECT_TRUE(now - TCIMDateTime(utc) < TCIMDateTime("00000000000030.000000:000"))
        << now.ToString();
}

}  // namespace
