#include <algorithm>
#include <cmath>
#include <map>
#include <memory>
#include <numeric>
#include <unordered_map>

#include "base/text.h"
#include "program/reports/digest.h"
#include "program/reports/html_page.h"
#include "program/reports/html_text.h"
#include "program/reports/report.h"
#include "program/reports/spool.h"
#include "program/reports/systems.h"
#include "program/reports/timeline.h"
#include "program/reports/wording.h"

// One HTML file that needs nothing else: its style and its script are in it, and its
// Content-Security-Policy allows these two and nothing from outside. It is readable without the
// script, which filters the events and shows times in another zone.

namespace ipmisel {
namespace {

/// Rows of an open table; the events of a longer log are folded into tables of so many.
constexpr std::size_t kRowsOfTable = 1000;
constexpr std::size_t kRowIdDigits = 16;
constexpr unsigned kMaxLinks = 8;

std::string Element(const std::string& name, const std::string& content,
                    const std::string& attributes = "") {
    return "<" + name + (attributes.empty() ? "" : " " + attributes) + ">" + content + "</" + name +
           ">";
}

/// A moment that the reader's script may show in another time zone.
std::string TimeElement(NQORTQR20::Time time) {
    return Element("time", DateAndTime(time), "datetime=\"" + TimeText(time) + "\"");
}

std::string SeverityName(std::optional<Severity> severity) {
    return severity ? std::string(InfoOf(*severity).name) : "none";
}

std::string Badge(std::optional<Severity> severity) {
    if (!severity) return "";
    return Element("span", SeverityName(severity), "class=\"badge\"");
}

/// Terms and what they are; those without a value are left out.
class Definitions {
public:
    /// `html` is markup.
    Definitions& AddHtml(const std::string& term, const std::string& html,
                         const std::string& attributes = "") {
        if (!html.empty()) {
            html_ += Element("dt", HtmlText(term)) + Element("dd", html, attributes) + "\n";
        }
        return *this;
    }
    Definitions& Add(const std::string& term, const std::string& text,
                     const std::string& attributes = "") {
        return AddHtml(term, HtmlText(text), attributes);
    }
    Definitions& Add(const std::string& term, const MaybeTime& time) {
        return AddHtml(term, time ? TimeElement(*time) : "");
    }
    std::string Html() const { return html_.empty() ? "" : Element("dl", html_); }

private:
    std::string html_;
};

constexpr const char* kOrder = "class=\"order\"";

struct Cell {
    std::string html;
    std::string attributes{};
};

std::string Row(const std::vector<Cell>& cells, const std::string& attributes = "") {
    std::string html;
    for (const Cell& cell : cells) html += Element("td", cell.html, cell.attributes);
    return Element("tr", html, attributes) + "\n";
}

/// The beginning of a table up to its rows.
std::string TableHead(const Texts& titles, const std::string& className,
                      const std::string& caption) {
    std::string html;
    for (const std::string& title : titles) html += Element("th", title, "scope=\"col\"");
    return "<div class=\"scroll\"><table class=\"" + className + "\" aria-label=\"" +
           HtmlText(caption) + "\"><thead>" + Element("tr", html) + "</thead><tbody>\n";
}
constexpr const char* kTableEnd = "</tbody></table></div>\n";

/// A sensor's limits from left to right, and where its reading stands.
std::string BarOf(const Sensor& sensor) {
    std::vector<double> known;
    for (const Real& value : {sensor.lowerCritical, sensor.lowerNonCritical,
                              sensor.upperNonCritical, sensor.upperCritical}) {
        if (value) known.push_back(*value);
    }
    if (known.empty() || !sensor.reading) return "";
    known.push_back(*sensor.reading);
    for (const Real& value : {sensor.normalMinimum, sensor.normalMaximum}) {
        if (value) known.push_back(*value);
    }
    const auto [least, most] = std::minmax_element(known.begin(), known.end());
    const double margin = *most > *least ? (*most - *least) * 0.12 : 1;
    const double low = *least - margin;
    const double scale = 200 / (*most + margin - low);
    // Numbers so far apart that their distance is none.
    if (!std::isfinite(low) || !(scale > 0)) return "";
    const auto x = [&](double value) { return (value - low) * scale; };
    std::string zones;
    const auto zone = [&](const char* name, double from, double to) {
        if (to > from) {
            zones += Format("<rect class=\"%s\" x=\"%.1f\" y=\"4\" width=\"%.1f\" height=\"8\"/>",
                            name, from, to - from);
        }
    };
    const double okFrom = sensor.lowerNonCritical ? x(*sensor.lowerNonCritical)
                          : sensor.lowerCritical  ? x(*sensor.lowerCritical)
                                                  : 0;
    const double okTo = sensor.upperNonCritical ? x(*sensor.upperNonCritical)
                        : sensor.upperCritical  ? x(*sensor.upperCritical)
                                                : 200;
    if (sensor.lowerCritical) zone("critical", 0, x(*sensor.lowerCritical));
    if (sensor.lowerNonCritical) {
        zone("warning", sensor.lowerCritical ? x(*sensor.lowerCritical) : 0, okFrom);
    }
    zone("ok", okFrom, okTo);
    if (sensor.upperNonCritical) {
        zone("warning", okTo, sensor.upperCritical ? x(*sensor.upperCritical) : 200);
    }
    if (sensor.upperCritical) zone("critical", x(*sensor.upperCritical), 200);
    return "<svg class=\"bar\" viewBox=\"0 0 200 16\" preserveAspectRatio=\"none\" "
           "aria-hidden=\"true\">" +
           zones +
           Format("<rect class=\"reading\" x=\"%.1f\" y=\"0\" width=\"3\" height=\"16\"/></svg>",
                  x(*sensor.reading) - 1.5);
}

std::string LimitsText(const Sensor& s) {
    const auto limit = [](const char* name, const Real& value) {
        return value ? name + NumberText(*value) : std::string();
    };
    return Listed(
        {limit("critical below ", s.lowerCritical), limit("warning below ", s.lowerNonCritical),
         limit("warning above ", s.upperNonCritical), limit("critical above ", s.upperCritical)});
}

/// The problems stand before the events and are known after them: the rows of events wait.
class HtmlReport : public ReportWriter {
public:
    HtmlReport(OutputFile& out, const ReportHead& head)
        : out_(out), head_(head), systems_(head), logs_(systems_.All().size()) {}

    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className == kEventClass) {
            AddEvent(EventOf(instance));
        } else if (machine_.Add(instance) && instance.className == kControllerClass) {
            systems_.Add(machine_.controllers.back());
        }
    }

    void Finish(const ReportEnd& end) override {
        outcome_ = OutcomeOf(end);
        hidden_ = end.hiddenEvents;
        noEvents_ = Element("p", NoEventsText(end), "class=\"soft\"") + "\n";
        WriteTop();
        WriteProblems();
        WriteParts();
        WriteTimelines();
        WriteEvents();
        WriteSensors();
        WriteInventory();
        WriteControllers();
        WriteNotRead(end);
        WriteHow(end);
        out_.Write(
            "</main>\n<footer><p>Written by ipmisel. Colours and places on this page never "
            "stand alone: what they mean is written beside them.</p></footer>\n<script>" +
            std::string(kPageScript) + "</script>\n</body>\n</html>\n");
    }

private:
    struct Log {
        Spool rows;
        std::size_t count = 0;
        Timeline timeline;
        MaybeTime first, last;
    };

    bool Several() const { return systems_.All().size() > 1; }
    std::size_t IndexOf(Integer node) const {
        const auto index = static_cast<std::size_t>(node.value_or(1) - 1);
        return std::min(index, systems_.All().size() - 1);
    }
    std::string NameOf(std::size_t index) const {
        std::string name = systems_.LabelOf(static_cast<std::int64_t>(index + 1));
        return name.empty() ? Format("node %zu", index + 1) : name;
    }

    /// Equal records are one event; only the first of them can be the target of a link.
    std::string RowIdOf(const Event& event) {
        const std::string& key = event.key;
        if (key.size() < kRowIdDigits || !records_.emplace(key, event.recordId).second) return "";
        return "e-" + HtmlText(key.substr(0, kRowIdDigits));
    }
    /// "record 41", leading to its row; empty for an event that has none.
    std::string LinkTo(const std::string& key) const {
        const auto record = records_.find(key);
        if (record == records_.end()) return "";
        return Element("a",
                       record->second ? "record " + std::to_string(*record->second) : "the event",
                       "href=\"#e-" + HtmlText(key.substr(0, kRowIdDigits)) + "\"");
    }

    void AddEvent(const Event& event) {
        Log& log = logs_[IndexOf(event.node)];
        const std::string row = RowIdOf(event);
        log.timeline.Add(event, row);
        log.rows.Append(EventRow(event, row));
        ++log.count;
        if (event.time) {
            if (!log.first) log.first = event.time;
            log.last = event.time;
        }
        zoneUnknown_ = zoneUnknown_ || event.timeZoneKnown == false;
    }

    /// The sensor has a column of its own.
    static std::string SubjectOf(const Event& event) {
        const std::string part = PartText(event.part, event.partCandidates);
        return part.empty() && event.sensor.empty() ? event.sensorType : part;
    }
    /// What is over by itself has no state worth a word.
    static std::string StateText(const std::string& state) {
        if (state != "open" && state != "resolved") return "";
        return " " + Element("span", state, "class=\"soft\"");
    }
    /// "key text" where the text is known.
    static std::string Named(const char* key, const std::string& text) {
        return text.empty() ? "" : key + text;
    }
    std::string EventRow(const Event& event, const std::string& row) const {
        const auto code = [](const char* key, Integer number) {
            return number ? Format("%s%02llXh", key, static_cast<long long>(*number)) : "";
        };
        std::string raw;
        for (std::size_t i = 0; i < event.raw.size(); i += 2) {
            raw += (i == 0 ? "" : " ") + event.raw.substr(i, 2);
        }
        const std::string detail = Listed(
            {Named("from ", event.generator),
             Listed({Named("sensor type ", event.sensorType), code("", event.sensorTypeCode)}, " "),
             code("sensor number ", event.sensorNumber),
             Listed({Named("event type ", event.eventType), code("", event.eventTypeCode)}, " "),
             code("offset ", event.offset), OrderText(event.partNumber, event.serialNumber),
             Named("severity by ", event.severityFrom), event.state,
             event.resolvedTime ? "resolved " + DateAndTime(*event.resolvedTime) : "",
             event.correctedTime ? "with the clock put right " + DateAndTime(*event.correctedTime)
                                 : "",
             Named("manufacturer's data ", event.makerData), Named("bytes ", raw)},
            "; ");
        const std::string what = Element(
            "details", Element("summary", HtmlText(event.text)) + Element("p", HtmlText(detail)));
        return Row(
            {{event.recordId ? std::to_string(*event.recordId) : "", "class=\"num\""},
             {event.time ? TimeElement(*event.time) : HtmlText(WhenText(event)), "class=\"when\""},
             {Badge(event.severity) + StateText(event.state)},
             {HtmlText(SubjectOf(event)), "class=\"part\""},
             {HtmlText(event.sensor), "class=\"sensor\""},
             {what, "class=\"wide\""},
             {HtmlText(ReadingText(event)), "class=\"reading\""}},
            (row.empty() ? "" : "id=\"" + row + "\" ") + "class=\"" + SeverityName(event.severity) +
                "\"");
    }

    std::string Verdict() const { return VerdictText(machine_.findings, outcome_.exitStatus != 0); }

    void WriteTop() {
        const SystemInfo& first = systems_.All().front();
        const std::string name = Several()             ? head_.source
                                 : !first.name.empty() ? first.name
                                                       : head_.source;
        const std::string style(kPageStyle), script(kPageScript);
        out_.Write(
            "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
            "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; "
            "style-src 'sha256-" +
            Sha256Base64(style) + "'; script-src 'sha256-" + Sha256Base64(script) +
            "'; base-uri 'none'; form-action 'none'\">\n"
            "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
            "<meta name=\"referrer\" content=\"no-referrer\">\n<title>" +
            HtmlText(name + ": " + Verdict()) + "</title>\n<style>" + style +
            "</style>\n</head>\n<body>\n"
            "<a class=\"skip\" href=\"#events\">To the events</a>\n<header>\n" +
            Element("h1", HtmlText(name)) + "\n");
        for (const SystemInfo& system : systems_.All()) {
            const std::string model = Listed({system.manufacturer, system.product}, " ");
            const std::string text =
                Listed({Several() ? system.name : "",
                        model.empty() && !Several() ? head_.machineType : model,
                        Named("serial number ", system.serial)});
            if (!text.empty()) out_.Write(Element("p", HtmlText(text)) + "\n");
        }
        out_.Write(
            Element("p",
                    "Collected " + TimeElement(head_.collected) + " from " +
                        HtmlText(head_.source) + ". Times are in " +
                        "<label><select id=\"zone\" aria-label=\"Time zone\">"
                        "<option value=\"\">UTC</option></select></label>" +
                        (zoneUnknown_ ? ", as far as the controller's own zone is known" : ""),
                    "class=\"meta\"") +
            "\n<nav aria-label=\"On this page\"><a href=\"#problems\">Problems</a>"
            "<a href=\"#parts\">Parts</a><a href=\"#timeline\">Timeline</a>"
            "<a href=\"#events\">Events</a><a href=\"#sensors\">Sensors</a>"
            "<a href=\"#inventory\">Inventory</a><a href=\"#controller\">Controller</a>"
            "<a href=\"#missing\">Not read</a></nav>\n</header>\n<main>\n");
    }

    void Section(const std::string& id, const std::string& title, const std::string& content,
                 const std::string& className = "") {
        out_.Write("<section id=\"" + id + "\"" +
                   (className.empty() ? "" : " class=\"" + className + "\"") +
                   " aria-labelledby=\"" + id + "-title\">\n" +
                   Element("h2", HtmlText(title), "id=\"" + id + "-title\"") + "\n" + content +
                   "</section>\n");
    }

    void WriteProblems() {
        const std::vector<Finding>& findings = machine_.findings;
        std::string list;
        for (const Finding& f : findings) {
            const std::string node = Several() ? NameOf(IndexOf(f.node)) + ": " : "";
            std::string events;
            unsigned linked = 0;
            for (const std::string& key : f.events) {
                const std::string link = LinkTo(key);
                if (!link.empty()) events += (events.empty() ? "" : ", ") + link;
                ++linked;
                if (linked == kMaxLinks) break;  // the others stand near
            }
            if (f.events.size() > kMaxLinks) {
                events += " and " + std::to_string(f.events.size() - kMaxLinks) + " more";
            }
            Definitions d;
            d.Add("Part", PartText(f.part, f.partCandidates))
                .Add("Part number", f.partNumber, kOrder)
                .Add("Serial number", f.serialNumber, kOrder)
                .Add("First", f.firstTime);
            if (f.lastTime != f.firstTime) d.Add("Last", f.lastTime);
            const bool counts = f.count && *f.count > 0;
            d.AddHtml("Events", Listed({counts ? std::to_string(*f.count) : "", events}, ": "))
                .Add("Now",
                     f.stillPresent ? (*f.stillPresent ? "still present" : "no longer seen") : "");
            if (std::find(f.events.begin(), f.events.end(), f.firstCause) == f.events.end()) {
                const std::string first = LinkTo(f.firstCause);
                if (!first.empty()) {
                    d.AddHtml("Came after", first + ", the first fault at about that time");
                }
            }
            std::string evidence;
            for (const std::string& line : f.evidence) evidence += Element("li", HtmlText(line));
            list +=
                Element("li",
                        Element("h3", Badge(f.severity) + " " + HtmlText(node + f.title)) +
                            d.Html() +
                            (evidence.empty() ? ""
                                              : Element("details", Element("summary", "Evidence") +
                                                                       Element("ul", evidence))),
                        "class=\"" + SeverityName(f.severity) + "\"") +
                "\n";
        }
        std::string content = list.empty() ? "" : "<ol class=\"findings\">\n" + list + "</ol>\n";
        if (findings.empty()) {
            content =
                "<p>Neither the event log nor the sensors show anything that is wrong now.</p>\n";
        }
        if (!outcome_.problem.empty()) {
            content += "<p><strong>Not everything could be read:</strong> " +
                       HtmlText(outcome_.problem) +
                       ". <a href=\"#missing\">What is missing</a></p>\n";
        }
        const std::string worst = findings.empty() ? (outcome_.exitStatus == 0 ? "ok" : "warning")
                                                   : SeverityName(findings.front().severity);
        Section("problems", Verdict(), content, "verdict " + worst);
    }

    /// A part as it is ordered, and the worst that is wrong with it.
    struct PartRow {
        std::size_t system;
        std::string name, manufacturer, product, partNumber, serialNumber;
        std::string boardSerialNumber{};  ///< of the board in it, where it has one of its own
        std::optional<Severity> worst{};
        bool Is(const Finding& finding) const {
            return serialNumber.empty() || finding.serialNumber.empty()
                       ? name == finding.part
                       : serialNumber == finding.serialNumber ||
                             boardSerialNumber == finding.serialNumber;
        }
    };
    /// Those of the inventory, and those that only a finding names; the ones with problems first.
    std::vector<PartRow> PartRows() const {
        std::vector<PartRow> rows;
        const auto orElse = [](const std::string& text, const std::string& other) {
            return text.empty() ? other : text;
        };
        for (const Fru& f : machine_.frus) {
            rows.push_back({IndexOf(f.node), FruName(f),
                            orElse(f.manufacturer, f.moduleManufacturer), f.product,
                            orElse(f.partNumber, f.modulePartNumber),
                            orElse(f.serialNumber, f.moduleSerialNumber), f.boardSerialNumber});
        }
        for (const Finding& finding : machine_.findings) {
            if (finding.part.empty()) continue;
            const std::size_t system = IndexOf(finding.node);
            auto row = std::find_if(rows.begin(), rows.end(), [&](const PartRow& r) {
                return r.system == system && r.Is(finding);
            });
            if (row == rows.end()) {
                rows.push_back(
                    {system, finding.part, {}, {}, finding.partNumber, finding.serialNumber, {}});
                row = rows.end() - 1;
            }
            row->worst = std::max(row->worst, finding.severity);
            if (!finding.serialNumber.empty()) {  // of the board, where that is what is broken
                row->partNumber = finding.partNumber;
                row->serialNumber = finding.serialNumber;
            }
        }
        // What is neither broken nor known by anything but its place is no help here.
        std::erase_if(rows, [](const PartRow& r) {
            return !r.worst && (r.manufacturer + r.product + r.partNumber + r.serialNumber).empty();
        });
        std::stable_sort(rows.begin(), rows.end(),
                         [](const PartRow& a, const PartRow& b) { return a.worst > b.worst; });
        return rows;
    }

    void WriteParts() {
        std::string rows;
        for (const PartRow& part : PartRows()) {
            rows += Row(
                {{HtmlText(Several() ? NameOf(part.system) + ": " + part.name : part.name)},
                 {part.worst
                      ? Element("span", SeverityName(part.worst) + " problem", "class=\"badge\"")
                      : ""},
                 {HtmlText(part.manufacturer)},
                 {HtmlText(part.product), "class=\"wide\""},
                 {HtmlText(part.partNumber), "class=\"order\" data-label=\"Part number\""},
                 {HtmlText(part.serialNumber), "class=\"order\" data-label=\"Serial number\""}},
                part.worst ? "class=\"" + SeverityName(part.worst) + "\"" : "");
        }
        Section("parts", "Parts and their order numbers",
                rows.empty() ? "<p class=\"soft\">The controller told of none.</p>\n"
                             : TableHead({"Part", "State", "Manufacturer", "Product", "Part number",
                                          "Serial number"},
                                         "cards", "Parts") +
                                   rows + kTableEnd);
    }
    static std::string FruName(const Fru& f) {
        if (!f.name.empty()) return f.name;
        return f.deviceId ? "FRU device " + std::to_string(*f.deviceId) : "FRU device";
    }

    void WriteTimelines() {
        std::string content;
        for (std::size_t i = 0; i < logs_.size(); ++i) {
            const std::string svg = logs_[i].timeline.Svg();
            if (svg.empty()) continue;
            if (Several()) content += Element("h3", HtmlText(NameOf(i))) + "\n";
            content += "<div class=\"scroll\">" + svg + "</div>\n";
        }
        if (!content.empty()) {
            content +=
                "<p class=\"soft\">Left to right in the order of the log; long pauses are drawn "
                "short, as grey fields. A dashed line is a clock that went back. Each mark leads "
                "to its event; a larger one stands for several.</p>\n";
        }
        Section("timeline", "Timeline", content.empty() ? noEvents_ : content);
    }

    void WriteFilters() {
        std::string boxes;
        const auto box = [&boxes](const std::string& name, const std::string& text) {
            boxes += "<label><input type=\"checkbox\" checked value=\"" + name + "\"> " + text +
                     "</label>";
        };
        const auto all = Severities();
        std::for_each(all.rbegin(), all.rend(), [&](const SeverityInfo& info) {
            box(std::string(info.name), std::string(info.name));
        });
        box("none", "not graded");
        out_.Write(
            "<form id=\"filters\" class=\"filters\" hidden><fieldset><legend>Severity</legend>" +
            boxes +
            "</fieldset><label>Part <select id=\"by-part\"><option value=\"\">all</option>"
            "</select></label> <label>Sensor <select id=\"by-sensor\"><option value=\"\">all"
            "</option></select></label> <label>Text <input type=\"search\" id=\"by-text\"></label>"
            " <button type=\"reset\">Show all</button> <output id=\"count\" aria-live=\"polite\">"
            "</output></form>\n");
    }

    void WriteEvents() {
        out_.Write(
            "<section id=\"events\" aria-labelledby=\"events-title\">\n"
            "<h2 id=\"events-title\">Events</h2>\n");
        if (hidden_ > 0) {
            const std::size_t shown =
                std::accumulate(logs_.begin(), logs_.end(), std::size_t{0},
                                [](std::size_t sum, const Log& log) { return sum + log.count; });
            out_.Write("<p>" + HtmlText(ShownText(shown, hidden_)) + "</p>\n");
        }
        const bool any =
            std::any_of(logs_.begin(), logs_.end(), [](const Log& l) { return l.count > 0; });
        if (any) {
            WriteFilters();
        } else {
            out_.Write(noEvents_);
        }
        for (std::size_t i = 0; i < logs_.size(); ++i) {
            if (logs_[i].count == 0) continue;
            if (Several()) out_.Write(Element("h3", HtmlText(NameOf(i))) + "\n");
            WriteLog(&logs_[i]);
        }
        out_.Write("</section>\n");
    }
    void WriteLog(Log* log) {
        const bool folded = log->count > kRowsOfTable;
        if (folded) {
            out_.Write(Format("<p>%zu events, folded into tables of %zu; the newest is open.</p>\n",
                              log->count, kRowsOfTable));
        }
        log->rows.Rewind();
        std::size_t written = 0;
        for (std::string row; log->rows.Next(&row); ++written) {
            if (written % kRowsOfTable == 0) {
                if (written > 0) out_.Write(kTableEnd + std::string(folded ? "</details>\n" : ""));
                const std::size_t last = std::min(written + kRowsOfTable, log->count);
                if (folded) {
                    out_.Write(
                        Format("<details class=\"fold\"%s><summary>Events %zu to %zu</summary>\n",
                               last == log->count ? " open" : "", written + 1, last));
                }
                out_.Write(TableHead(
                    {"Record", "Time", "Severity", "Part", "Sensor", "What happened", "Reading"},
                    "events cards", "Events"));
            }
            out_.Write(row);
        }
        out_.Write(kTableEnd + std::string(folded ? "</details>\n" : ""));
    }

    void WriteSensors() {
        std::string rows;
        for (const Sensor& s : machine_.sensors) {
            const std::optional<Severity> severity = ParseSeverity(s.status);
            const std::string reading =
                s.reading ? NumberText(*s.reading) + (s.unit.empty() ? "" : " " + s.unit) : "";
            rows +=
                Row({{HtmlText(Several() ? NameOf(IndexOf(s.node)) + ": " + s.name : s.name)},
                     {s.status.empty() ? ""
                      : severity       ? Badge(severity)
                                       : Element("span", HtmlText(s.status), "class=\"soft\"")},
                     {HtmlText(reading), "class=\"num\""},
                     {BarOf(s)},
                     {HtmlText(Listed({LimitsText(s), Listed(s.states)}, "; ")), "class=\"wide\""}},
                    "class=\"" + SeverityName(severity) + "\"");
        }
        Section("sensors", "Sensors now",
                rows.empty() ? "<p class=\"soft\">None was read.</p>\n"
                             : TableHead({"Sensor", "Status", "Reading", "Within its limits",
                                          "Limits and states"},
                                         "cards", "Sensors") +
                                   rows + kTableEnd);
    }

    void WriteInventory() {
        std::string content;
        for (const Fru& f : machine_.frus) {
            Definitions d;
            d.Add("Entity", f.entity)
                .Add("Manufacturer", f.manufacturer)
                .Add("Product", f.product)
                .Add("Part number", f.partNumber, kOrder)
                .Add("Serial number", f.serialNumber, kOrder)
                .Add("Version", f.version)
                .Add("Asset tag", f.assetTag)
                .Add("Board part number", f.boardPartNumber, kOrder)
                .Add("Board serial number", f.boardSerialNumber, kOrder)
                .Add("Board made", f.boardManufactured)
                .Add("Module",
                     Listed({f.moduleManufacturer, f.moduleType,
                             f.moduleSizeMiB ? std::to_string(*f.moduleSizeMiB) + " MiB" : ""}))
                .Add("Module part number", f.modulePartNumber, kOrder)
                .Add("Module serial number", f.moduleSerialNumber, kOrder)
                .Add("Further records", Listed(f.multiRecords, " | "))
                .Add("Problems", Listed(f.problems, "; "));
            const std::string node = Several() ? NameOf(IndexOf(f.node)) + ": " : "";
            content +=
                Element("details", Element("summary", HtmlText(node + FruName(f))) + d.Html()) +
                "\n";
        }
        Section("inventory", "Inventory",
                content.empty() ? "<p class=\"soft\">The controller told of none.</p>\n" : content);
    }

    void WriteControllers() {
        std::string content;
        for (const Controller& c : machine_.controllers) {
            const std::size_t index = IndexOf(c.node);
            if (Several()) content += Element("h3", HtmlText(NameOf(index)));
            Definitions d;
            d.Add("Firmware", Listed({c.firmware, c.auxiliaryRevision}))
                .Add("IPMI version", c.ipmiVersion)
                .Add("Manufacturer", c.controllerManufacturer.empty() && c.manufacturerId
                                         ? "number " + std::to_string(*c.manufacturerId)
                                         : c.controllerManufacturer)
                .Add("GUID", c.guid, kOrder)
                .Add("Self test", c.selfTest)
                .Add("Clock", ClockText(c))
                .Add("Power", c.powerOn ? (*c.powerOn ? "on" : "off") : "")
                .Add("Last power event", Listed(c.lastPowerEvent))
                .Add("Power faults", Listed(c.powerFaults))
                .Add("Chassis", c.chassisIntrusion == true ? "opened" : "")
                .Add("Can do", Listed(c.capabilities));
            for (const EventLog& log : machine_.eventLogs) {
                if (IndexOf(log.node) == index) d.Add("Event log", EventLogText(log));
            }
            content += d.Html();
        }
        Section("controller", "Controller and firmware",
                content.empty() ? "<p class=\"soft\">Nothing was read of it.</p>\n" : content);
    }

    void WriteNotRead(const ReportEnd& end) {
        std::string rows;
        for (std::size_t i = 0; i < end.completeness.size(); ++i) {
            for (const NQORTQR20::ReadFault& fault : end.completeness[i].faults) {
                rows += Row({{Several() ? HtmlText(NameOf(i)) : ""},
                             {HtmlText(fault.what)},
                             {HtmlText(fault.record)},
                             {HtmlText(fault.problem)}});
            }
        }
        std::string content;
        if (!outcome_.problem.empty()) {
            content =
                Element("p", HtmlText(outcome_.problem) + "; " + HtmlText(outcome_.advice)) + "\n";
        }
        if (!rows.empty()) {
            content += TableHead({"System", "Command", "Record", "Problem"}, "cards", "Not read") +
                       rows + kTableEnd;
        }
        Section("missing", "What could not be read",
                content.empty() ? "<p class=\"soft\">Everything that was announced was read.</p>\n"
                                : content);
    }

    void WriteHow(const ReportEnd& end) {
        Definitions d;
        d.Add("Source", head_.source).AddHtml("Collected", TimeElement(head_.collected));
        if (end.seconds) d.Add("Took", DurationText(*end.seconds));
        for (std::size_t i = 0; i < end.completeness.size(); ++i) {
            const NQORTQR20::NodeCompleteness& node = end.completeness[i];
            const auto account = [](const NQORTQR20::SourceAccount& a) {
                return std::to_string(a.read) +
                       (a.announced ? " of " + std::to_string(*a.announced) : "") + " read";
            };
            d.Add(Several() ? "Event log of " + NameOf(i) : "Event log", account(node.log))
                .Add(Several() ? "Sensor records of " + NameOf(i) : "Sensor records",
                     account(node.sensors));
        }
        d.Add("Plug-in", Listed({head_.plugin.name, head_.plugin.version}, " "))
            .Add("Status", end.status.TranslateStatusCode())
            .Add("Notices", Listed(end.notices, "; "));
        Section("how", "How it was collected", d.Html());
    }

    OutputFile& out_;
    ReportHead head_;
    Systems systems_;
    MachineState machine_;
    std::vector<Log> logs_;
    std::unordered_map<std::string, Integer> records_;  ///< IDs by the keys of their events
    Outcome outcome_{};
    std::string noEvents_;    ///< what stands in the place of events
    std::size_t hidden_ = 0;  ///< events that are not wanted
    bool zoneUnknown_ = false;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeHtmlReport(OutputFile& out, const ReportHead& head,
                                             const ReportLook&) {
    return std::make_unique<HtmlReport>(out, head);
}

}  // namespace ipmisel
