#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "program/reports/report.h"
#include "program/reports/severity.h"
#include "program/reports/spool.h"

namespace ipmisel {

/// A text in the colour of its severity, for a terminal; as it stands when no colour is wanted.
std::string Painted(std::string text, std::optional<Severity> severity, const ReportLook& look);
std::string Bold(const std::string& text, const ReportLook& look);

/// Rows of cells in columns that are as wide as what stands in them, where the width of the report
/// allows; else those columns give way that cost the fewest further lines. A column that is empty
/// in every row is left out. The rows wait in a spool.
class TextTable {
public:
    struct Row {
        std::string group{};  ///< a line before the first row of its group
        std::optional<Severity> severity{};
        std::vector<std::string> cells;  ///< as TerminalText has them
    };
    struct Column {
        std::string title;
        bool yields = true;  ///< may be narrower than its cells
    };
    /// `painted` is the column that has the colour of a row's severity.
    TextTable(std::vector<Column> columns, std::size_t painted);
    void Add(const Row& row);
    bool Empty() const { return rows_ == 0; }
    std::size_t Rows() const { return rows_; }
    void Print(OutputFile& out, const ReportLook& look);

private:
    std::vector<std::size_t> Widths(std::size_t width) const;
    void PrintRow(OutputFile& out, const ReportLook& look, const std::vector<std::size_t>& widths,
                  const Row& row) const;

    std::size_t Longest(std::size_t column) const;
    /// A column does not give way beyond it while others can: its title would be cut.
    std::size_t MinWidth(std::size_t column) const;
    std::size_t ExtraLines(std::size_t column, std::size_t width) const;
    /// What a width costs: lines, and a word that is broken is as bad as one.
    std::size_t Cost(std::size_t column, std::size_t width) const;
    /// Moves columns from one to another where that costs less.
    void Balance(std::vector<std::size_t>* widths) const;

    std::vector<Column> columns_;
    std::size_t painted_;
    std::vector<std::vector<std::size_t>> lengths_;  ///< by column: how many cells are so long
    std::vector<std::vector<std::size_t>> words_;    ///< how many have a longest word so long
    Spool spool_;
    std::size_t rows_ = 0;
};

}  // namespace ipmisel
