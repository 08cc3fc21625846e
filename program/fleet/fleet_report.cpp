#include "program/fleet/fleet_report.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <istream>
#include <limits>
#include <streambuf>
#include <utility>
#include <variant>
#include <vector>

#include "program/commands/failure.h"
#include "program/reports/spool.h"

namespace ipmisel {
namespace {

constexpr off_t kToTheEnd = std::numeric_limits<off_t>::max();

/// Part of a file, whatever else reads it.
class FilePart : public std::streambuf {
public:
    FilePart(int file, off_t begin, off_t length) : file_(file), next_(begin), rest_(length) {}

protected:
    int_type underflow() override {
        const auto wanted = std::min<off_t>(static_cast<off_t>(buffer_.size()), rest_);
        const ssize_t count = pread(file_, buffer_.data(), static_cast<std::size_t>(wanted), next_);
        if (count <= 0) return traits_type::eof();
        next_ += count;
        rest_ -= count;
        setg(buffer_.data(), buffer_.data(), buffer_.data() + count);
        return traits_type::to_int_type(*gptr());
    }

private:
    int file_;
    off_t next_, rest_;
    std::array<char, 1 << 16> buffer_{};
};

class FilePartStream : private FilePart, public std::istream {
public:
    FilePartStream(int file, off_t begin, off_t length)
        : FilePart(file, begin, length), std::istream(static_cast<FilePart*>(this)) {}
};

SavedReport ReadReport(const std::string& name, int file, off_t begin = 0,
                       off_t length = kToTheEnd) {
    return SavedReport(name, [=] { return std::make_unique<FilePartStream>(file, begin, length); });
}

/// Hands a file to `take`, piece by piece.
template <typename Take>
void ForEachPiece(int file, Take take) {
    std::array<char, 1 << 16> piece;
    off_t at = 0;
    for (;;) {
        const ssize_t count = pread(file, piece.data(), piece.size(), at);
        if (count == 0) return;
        if (count < 0) {
            throw Failure(kExitUsage, std::string("cannot read a temporary file: ") +
                                          std::strerror(errno) + "; collect again");
        }
        take(std::string_view(piece.data(), static_cast<std::size_t>(count)));
        at += count;
    }
}

/// A controller without a report of its own, as one that could not be opened.
NQORTQR20::UnreachableNode AsUnreachable(const ControllerEnd& end) {
    return {end.source, LineOf(end.result.outcome)};
}

/// The lines of each controller as it wrote them, and a line for each that could not be read.
class Lines : public FleetReport {
public:
    Lines(const FormatInfo& format, OutputFile& out, const ReportHead& head, const ReportLook& look)
        : format_(format), out_(out), head_(head), look_(look) {}

    void Add(const ControllerEnd& end) override {
        std::string unfinished;  // a line that was cut short is none
        ForEachPiece(end.report.get(), [&](std::string_view piece) {
            const auto lineEnd = piece.rfind('\n') + 1;
            if (lineEnd != 0) {
                out_.Write(unfinished);
                out_.Write(piece.substr(0, lineEnd));
                unfinished.clear();
            }
            unfinished += piece.substr(lineEnd);
        });
        if (!end.result.reported) {
            ReportHead head = head_;
            head.source = end.source;
            head.systems.push_back({end.name, end.source, "", "", "", ""});
            ReportEnd none;
            none.unreachable.push_back(AsUnreachable(end));
            format_.make(out_, head, look_)->Finish(none);
        }
        out_.Flush();
    }
    void Finish(const Outcome&) override {}

private:
    const FormatInfo& format_;
    OutputFile& out_;
    ReportHead head_;
    ReportLook look_;
};

/// Numbers a node anew, where the property is one.
void Renumber(NQORTQR20::PropertyValue* value, std::int64_t nodesBefore) {
    if (auto* const number = std::get_if<std::int64_t>(value)) *number += nodesBefore;
    if (auto* const text = std::get_if<std::string>(value)) {
        *text = std::to_string(std::stoll(*text) + nodesBefore);
    }
}

/// One report as if all controllers were nodes of one machine. The reports wait in one file.
class WholeReport : public FleetReport {
public:
    WholeReport(const FormatInfo& format, OutputFile& out, const ReportHead& head,
                const ReportLook& look)
        : format_(format), out_(out), head_(head), look_(look) {
        format_.make(out_, head_, look_);  // refuses what does not go together, now
    }

    void Add(const ControllerEnd& end) override {
        Controller controller{end.index, end.source, size_, size_, {}, {}};
        if (end.result.reported) {
            ForEachPiece(end.report.get(), [&](std::string_view piece) {
                spool_.Write(piece);
                size_ += static_cast<off_t>(piece.size());
            });
            controller.end = size_;
            const SavedReport saved = ReadReport(end.source, end.report.get());
            controller.systems = saved.Head().systems;
            controller.report = saved.End();
        }
        if (controller.systems.empty()) {
            controller.report.unreachable = {AsUnreachable(end)};
            controller.report.completeness.clear();
        }
        controllers_.push_back(std::move(controller));
    }

    void Finish(const Outcome& outcome) override {
        std::sort(controllers_.begin(), controllers_.end(),
                  [](const Controller& a, const Controller& b) { return a.index < b.index; });
        for (const Controller& controller : controllers_) {
            head_.nodes += controller.systems.size();
            head_.systems.insert(head_.systems.end(), controller.systems.begin(),
                                 controller.systems.end());
        }
        const std::unique_ptr<ReportWriter> report = format_.make(out_, head_, look_);
        ReportEnd all;
        all.recorded = outcome;
        all.systems = head_.systems;
        spool_.Rewind();
        std::int64_t nodes = 0;
        for (Controller& controller : controllers_) {
            if (controller.begin < controller.end) Copy(controller, nodes, report.get());
            nodes += static_cast<std::int64_t>(controller.systems.size());
            Append(std::move(controller.report), &all);
        }
        report->Finish(all);
    }

private:
    struct Controller {
        std::size_t index;
        std::string source;
        off_t begin, end;  ///< of its report in the spool
        std::vector<SystemInfo> systems;
        ReportEnd report;
    };

    void Copy(const Controller& controller, std::int64_t nodesBefore, ReportWriter* report) {
        const SavedReport saved = ReadReport(controller.source, spool_.Descriptor(),
                                             controller.begin, controller.end - controller.begin);
        saved.ForEach([&](const NQORTQR20::Instance& instance) {
            if (nodesBefore == 0 || !NodeOf(instance, head_)) return report->Add(instance);
            NQORTQR20::Instance renumbered = instance;
            const std::string_view property = NodeProperty(instance.className, head_);
            for (auto& [name, value] : renumbered.properties) {
                if (name == property) Renumber(&value, nodesBefore);
            }
            report->Add(renumbered);
        });
    }

    static void Append(ReportEnd&& end, ReportEnd* all) {
        if (all->plugins.empty()) all->plugins = end.plugins;
        for (std::size_t i = 0; i < all->plugins.size() && i < end.plugins.size(); ++i) {
            auto& status = all->plugins[i].status;
            if (status.code == 0) status = end.plugins[i].status;
        }
        if (all->status.code == 0) all->status = end.status;
        // By node: a controller that has none stands for nodes without a count.
        end.exported.resize(end.exported.empty() ? 0 : end.completeness.size());
        const auto append = [](auto&& from, auto* to) {
            to->insert(to->end(), std::make_move_iterator(from.begin()),
                       std::make_move_iterator(from.end()));
        };
        append(end.exported, &all->exported);
        append(end.completeness, &all->completeness);
        append(end.unreachable, &all->unreachable);
        for (std::string& notice : end.notices) {
            auto& notices = all->notices;
            if (std::find(notices.begin(), notices.end(), notice) == notices.end()) {
                notices.push_back(std::move(notice));
            }
        }
    }

    const FormatInfo& format_;
    OutputFile& out_;
    ReportHead head_;
    ReportLook look_;
    Spool spool_;
    off_t size_ = 0;
    std::vector<Controller> controllers_;
};

class Summaries : public FleetReport {
public:
    explicit Summaries(std::vector<SystemSummary>* systems) : systems_(*systems) {}

    void Add(const ControllerEnd& end) override {
        SystemSummary& summary = systems_.emplace_back();
        summary.index = end.index;
        summary.name = end.name;
        summary.outcome = end.result.outcome;
        if (end.result.reported) Summarize(ReadReport(end.source, end.report.get()), &summary);
    }
    void Finish(const Outcome&) override { SortWorstFirst(&systems_); }

private:
    std::vector<SystemSummary>& systems_;
};

/// What is wrong with each of them, on one page.
class Overview : public FleetReport {
public:
    Overview(OutputFile& out, const ReportHead& head, const ReportLook& look, bool html)
        : out_(out), head_(head), look_(look), html_(html), summaries_(&systems_) {}

    void Add(const ControllerEnd& end) override { summaries_.Add(end); }
    void Finish(const Outcome& outcome) override {
        summaries_.Finish(outcome);
        if (html_) {
            WriteHtmlOverview(systems_, outcome, head_, out_);
        } else {
            WriteTableOverview(systems_, outcome, head_, look_, out_);
        }
    }

private:
    OutputFile& out_;
    ReportHead head_;
    ReportLook look_;
    bool html_;
    std::vector<SystemSummary> systems_;
    Summaries summaries_;
};

bool IsOfLines(std::string_view format) {
    return format == "ndjson" || format == "events" || format == "otlp";
}

}  // namespace

std::string_view WorkerFormat(std::string_view format) {
    return IsOfLines(format) ? format : "json";
}

std::unique_ptr<FleetReport> MakeFleetReport(const FormatInfo& format, OutputFile& out,
                                             const ReportHead& head, const ReportLook& look) {
    if (IsOfLines(format.name)) return std::make_unique<Lines>(format, out, head, look);
    if (format.forPeople) {
        return std::make_unique<Overview>(out, head, look, format.name == "html");
    }
    return std::make_unique<WholeReport>(format, out, head, look);
}

SavedReport ReadWorkerReport(const std::string& name, int file) { return ReadReport(name, file); }

std::unique_ptr<FleetReport> MakeSummaries(std::vector<SystemSummary>* systems) {
    return std::make_unique<Summaries>(systems);
}

void FleetOutcome::Add(const Outcome& outcome) {
    if (all_++ == 0) common_ = outcome.exitStatus;
    mixed_ = mixed_ || outcome.exitStatus != common_;
    if (outcome.exitStatus == kExitCollected) ++whole_;
    if (outcome.exitStatus == kExitNoSource) ++notReached_;
}

Outcome FleetOutcome::Get() const {
    if (!mixed_ && common_ == kExitCollected) return {kExitCollected, "", ""};
    const auto count = [this](std::size_t number) {
        return std::to_string(number) + " of " + std::to_string(all_);
    };
    std::string problem;
    if (notReached_ > 0) problem = count(notReached_) + " controllers could not be opened";
    const std::size_t inPart = all_ - whole_ - notReached_;
    if (inPart > 0) {
        problem += (problem.empty() ? "" : ", ") + count(inPart) +
                   (problem.empty() ? " controllers" : "") + " not collected whole";
    }
    return {mixed_ ? kExitPart : common_, problem,
            "see the lines above, then collect from these again"};
}

}  // namespace ipmisel
