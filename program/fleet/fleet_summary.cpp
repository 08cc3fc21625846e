#include "program/fleet/fleet_summary.h"

#include <algorithm>
#include <map>
#include <utility>

#include "program/commands/failure.h"
#include "program/reports/digest.h"
#include "program/reports/html_page.h"
#include "program/reports/html_text.h"
#include "program/reports/severity.h"
#include "program/reports/terminal_text.h"
#include "program/reports/text_table.h"
#include "program/reports/wording.h"

namespace ipmisel {
namespace {

/// Of one system on a page of many; a controller could report thousands.
constexpr std::size_t kMaxFindings = 20;

std::string SeverityName(std::optional<Severity> severity) {
    return severity ? std::string(InfoOf(*severity).name) : "";
}

/// Not even in part. One that was read may still have failed later, as at the store.
bool IsUnread(const SystemSummary& system) {
    const int status = system.outcome.exitStatus;
    if (status == kExitNoSource) return true;
    return !system.reported && status != kExitCollected && status != kExitPart;
}

std::string ModelText(const SystemInfo& system) {
    return Listed({Listed({system.manufacturer, system.product}, " "),
                   system.serial.empty() ? "" : "serial number " + system.serial});
}

std::string MoreText(const SystemSummary& system) {
    const std::size_t more = system.problems - system.findings.size();
    return more == 0 ? "" : "and " + std::to_string(more) + " more";
}

std::string Element(const std::string& name, const std::string& content,
                    const std::string& attributes = "") {
    return "<" + name + (attributes.empty() ? "" : " " + attributes) + ">" + content + "</" + name +
           ">";
}

std::string Badge(std::optional<Severity> severity) {
    return severity ? Element("span", SeverityName(severity), "class=\"badge\"") : "";
}

std::string FindingHtml(const Finding& finding) {
    std::string html = Badge(finding.severity) + " " + HtmlText(finding.title);
    const std::string order = OrderText(finding.partNumber, finding.serialNumber);
    if (!order.empty()) html += "<br>" + Element("span", HtmlText(order), "class=\"order\"");
    const std::string rest = Listed({PartText("", finding.partCandidates), CourseText(finding)});
    if (!rest.empty()) html += "<br>" + Element("span", HtmlText(rest), "class=\"soft\"");
    return Element("li", html, "class=\"" + SeverityName(finding.severity) + "\"");
}

std::string SystemHtml(const SystemSummary& system) {
    std::string what;
    for (const Finding& finding : system.findings) what += FindingHtml(finding);
    const std::string more = MoreText(system);
    if (!more.empty()) what += Element("li", more);
    if (!what.empty()) what = Element("ul", what, "class=\"findings\"");
    const std::string outcome = LineOf(system.outcome);
    if (!outcome.empty()) what += Element("p", HtmlText(outcome), "class=\"soft\"");
    return Element("tr",
                   Element("th", HtmlText(system.name), "scope=\"row\"") +
                       Element("td", Badge(system.Worst())) +
                       Element("td", HtmlText(ModelText(system.system))) +
                       Element("td", what, "class=\"wide\""),
                   "class=\"" + SeverityName(system.Worst()) + "\"") +
           "\n";
}

}  // namespace

std::optional<Severity> SystemSummary::Worst() const {
    return findings.empty() ? std::nullopt : findings.front().severity;
}

void Summarize(const SavedReport& report, SystemSummary* summary) {
    summary->reported = true;
    if (!report.Head().systems.empty()) summary->system = report.Head().systems.front();
    report.ForEach([summary](const NQORTQR20::Instance& instance) {
        if (instance.className == kEventLogClass) {
            const EventLog log = EventLogOf(instance);
            if (log.records) summary->records = summary->records.value_or(0) + *log.records;
            summary->logUsedPercent = std::max(summary->logUsedPercent, log.usedPercent);
        }
        if (instance.className != kFindingClass) return;
        AddFinding(FindingOf(instance), summary);
    });
}

void AddFinding(const Finding& finding, SystemSummary* summary) {
    ++summary->problems;
    if (finding.severity >= Severity::kCritical) ++summary->critical;
    summary->findings.push_back(finding);
    // The worst first, of every node of the system.
    std::stable_sort(summary->findings.begin(), summary->findings.end(),
                     [](const Finding& a, const Finding& b) { return a.severity > b.severity; });
    if (summary->findings.size() > kMaxFindings) summary->findings.pop_back();
}

void SortWorstFirst(std::vector<SystemSummary>* systems) {
    const auto rank = [](const SystemSummary& system) {
        return std::tuple(system.Worst(), system.outcome.exitStatus != kExitCollected,
                          -static_cast<std::int64_t>(system.index));
    };
    std::sort(systems->begin(), systems->end(),
              [&](const SystemSummary& a, const SystemSummary& b) { return rank(a) > rank(b); });
}

std::string FleetVerdict(const std::vector<SystemSummary>& systems) {
    std::map<Severity, std::size_t, std::greater<>> bySeverity;
    std::size_t well = 0, inPart = 0, unread = 0;
    for (const SystemSummary& system : systems) {
        if (const auto worst = system.Worst()) {
            ++bySeverity[*worst];
        } else if (IsUnread(system)) {
            ++unread;
        } else if (system.outcome.exitStatus == kExitPart) {
            ++inPart;
        } else {
            ++well;
        }
    }
    Texts counts;
    for (const auto& [severity, count] : bySeverity) {
        counts.push_back(std::to_string(count) + " " + std::string(ipmi::SeverityName(severity)));
    }
    const auto add = [&counts](std::size_t count, const char* what) {
        if (count > 0) counts.push_back(std::to_string(count) + what);
    };
    add(well, " without a problem");
    add(inPart, " without a problem in what could be read");
    add(unread, " not read");
    return std::to_string(systems.size()) +
           (systems.size() == 1 ? " controller: " : " controllers: ") + Listed(counts);
}

void WriteTableOverview(const std::vector<SystemSummary>& systems, const Outcome& outcome,
                        const ReportHead& head, const ReportLook& look, OutputFile& out) {
    std::optional<Severity> worst;
    for (const SystemSummary& system : systems) worst = std::max(worst, system.Worst());
    out.Write(Painted(TerminalText(FleetVerdict(systems)) + ".", worst, look) + "\n");
    out.Write("From " + TerminalText(head.source) + ", collected " + DateAndTime(head.collected) +
              " UTC\n");
    TextTable table({{"System", false},
                     {"Severity", false},
                     {"What is wrong"},
                     {"Part number"},
                     {"Serial number"}},
                    1);
    const auto add = [&table](const SystemSummary& system, const Finding& finding,
                              std::optional<Severity> severity) {
        TextTable::Row row{{}, severity, {}};
        row.cells = {system.name, severity ? std::string(InfoOf(*severity).shortName) : "-",
                     finding.title, finding.partNumber, finding.serialNumber};
        for (std::string& cell : row.cells) cell = TerminalText(cell);
        table.Add(row);
    };
    for (const SystemSummary& system : systems) {
        for (const Finding& finding : system.findings) add(system, finding, finding.severity);
        Finding rest;
        rest.title = Listed({MoreText(system), LineOf(system.outcome)}, "; ");
        if (!rest.title.empty()) add(system, rest, {});
    }
    if (!table.Empty()) {
        out.Write("\n");
        table.Print(out, look);
    }
    const std::string end = outcome.problem.empty() ? "Complete." : outcome.problem + ".";
    out.Write("\n" + TerminalText(end) + "\n");
}

void WriteHtmlOverview(const std::vector<SystemSummary>& systems, const Outcome& outcome,
                       const ReportHead& head, OutputFile& out) {
    const std::string style(kPageStyle);
    const std::string verdict = HtmlText(FleetVerdict(systems));
    out.Write(
        "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
        "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; "
        "style-src 'sha256-" +
        Sha256Base64(style) +
        "'; base-uri 'none'; form-action 'none'\">\n"
        "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
        "<meta name=\"referrer\" content=\"no-referrer\">\n<title>" +
        verdict + "</title>\n<style>" + style + "</style>\n</head>\n<body>\n<header>\n" +
        Element("h1", verdict) + "\n" +
        Element("p",
                "Collected " + DateAndTime(head.collected) + " UTC from " + HtmlText(head.source) +
                    (outcome.problem.empty() ? "" : "; " + HtmlText(outcome.problem)),
                "class=\"meta\"") +
        "\n</header>\n<main>\n");
    const auto isWell = [](const SystemSummary& system) {
        return system.findings.empty() && system.outcome.exitStatus == kExitCollected;
    };
    std::string well;
    bool open = false;
    for (const SystemSummary& system : systems) {
        if (isWell(system)) {
            well += Element("li", HtmlText(Listed({system.name, ModelText(system.system)}, ": ")));
            continue;
        }
        if (!open) {
            out.Write(
                "<section aria-label=\"Problems\">\n<div class=\"scroll\"><table>"
                "<thead><tr><th scope=\"col\">System</th><th scope=\"col\">Severity</th>"
                "<th scope=\"col\">Model</th><th scope=\"col\">What is wrong</th></tr></thead>"
                "<tbody>\n");
        }
        open = true;
        out.Write(SystemHtml(system));
    }
    if (open) out.Write("</tbody></table></div>\n</section>\n");
    if (!well.empty()) {
        out.Write("<section aria-label=\"Without a problem\">\n<h2>Without a problem</h2>\n" +
                  Element("ul", well) + "\n</section>\n");
    }
    out.Write("</main>\n<footer><p>Written by ipmisel.</p></footer>\n</body>\n</html>\n");
}

}  // namespace ipmisel
