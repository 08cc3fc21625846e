#include "collector/report.h"

namespace ipmisel {
namespace {

constexpr FormatInfo kFormats[] = {
    {"table", MakeTableReport},
    {"json", MakeJsonReport},
    {"ndjson", MakeNdjsonReport},
};

void AppendAccount(const char* what, const tqrhost::SourceAccount& account, std::string* text) {
    if (!account.announced || account.read >= *account.announced) return;
    *text += (text->empty() ? "" : ", ") + std::to_string(*account.announced - account.read) +
             " of " + std::to_string(*account.announced) + " " + what + " not read";
}

}  // namespace

std::span<const FormatInfo> KnownFormats() { return kFormats; }

std::string MissingText(const ReportEnd& end) {
    std::string text;
    for (std::size_t node = 0; node < end.completeness.size(); ++node) {
        const tqrhost::NodeCompleteness& account = end.completeness[node];
        if (account.Whole()) continue;
        std::string part;
        AppendAccount("log records", account.log, &part);
        AppendAccount("sensor records", account.sensors, &part);
        for (const tqrhost::ReadFault& fault : account.faults) {
            if (!fault.ofLogOrSensors) continue;
            part += (part.empty() ? "" : ", ") + fault.what +
                    (fault.record.empty() ? "" : " " + fault.record) + ": " + fault.problem;
            break;  // the first tells why; the report has them all
        }
        text += text.empty() ? "" : "; ";
        if (end.completeness.size() > 1) text += "node " + std::to_string(node + 1) + ": ";
        text += part;
    }
    return text;
}

}  // namespace ipmisel
