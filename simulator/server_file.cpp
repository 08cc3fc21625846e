#include "simulator/server_file.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <string_view>

#include "simulator/strict_json.h"

namespace ipmisim {
namespace {

using ipmisel::JsonValue;

constexpr std::uint32_t kMost16 = std::numeric_limits<std::uint16_t>::max();
constexpr std::uint32_t kMost32 = std::numeric_limits<std::uint32_t>::max();

/// "yyyymmddhhmmss.mmmmmm+utc", the form of a CIM date-time (DSP0004).
std::string LocalTime(const JsonValue& value) {
    constexpr std::string_view kForm = "dddddddddddddd.ddddddsddd";
    std::string text = value.Text();
    const bool fits =
        std::equal(text.begin(), text.end(), kForm.begin(), kForm.end(), [](char c, char form) {
            if (form == 'd') return c >= '0' && c <= '9';
            return form == 's' ? c == '+' || c == '-' : c == form;
        });
    if (!fits) value.Refuse("must be a time as in 20240305120000.000000+060");
    return text;
}

std::uint8_t NetFn(const JsonValue& value) {
    const std::uint8_t netFn = value.HexByte();
    if (netFn > 0x3F) value.Refuse("a NetFn has six bits, 00 to 3f");
    return netFn;
}

std::array<std::uint8_t, 16> SelEntry(const JsonValue& value) {
    std::array<std::uint8_t, 16> entry{};
    const Bytes bytes = value.Hex();
    if (bytes.size() != entry.size()) {
        value.Refuse("an entry has 16 bytes, not " + std::to_string(bytes.size()));
    }
    std::copy(bytes.begin(), bytes.end(), entry.begin());
    return entry;
}

std::uint8_t FruDevice(const std::string& key, const JsonValue& value) {
    const bool isNumber =
        !key.empty() && key.size() <= 3 && key.find_first_not_of("0123456789") == std::string::npos;
    const unsigned long number = isNumber ? std::stoul(key) : kMost16;
    if (number > 0xFF) value.Refuse("a FRU device ID is a number from 0 to 255");
    return static_cast<std::uint8_t>(number);
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
                 v.List([&](const JsonValue& e) { bmc->selEntries.push_back(SelEntry(e)); });
             }},
            {"time", [&](const JsonValue& v) { bmc->selTime = v.Number(0, kMost32); }},
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
                 bmc->fru[FruDevice(key, inventory)] = inventory.Hex();
             });
         }},
        {"aux_log", readAuxLog},
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
        {"local_time", [&](const JsonValue& v) { server->localTime = LocalTime(v); }},
        {"smbios",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& s) { server->smbios.push_back(s.Hex()); });
         }},
        {"bmcs",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& b) { ReadBmc(b, &server->bmcs.emplace_back()); });
         }},
    });
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
