#pragma once

#include <gmock/gmock.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "base/text.h"
#include "tests/support/ipmi_sim.h"
#include "tests/support/run_program.h"

namespace ipmiseltest {

using Json = nlohmann::ordered_json;

/// A case that runs `ipmisel` with a folder for its input and one for what it writes.
class ProgramTest : public ::testing::Test {
protected:
    TemporaryFolder folder;
    TemporaryFolder place;
    Setting setting;

    static std::vector<std::string> Command(std::vector<std::string> arguments) {
        arguments.insert(arguments.begin(), IPMISEL_PROGRAM);
        return arguments;
    }
    Ended Run(const std::vector<std::string>& arguments) {
        return RunningProgram(folder.path().string(), Command(arguments), setting).Wait();
    }
    Ended Collect(const std::string& source, std::vector<std::string> more = {}) {
        more.insert(more.begin(), {"collect", "--from", source});
        return Run(more);
    }
    /// The JSON report of a collection that writes one.
    Json Report(const std::string& source, std::vector<std::string> more = {}) {
        more.insert(more.end(), {"--format", "json"});
        const Ended ended = Collect(source, more);
        Json report = Json::parse(ended.out, nullptr, false);
        EXPECT_FALSE(report.is_discarded()) << ended.out << ended.err;
        return report;
    }

    static std::string Example(const std::string& name) {
        return "sim:" IPMISEL_EXAMPLES "/" + name + ".json";
    }
    /// A machine with a BMC whose event log has so many entries of sensor 0x30.
    static Json Server(int entries = 1) {
        Json log = Json::array();
        for (int i = 1; i <= entries; ++i) {
            log.push_back(ipmisel::Format("%02x%02x 02 b0e5e665 2000 04 01 30 01 59 50 45",
                                          i & 0xFF, i >> 8));
        }
        return {{"machine_type", "SIM-T"},
                {"local_time", "20240305120000.000000+060"},
                {"smbios", {"26123000012020ffa30c0000000000000105 0000"}},
                {"bmcs",
                 {{{"sel", {{"entries", log}, {"time", 1709640000}}},
                   {"sdr", {{"records", {kSensorRecord}}}}}}}};
    }
    std::string Write(const Json& server) {
        return "sim:" + folder.Write("server.json", server.dump());
    }
    /// A full sensor record: sensor 0x30 of processor 1, "CPU1 Temp", degrees C as they are read.
    static constexpr const char* kSensorRecord =
        "0100 51 01 34 200030 0301 7f68 0101 ffffffffffff 80010000 010000000000"
        "0000000000000000000000000000000000 c9 435055312054656d70";

    std::string InPlace(const std::string& name) const { return (place.path() / name).string(); }
    /// The names of what the program left behind.
    std::vector<std::string> Left() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(place.path())) {
            names.push_back(entry.path().filename().string());
        }
        std::sort(names.begin(), names.end());
        return names;
    }
};

}  // namespace ipmiseltest
