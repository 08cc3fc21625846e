#include <algorithm>
#include <map>
#include <utility>
#include <variant>

#include "program/commands/failure.h"
#include "program/reports/json_text.h"
#include "program/reports/report.h"
#include "program/reports/spool.h"
#include "program/reports/terminal_text.h"
#include "program/reports/view.h"

// Comma-separated values, RFC 4180: lines end in CR LF; a cell with a comma, a quotation mark or a
// line end stands in quotation marks, those inside it doubled.

namespace ipmisel {
namespace {

/// A text that a spreadsheet would take for a formula is kept from it by an apostrophe.
std::string Defused(std::string text) {
    constexpr std::string_view kRun = "=+-@\t\r";
    if (!text.empty() && kRun.find(text.front()) != std::string_view::npos) text.insert(0, "'");
    return text;
}

/// Well-formed UTF-8 without what steers a terminal; line ends and tabs stay.
std::string CleanText(std::string_view text) {
    std::string out;
    while (!text.empty()) {
        const Character character = FirstCharacter(text);
        const bool layout = text.front() == '\n' || text.front() == '\t' || text.front() == '\r';
        if (character.valid && (layout || !IsControl(character.value))) {
            out += text.substr(0, character.length);
        } else {
            out += "\uFFFD";
        }
        text.remove_prefix(character.length);
    }
    return out;
}

std::string Cell(const std::string& text) { return Defused(CleanText(text)); }
std::string Cell(std::int64_t number) { return std::to_string(number); }
std::string Cell(double number) { return Json(number).dump(); }
std::string Cell(bool truth) { return truth ? "true" : "false"; }
std::string Cell(NQORTQR20::Time time) { return TimeText(time); }
std::string Cell(const std::vector<std::uint8_t>& bytes) {
    std::string text;
    for (const std::uint8_t byte : bytes) text += (text.empty() ? "" : " ") + std::to_string(byte);
    return text;
}
std::string Cell(const std::vector<std::string>& texts) {
    std::string text;
    for (const std::string& each : texts) text += (text.empty() ? "" : "; ") + each;
    return Cell(text);
}
std::string Cell(const NQORTQR20::ObjectPath& path) {
    std::string text = path.className;
    for (const auto& [key, value] : path.keys)
        text.append(" ").append(key).append("=").append(value);
    return Cell(text);
}

std::string Quoted(const std::string& cell) {
    if (cell.find_first_of(",\"\r\n") == std::string::npos) return cell;
    std::string out = "\"";
    for (const char c : cell) out += c == '"' ? "\"\"" : std::string(1, c);
    return out + '"';
}

/// The columns are those that the class declares, and behind them any that an instance has beside;
/// the rows wait until all columns are known.
class CsvReport : public ReportWriter {
public:
    CsvReport(OutputFile& out, const ReportHead& head) : out_(out) {
        if (head.named && head.wanted.size() > 1) {
            throw Failure(kExitUsage,
                          "a csv report has the rows of one class; name one with --class");
        }
        class_ = head.named ? head.wanted.front() : kEventClass;
        for (const NQORTQR20::ClassInfo& info : head.classes) {
            if (info.name != class_) continue;
            for (const NQORTQR20::PropertyInfo& p : info.properties) ColumnOf(p.name, 0);
        }
    }
    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className != class_) return;
        std::vector<std::string> cells;
        std::map<std::string_view, unsigned> seen;
        for (const auto& [name, value] : instance.properties) {
            const std::size_t column = ColumnOf(name, seen[name]++);
            if (cells.size() <= column) cells.resize(column + 1);
            cells[column] = std::visit([](const auto& each) { return Cell(each); }, value);
        }
        std::string row;
        for (std::size_t i = 0; i < cells.size(); ++i) {
            row += (i == 0 ? "" : ",") + Quoted(cells[i]);
        }
        // Further columns may come; a later one is left empty.
        rows_.Append(std::to_string(std::max<std::size_t>(1, cells.size())) + " " + row);
    }
    void Finish(const ReportEnd&) override {
        std::string header;
        for (const auto& [name, occurrence] : columns_) {
            header += (header.empty() ? "" : ",") +
                      Quoted(Cell(name) + (occurrence > 0 ? std::to_string(occurrence + 1) : ""));
        }
        out_.Write(header + "\r\n");
        rows_.Rewind();
        for (std::string row; rows_.Next(&row);) {
            const std::size_t cells = std::stoul(row);
            row.erase(0, row.find(' ') + 1);
            out_.Write(row + std::string(columns_.size() - cells, ',') + "\r\n");
        }
    }

private:
    /// A property that stands in an instance twice has two columns.
    std::size_t ColumnOf(const std::string& name, unsigned occurrence) {
        const std::pair<std::string, unsigned> column(name, occurrence);
        const auto found = std::find(columns_.begin(), columns_.end(), column);
        if (found == columns_.end()) {
            columns_.push_back(column);
            return columns_.size() - 1;
        }
        return static_cast<std::size_t>(found - columns_.begin());
    }

    OutputFile& out_;
    std::string class_;
    std::vector<std::pair<std::string, unsigned>> columns_;
    Spool rows_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeCsvReport(OutputFile& out, const ReportHead& head,
                                            const ReportLook&) {
    return std::make_unique<CsvReport>(out, head);
}

}  // namespace ipmisel
