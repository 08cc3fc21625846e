#include "program/fleet/event_stream.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>

#include "base/text.h"
#include "program/fleet/service_notifier.h"
#include "program/reports/severity.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

constexpr const char* kJournalSocket = "/run/systemd/journal/socket";

/// Whether standard output is the journal: JOURNAL_STREAM names its device and inode,
/// systemd.exec(5).
bool IsJournal() {
    const char* const stream = std::getenv("JOURNAL_STREAM");
    struct stat status {};
    if (stream == nullptr || fstat(STDOUT_FILENO, &status) != 0) return false;
    return Format("%llu:%llu", static_cast<unsigned long long>(status.st_dev),
                  static_cast<unsigned long long>(status.st_ino)) == stream;
}

/// Priorities of syslog(3).
int PriorityOf(std::optional<Severity> severity) {
    if (!severity) return 5;
    switch (*severity) {
        case Severity::kFatal:
            return 1;
        case Severity::kCritical:
            return 2;
        case Severity::kWarning:
            return 4;
        case Severity::kOk:
            return 5;
        case Severity::kInformation:
            return 6;
    }
    return 5;
}

/// The name, and then the value with its length before it: it may be any text.
void AddField(const char* name, const std::string& value, std::string* entry) {
    if (value.empty()) return;
    entry->append(name).append("\n");
    const std::uint64_t length = value.size();
    for (unsigned i = 0; i < sizeof length; ++i) {  // little-endian
        entry->push_back(static_cast<char>(length >> (8 * i)));
    }
    entry->append(value).append("\n");
}

}  // namespace

std::string JournalEntry(const Event& event, const SystemInfo& system) {
    std::string entry;
    AddField("MESSAGE", system.name + ": " + TerminalText(event.sentence), &entry);
    AddField("PRIORITY", std::to_string(PriorityOf(event.severity)), &entry);
    AddField("SYSLOG_IDENTIFIER", "ipmisel", &entry);
    AddField("IPMISEL_SYSTEM", system.name, &entry);
    AddField("IPMISEL_GUID", system.guid, &entry);
    AddField("IPMISEL_KEY", event.key, &entry);
    AddField("IPMISEL_TIME", event.time ? TimeText(*event.time) : "", &entry);
    AddField("IPMISEL_SEVERITY", event.severity ? std::string(InfoOf(*event.severity).name) : "",
             &entry);
    AddField("IPMISEL_STATE", event.state, &entry);
    AddField("IPMISEL_SENSOR", event.sensor, &entry);
    AddField("IPMISEL_PART", event.part, &entry);
    AddField("IPMISEL_PART_NUMBER", event.partNumber, &entry);
    AddField("IPMISEL_SERIAL_NUMBER", event.serialNumber, &entry);
    AddField("IPMISEL_RAW", event.raw, &entry);
    return entry;
}

EventStream::EventStream() : out_(std::nullopt), toJournal_(IsJournal()) {}

void EventStream::Add(const NQORTQR20::Instance& event, const ReportHead& head) {
    const SystemInfo none;
    const SystemInfo& system = head.systems.empty() ? none : head.systems.front();
    if (toJournal_ && SendDatagram(kJournalSocket, JournalEntry(EventOf(event), system))) return;
    MakeEventsReport(out_, head, {})->Add(event);
}

}  // namespace ipmisel
