#include "simulator/server_file.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <limits>
#include <string_view>

#include "base/hex.h"
#include "ipmi/pef.h"
#include "simulator/strict_json.h"

namespace ipmisim {
namespace {

using ipmisel::JsonValue;

constexpr std::uint32_t kMost16 = std::numeric_limits<std::uint16_t>::max();
constexpr std::uint32_t kMost32 = std::numeric_limits<std::uint32_t>::max();

std::uint8_t NetFn(const JsonValue& value) {
    const std::uint8_t netFn = value.HexByte();
    if (netFn > 0x3F) value.Refuse("a NetFn has six bits, 00 to 3f");
    return netFn;
}

/// Seconds since 1970 UTC of such a time; empty where it is no calendar time.
std::optional<std::int64_t> SecondsOf(const std::string& cim) {
    using namespace std::chrono;
    const auto number = [&](std::size_t at, std::size_t digits) {
        return std::stoi(cim.substr(at, digits));
    };
    const year_month_day date{year(number(0, 4)), month(static_cast<unsigned>(number(4, 2))),
                              day(static_cast<unsigned>(number(6, 2)))};
    const int minutesEast = number(22, 3) * (cim[21] == '-' ? -1 : 1);
    if (!date.ok()) return std::nullopt;
    const auto local =
        sys_days(date) + hours(number(8, 2)) + minutes(number(10, 2)) + seconds(number(12, 2));
    return (local - minutes(minutesEast)).time_since_epoch().count();
}

/// Minutes east of UTC, or the value that stands for "not known" (IPMI 2.0, 31.11a).
constexpr std::int32_t kUtcOffsetNotKnown = 0x07FF;

std::int16_t UtcOffset(const JsonValue& value) {
    constexpr std::int32_t kDay = 24 * 60;
    const std::int32_t minutes = value.Integer(-kDay, kUtcOffsetNotKnown);
    if (minutes > kDay && minutes != kUtcOffsetNotKnown) {
        value.Refuse("must be -1440 to 1440, or 2047 for not known");
    }
    return static_cast<std::int16_t>(minutes);
}

template <std::size_t N>
std::array<std::uint8_t, N> Exactly(const JsonValue& value, const char* what) {
    std::array<std::uint8_t, N> exact{};
    const Bytes bytes = value.Hex();
    if (bytes.size() != N) {
        value.Refuse(std::string(what) + " has " + std::to_string(N) + " bytes, not " +
                     std::to_string(bytes.size()));
    }
    std::copy(bytes.begin(), bytes.end(), exact.begin());
    return exact;
}

std::uint8_t FruDevice(const std::string& key, const JsonValue& value) {
    const bool isNumber =
        !key.empty() && key.size() <= 3 && key.find_first_not_of("0123456789") == std::string::npos;
    const unsigned long number = isNumber ? std::stoul(key) : kMost16;
    if (number > 0xFF) value.Refuse("a FRU device ID is a number from 0 to 255");
    return static_cast<std::uint8_t>(number);
}

/// A key of `factors`: a raw reading.
std::uint8_t HexKey(const std::string& key, const JsonValue& value, const char* what) {
    const auto bytes = ipmisel::ParseHex(key);
    if (!bytes || bytes->size() != 1)
        value.Refuse(std::string(what) + " is two hexadecimal digits");
    return bytes->front();
}

/// A key of `sensors`: "NN", or "OWNER/LUN/NN" with the owner in two hexadecimal digits.
SensorAddress AddressOf(const std::string& key, const JsonValue& value) {
    constexpr const char* kForms = "a sensor is NN or OWNER/LUN/NN; each of NN and OWNER";
    SensorAddress address;
    if (key.find('/') == std::string::npos) {
        address.number = HexKey(key, value, kForms);
        return address;
    }
    if (key.size() != 7 || key[2] != '/' || key[4] != '/')
        value.Refuse("a sensor is NN or OWNER/LUN/NN");
    address.owner = HexKey(key.substr(0, 2), value, kForms);
    address.number = HexKey(key.substr(5), value, kForms);
    if (key[3] < '0' || key[3] > '3') value.Refuse("a LUN is 0 to 3");
    address.lun = static_cast<std::uint8_t>(key[3] - '0');
    return address;
}

void ReadSensor(const std::string& key, const JsonValue& value, BmcDescription* bmc) {
    SensorAddress address = AddressOf(key, value);
    const bool isAddressed = key.find('/') != std::string::npos;
    SimulatedSensor sensor;
    const auto onlyOnce = [&](const JsonValue& v) {
        if (isAddressed) v.Refuse("stands in the sensor's key already");
    };
    value.Object({
        {"reading", [&](const JsonValue& v) { sensor.reading = v.HexByte(); }},
        {"states", [&](const JsonValue& v) { sensor.states = v.Hex(); }},
        {"thresholds", [&](const JsonValue& v) { sensor.thresholds = v.Hex(); }},
        {"factors",
         [&](const JsonValue& v) {
             v.Members([&](const std::string& reading, const JsonValue& factors) {
                 const std::uint8_t raw = HexKey(reading, factors, "a reading");
                 if (!sensor.factors.emplace(raw, Exactly<7>(factors, "an answer with factors"))
                          .second)
                     factors.Refuse("the same reading stands here twice");
             });
         }},
        {"owner",
         [&](const JsonValue& v) {
             onlyOnce(v);
             address.owner = v.HexByte();
         }},
        {"lun",
         [&](const JsonValue& v) {
             onlyOnce(v);
             address.lun = static_cast<std::uint8_t>(v.Number(0, 3));
         }},
    });
    if (!bmc->sensors.emplace(address, std::move(sensor)).second) {
        value.Refuse("the same sensor stands here twice");
    }
}

void ReadPef(const JsonValue& value, BmcDescription* bmc) {
    constexpr std::size_t kMaxFilters = 0x7F;
    value.Object({{"filters",
                   [&](const JsonValue& v) {
                       auto& filters = bmc->pefFilters.emplace();
                       v.List([&](const JsonValue& f) {
                           if (filters.size() == kMaxFilters) f.Refuse("at most 127 filters");
                           filters.push_back(
                               Exactly<ipmi::kEventFilterLength>(f, "an event filter"));
                       });
                   },
                   true}});
}

void ReadReply(const JsonValue& value, FixedReply* reply) {
    value.Object({
        {"netfn", [&](const JsonValue& v) { reply->netFn = NetFn(v); }, true},
        {"command", [&](const JsonValue& v) { reply->command = v.HexByte(); }, true},
        {"request", [&](const JsonValue& v) { reply->request = v.Hex(); }},
        {"response", [&](const JsonValue& v) { reply->response = v.Hex(); }, true},
    });
}

void ReadFault(const JsonValue& value, Fault* fault) {
    unsigned kinds = 0;
    const auto is = [&](Fault::Kind kind) {
        fault->kind = kind;
        ++kinds;
    };
    value.Object({
        {"netfn", [&](const JsonValue& v) { fault->netFn = NetFn(v); }, true},
        {"command", [&](const JsonValue& v) { fault->command = v.HexByte(); }, true},
        {"call", [&](const JsonValue& v) { fault->call = v.Number(1, kMost32); }},
        {"no_response",
         [&](const JsonValue& v) {
             if (!v.Flag()) v.Refuse("can only be true; leave the key out");
             is(Fault::Kind::kNoResponse);
         }},
        {"completion_code",
         [&](const JsonValue& v) {
             fault->completionCode = v.HexByte();
             is(Fault::Kind::kCompletionCode);
         }},
        {"truncate",
         [&](const JsonValue& v) {
             fault->truncate = v.Number(0, kMost16);
             is(Fault::Kind::kTruncate);
         }},
        {"data",
         [&](const JsonValue& v) {
             fault->data = v.Hex();
             is(Fault::Kind::kData);
         }},
    });
    if (kinds != 1) {
        value.Refuse("a fault is one of no_response, completion_code, truncate and data, not " +
                     std::to_string(kinds) + " of them");
    }
}

void ReadBmc(const JsonValue& value, BmcDescription* bmc) {
    const auto readSel = [&](const JsonValue& sel) {
        sel.Object({
            {"version", [&](const JsonValue& v) { bmc->selVersion = v.HexByte(); }},
            {"entries",
             [&](const JsonValue& v) {
                 v.List([&](const JsonValue& e) {
                     bmc->selEntries.push_back(Exactly<16>(e, "an entry"));
                 });
             }},
            {"time", [&](const JsonValue& v) { bmc->selTime = v.Number(0, kMost32); }},
            {"free_bytes",
             [&](const JsonValue& v) {
                 bmc->selFreeBytes = static_cast<std::uint16_t>(v.Number(0, kMost16));
             }},
            {"last_addition",
             [&](const JsonValue& v) { bmc->selLastAddition = v.Number(0, kMost32); }},
            {"last_erase", [&](const JsonValue& v) { bmc->selLastErase = v.Number(0, kMost32); }},
            {"overflow", [&](const JsonValue& v) { bmc->selOverflow = v.Flag(); }},
            {"utc_offset_minutes",
             [&](const JsonValue& v) { bmc->utcOffsetMinutes = UtcOffset(v); }},
        });
    };
    const auto readSdr = [&](const JsonValue& sdr) {
        sdr.Object({
            {"version", [&](const JsonValue& v) { bmc->sdrVersion = v.HexByte(); }},
            {"records",
             [&](const JsonValue& v) {
                 v.List([&](const JsonValue& r) { bmc->sdrRecords.push_back(r.Hex()); });
             }},
        });
    };
    const auto readAuxLog = [&](const JsonValue& log) {
        log.Object({{"count", [&](const JsonValue& v) { bmc->auxLogCount = v.Number(0, kMost16); },
                     true}});
    };
    value.Object({
        {"device_id", [&](const JsonValue& v) { bmc->deviceId = v.Hex(); }},
        {"latency_us",
         [&](const JsonValue& v) { bmc->latencyMicroseconds = v.Number(0, kMost32); }},
        {"sel", readSel},
        {"sdr", readSdr},
        {"fru",
         [&](const JsonValue& v) {
             v.Members([&](const std::string& key, const JsonValue& inventory) {
                 if (!bmc->fru.emplace(FruDevice(key, inventory), inventory.Hex()).second)
                     inventory.Refuse("the same FRU device stands here twice");
             });
         }},
        {"aux_log", readAuxLog},
        {"guid", [&](const JsonValue& v) { bmc->guid = Exactly<16>(v, "a GUID"); }},
        {"chassis_status", [&](const JsonValue& v) { bmc->chassisStatus = v.Hex(); }},
        {"self_test", [&](const JsonValue& v) { bmc->selfTest = v.Hex(); }},
        {"sensors",
         [&](const JsonValue& v) {
             v.Members([&](const std::string& key, const JsonValue& sensor) {
                 ReadSensor(key, sensor, bmc);
             });
         }},
        {"pef", [&](const JsonValue& v) { ReadPef(v, bmc); }},
        {"whole_sdr", [&](const JsonValue& v) { bmc->wholeSdr = v.Flag(); }},
        {"replies",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& r) { ReadReply(r, &bmc->replies.emplace_back()); });
         }},
        {"faults",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& f) { ReadFault(f, &bmc->faults.emplace_back()); });
         }},
    });
}

void ReadServer(const JsonValue& value, ServerDescription* server) {
    value.Object({
        {"machine_type", [&](const JsonValue& v) { server->machineType = v.Text(); }},
        {"integrated_bmc", [&](const JsonValue& v) { server->integratedBmc = v.Flag(); }},
        {"ipmi_driver", [&](const JsonValue& v) { server->ipmiDriver = v.Flag(); }},
        {"ipmi_lan", [&](const JsonValue& v) { server->ipmiLan = v.Flag(); }},
        {"local_time", [&](const JsonValue& v) { server->localTime = v.TimeText(); }},
        {"smbios",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& s) { server->smbios.push_back(s.Hex()); });
         }},
        {"bmcs",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& b) { ReadBmc(b, &server->bmcs.emplace_back()); });
         }},
    });
    // The clock of a BMC that does not say otherwise is that of its machine; it keeps local time
    // where the offset is known.
    const auto now = server->localTime ? SecondsOf(*server->localTime) : std::nullopt;
    if (!now) return;
    for (BmcDescription& bmc : server->bmcs) {
        if (bmc.selTime) continue;
        const bool offsetKnown =
            bmc.utcOffsetMinutes && *bmc.utcOffsetMinutes != kUtcOffsetNotKnown;
        bmc.selTime = static_cast<std::uint32_t>(
            *now + (offsetKnown ? *bmc.utcOffsetMinutes * std::int64_t{60} : 0));
    }
}

}  // namespace

ServerDescription ParseServer(const std::string& text, const std::string& name) {
    ServerDescription server;
    try {
        ipmisel::ReadStrictJson(text, name, [&](const JsonValue& v) { ReadServer(v, &server); });
    } catch (const ipmisel::JsonFileError& error) {
        throw ServerFileError(error.what());
    }
    return server;
}

ServerDescription ReadServerFile(const std::string& file) {
    std::string text;
    try {
        text = ipmisel::ReadTextFile(file);
    } catch (const ipmisel::JsonFileError& error) {
        throw ServerFileError(error.what());
    }
    return ParseServer(text, file);
}

}  // namespace ipmisim
