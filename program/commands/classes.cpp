#include "program/commands/classes.h"

namespace ipmisel {
namespace {

constexpr ClassInfo kClasses[] = {
    {"QORSG_IPMIFirmwareElement", "firmware of the management controller", nullptr},
    {"QORSG_CPLDFirmwareElement", "CPLD versions", nullptr},
    {"QORSG_FPGAFirmwareElement", "FPGA revisions", nullptr},
    {"QORSG_AMIFirmwareElement", "backplane controller firmware", nullptr},
    {"QORSG_IPMIFRU", "inventory of field-replaceable units", nullptr},
    {"QORSG_IPMILogRecord", "the system event log, decoded", nullptr},
    {"QORSG_ZMCAuxDebugRecord", "debug entries of the auxiliary log", nullptr},
    {"QORSG_IPMIMessageLog", "the event log as a whole (only when named with --class)",
     "ExportMessageLog"},
    {"QORSG_IPMIRecordInLog", "log records' places in the log (only when named with --class)",
     "ExportReferences"},
};

}  // namespace

std::span<const ClassInfo> KnownClasses() { return kClasses; }

std::vector<std::string> DefaultClasses() {
    std::vector<std::string> names;
    for (const ClassInfo& info : kClasses) {
        if (info.exporter == nullptr) names.emplace_back(info.name);
    }
    return names;
}

}  // namespace ipmisel
