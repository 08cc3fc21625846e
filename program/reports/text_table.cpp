#include "program/reports/text_table.h"

#include <algorithm>
#include <numeric>
#include <string_view>
#include <utility>

#include "base/text.h"
#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

constexpr std::size_t kGap = 2;
constexpr std::size_t kMinWidth = 8;
/// A longer cell is cut; the formats for programs have it whole.
constexpr std::size_t kMaxCell = 500;
// Neither stands in a text that TerminalText has made.
constexpr char kBetweenCells = '\x1f';
constexpr char kNoSeverity = '-';

// ECMA-48, "select graphic rendition".
constexpr const char* kColours[] = {"", "32", "33", "1;31", "1;97;41"};

std::string Rendered(const std::string& text, const char* code) {
    return Format("\x1b[%sm", code) + text + "\x1b[0m";
}

/// Of what Wrap does not break where there is room for it.
std::size_t LongestWord(std::string_view text) {
    std::size_t longest = 0;
    while (!text.empty()) {
        const std::size_t end = text.find_first_of(" /-");
        const bool marked = end != std::string_view::npos && text[end] != ' ';
        longest = std::max(longest, Columns(text.substr(0, marked ? end + 1 : end)));
        text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    }
    return longest;
}

std::string TrimmedLine(std::string text) {
    text.erase(text.find_last_not_of(' ') + 1);
    return text + '\n';
}

}  // namespace

std::string Painted(std::string text, std::optional<Severity> severity, const ReportLook& look) {
    if (!look.colour || !severity) return text;
    const char* const code = kColours[static_cast<std::size_t>(*severity)];
    return *code == '\0' ? text : Rendered(text, code);
}

std::string Bold(const std::string& text, const ReportLook& look) {
    return look.colour ? Rendered(text, "1") : text;
}

TextTable::TextTable(std::vector<Column> columns, std::size_t painted)
    : columns_(std::move(columns)),
      painted_(painted),
      lengths_(columns_.size(), std::vector<std::size_t>(kMaxCell + 1)),
      words_(lengths_) {}

void TextTable::Add(const Row& row) {
    std::string text(
        1, row.severity ? static_cast<char>('0' + static_cast<int>(*row.severity)) : kNoSeverity);
    text += row.group;
    for (std::size_t i = 0; i < columns_.size(); ++i) {
        std::string cell = i < row.cells.size() ? row.cells[i] : "";
        if (Columns(cell) > kMaxCell) cell = Fit(cell, kMaxCell - 3) + "...";
        ++lengths_[i][Columns(cell)];
        ++words_[i][LongestWord(cell)];
        text += kBetweenCells + cell;
    }
    spool_.Append(text);
    ++rows_;
}

std::size_t TextTable::Longest(std::size_t column) const {
    const auto& lengths = lengths_[column];
    const auto last =
        std::find_if(lengths.rbegin(), lengths.rend(), [](std::size_t count) { return count > 0; });
    return last == lengths.rend() ? 0 : static_cast<std::size_t>(lengths.rend() - last - 1);
}

std::size_t TextTable::ExtraLines(std::size_t column, std::size_t width) const {
    std::size_t lines = 0;
    for (std::size_t length = width + 1; length <= kMaxCell; ++length) {
        lines += lengths_[column][length] * ((length - 1) / width);
    }
    return lines;
}

std::size_t TextTable::Cost(std::size_t column, std::size_t width) const {
    const auto& words = words_[column];
    const auto broken = words.begin() + static_cast<std::ptrdiff_t>(std::min(width, kMaxCell)) + 1;
    return std::accumulate(broken, words.end(), ExtraLines(column, width));
}

std::size_t TextTable::MinWidth(std::size_t column) const {
    return std::max(kMinWidth, Columns(columns_[column].title));
}

std::vector<std::size_t> TextTable::Widths(std::size_t width) const {
    std::vector<std::size_t> widths(columns_.size());
    std::size_t columns = 0;
    for (std::size_t i = 0; i < widths.size(); ++i) {
        if (Longest(i) == 0) continue;
        widths[i] = std::min(std::max(Longest(i), Columns(columns_[i].title)), width);
        ++columns;
    }
    const std::size_t space = columns == 0 ? 0 : (columns - 1) * kGap;
    bool keepsTitles = true;
    while (std::accumulate(widths.begin(), widths.end(), space) > width) {
        std::optional<std::size_t> least;
        std::size_t leastCost = 0;
        for (std::size_t i = 0; i < widths.size(); ++i) {
            if (!columns_[i].yields || widths[i] <= (keepsTitles ? MinWidth(i) : kMinWidth))
                continue;
            const std::size_t cost = Cost(i, widths[i] - 1) - Cost(i, widths[i]);
            if (least && (cost > leastCost || (cost == leastCost && widths[i] <= widths[*least]))) {
                continue;
            }
            least = i;
            leastCost = cost;
        }
        if (!least && !std::exchange(keepsTitles, false)) break;
        if (!least) continue;
        --widths[*least];
    }
    Balance(&widths);
    return widths;
}

void TextTable::Balance(std::vector<std::size_t>* widths) const {
    constexpr std::size_t kMaxMoved = 8;
    const auto move = [&](std::size_t from, std::size_t to) {
        std::size_t& wide = widths->at(from);
        std::size_t& narrow = widths->at(to);
        const std::size_t before = Cost(from, wide) + Cost(to, narrow);
        for (std::size_t moved = 1; moved <= kMaxMoved && wide >= MinWidth(from) + moved; ++moved) {
            if (Cost(from, wide - moved) + Cost(to, narrow + moved) >= before) continue;
            wide -= moved;
            narrow += moved;
            return true;
        }
        return false;
    };
    // Each move costs less than the one before it: this ends.
    for (bool moved = true; moved;) {
        moved = false;
        for (std::size_t from = 0; from < widths->size(); ++from) {
            for (std::size_t to = 0; to < widths->size(); ++to) {
                const bool may = from != to && columns_[from].yields && columns_[to].yields &&
                                 widths->at(from) > 0 && widths->at(to) > 0;
                moved = (may && move(from, to)) || moved;
            }
        }
    }
}

void TextTable::PrintRow(OutputFile& out, const ReportLook& look,
                         const std::vector<std::size_t>& widths, const Row& row) const {
    std::vector<std::vector<std::string>> cells(widths.size());
    std::size_t lines = 1;
    for (std::size_t i = 0; i < widths.size(); ++i) {
        if (widths[i] == 0) continue;
        cells[i] = Wrap(row.cells[i], widths[i]);
        lines = std::max(lines, cells[i].size());
    }
    for (std::size_t line = 0; line < lines; ++line) {
        std::string text;
        for (std::size_t i = 0; i < widths.size(); ++i) {
            if (widths[i] == 0) continue;
            if (!text.empty()) text += std::string(kGap, ' ');
            const std::string cell = line < cells[i].size() ? cells[i][line] : "";
            const std::string fill(widths[i] - Columns(cell), ' ');
            const bool painted = i == painted_ && !cell.empty();
            text += (painted ? Painted(cell, row.severity, look) : cell) + fill;
        }
        out.Write(TrimmedLine(text));
    }
}

void TextTable::Print(OutputFile& out, const ReportLook& look) {
    const std::vector<std::size_t> widths = Widths(look.width);
    std::string heading;
    for (std::size_t i = 0; i < widths.size(); ++i) {
        if (widths[i] == 0) continue;
        heading +=
            (heading.empty() ? "" : std::string(kGap, ' ')) + Fit(columns_[i].title, widths[i]);
    }
    heading.erase(heading.find_last_not_of(' ') + 1);
    out.Write(Bold(heading, look) + "\n");
    spool_.Rewind();
    std::string group;
    for (std::string text; spool_.Next(&text);) {
        Row row;
        if (text[0] != kNoSeverity) row.severity = static_cast<Severity>(text[0] - '0');
        std::size_t at = text.find(kBetweenCells);
        row.group = text.substr(1, at - 1);
        while (at != std::string::npos) {
            const std::size_t next = text.find(kBetweenCells, at + 1);
            row.cells.push_back(
                text.substr(at + 1, next == std::string::npos ? next : next - at - 1));
            at = next;
        }
        if (row.group != group && !row.group.empty()) out.Write(Bold(row.group, look) + "\n");
        group = row.group;
        PrintRow(out, look, widths, row);
    }
}

}  // namespace ipmisel
