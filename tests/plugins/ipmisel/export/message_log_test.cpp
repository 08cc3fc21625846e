#include "plugins/ipmisel/export/message_log.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

// A host of its own: the order of the calls is what is tested.

namespace {
std::vector<std::string> gCalls;
int gReferences = 0;

NQORTQR20::TTQRStatusCode Note(const std::string& call) {
    gCalls.push_back(call);
    return {NQORTQR20::kStatusOk};
}
}  // namespace

namespace NQORTQR20 {

struct TCIMReference {
    std::string name;
};

TTQRStatusCode fdrGetInstance(fdriIOHandle*, const char* className) {
    return Note(std::string("instance of ") + className);
}
TTQRStatusCode fdrAddProperty(fdriIOHandle*, const char* name, const char* value) {
    return Note(std::string(name) + " = " + value);
}
TTQRStatusCode fdrAddInstance(fdriIOHandle*) { return Note("add"); }
TTQRStatusCode fdrNewCIMReference(TCIMReference** reference, fdriIOHandle*) {
    *reference = new TCIMReference{"r" + std::to_string(++gReferences)};
    return Note("new " + (*reference)->name);
}
TTQRStatusCode fdrSetReferenceClassName(TCIMReference* reference, const char* className) {
    return Note(reference->name + " to " + className);
}
TTQRStatusCode fdrReferenceAddString(TCIMReference* reference, const char* key, const char* value) {
    return Note(reference->name + " with " + key + " = " + value);
}
TTQRStatusCode fdrAddReferenceProperty(fdriIOHandle*, const char* name, TCIMReference* reference) {
    return Note(std::string(name) + " = " + reference->name);
}
TTQRStatusCode fdrDeleteCIMReference(TCIMReference* reference) {
    Note("delete " + reference->name);
    delete reference;
    return {kStatusOk};
}

}  // namespace NQORTQR20

namespace {

using ::testing::ElementsAre;

TEST(MessageLog, OneInstanceOfTheLog) {
    gCalls.clear();
    EXPECT_EQ(ExportMessageLog(nullptr, nullptr), 0);
    EXPECT_THAT(gCalls, ElementsAre("instance of QORSG_IPMIMessageLog",
                                    "CreationClassName = QORSG_IPMIMessageLog",
                                    "Name = MessageLogEntry", "add"));
}

TEST(MessageLog, TwoReferencesWhateverTheLogHolds) {
    gCalls.clear();
    EXPECT_EQ(ExportReferences(nullptr, nullptr), 0);
    EXPECT_THAT(
        gCalls,
        ElementsAre("new r1", "new r2", "instance of QORSG_IPMIRecordInLog",
                    "r1 to QORSG_IPMIMessageLog", "r1 with Name = MessageLogEntry",
                    "r2 to QORSG_IPMILogRecord", "r2 with RecordID = 1", "MessageLog = r1",
                    "LogRecord = r2", "delete r2", "add", "instance of QORSG_IPMIRecordInLog",
                    "new r3", "r3 to QORSG_IPMILogRecord", "r3 with RecordID = 2",
                    "MessageLog = r1", "LogRecord = r3", "delete r3", "add", "delete r1"));
}

}  // namespace
