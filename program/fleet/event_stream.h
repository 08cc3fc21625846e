#pragma once

#include <string>
#include <string_view>

#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/view.h"

namespace ipmisel {

/// Events as they come: a line each as --format events has them, on standard output; where that is
/// the journal of the system, an entry each with fields of its own.
class EventStream {
public:
    EventStream();
    /// An event of a system, `head` being that of the report that it stands in. Throws Failure.
    void Add(const NQORTQR20::Instance& event, const ReportHead& head);
    /// All that was added is with the reader.
    void Flush() { out_.Flush(); }

private:
    OutputFile out_;
    bool toJournal_;
};

/// An entry of the journal in its native protocol: the sentence with the priority of its severity,
/// and fields IPMISEL_... for what tells events apart.
std::string JournalEntry(const Event& event, const SystemInfo& system);

}  // namespace ipmisel
