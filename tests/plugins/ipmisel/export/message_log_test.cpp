#include "plugins/ipmisel/export/message_log.h"

#include "host/core/host.h"
#include "tests/support/bmc_fixture.h"

namespace ipmiseltest {
namespace {

using ::testing::ElementsAre;

/// "Class: Name=text Name=Class(Key=text) "
std::string Rendered(const NQORTQR20::Instance& instance) {
    std::string text = instance.className + ": ";
    for (const auto& [name, value] : instance.properties) {
        text += name + "=";
        if (const auto* path = std::get_if<NQORTQR20::ObjectPath>(&value)) {
            text +=
                path->className + "(" + path->keys.at(0).first + "=" + path->keys[0].second + ") ";
        } else {
            text += std::get<std::string>(value) + " ";
        }
    }
    return text;
}

TEST(MessageLog, TwoReferencesWhateverTheLogHolds) {
    InstanceRecorder written;
    const NQORTQR20::OutputHandle output(written);
    EXPECT_EQ(ExportMessageLog(nullptr, output.get()), 0);
    EXPECT_EQ(ExportReferences(nullptr, output.get()), 0);
    std::vector<std::string> instances;
    for (const auto& instance : written.instances) instances.push_back(Rendered(instance));
    EXPECT_THAT(instances,
                ElementsAre("QORSG_IPMIMessageLog: CreationClassName=QORSG_IPMIMessageLog "
                            "Name=MessageLogEntry ",
                            "QORSG_IPMIRecordInLog: "
                            "MessageLog=QORSG_IPMIMessageLog(Name=MessageLogEntry) "
                            "LogRecord=QORSG_IPMILogRecord(RecordID=1) ",
                            "QORSG_IPMIRecordInLog: "
                            "MessageLog=QORSG_IPMIMessageLog(Name=MessageLogEntry) "
                            "LogRecord=QORSG_IPMILogRecord(RecordID=2) "));
}

}  // namespace
}  // namespace ipmiseltest
