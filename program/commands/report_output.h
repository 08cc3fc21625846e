#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "program/reports/output_file.h"
#include "program/reports/report.h"
#include "program/reports/terminal.h"

namespace CLI {
class App;
}

namespace ipmisel {

/// What a report is made of, where it goes and how it looks.
struct ReportOptions {
    std::vector<std::string> classes;  ///< empty: those of the format
    std::string format = "table";
    std::optional<std::string> output;  ///< empty: standard output
    std::string colour = "auto";        ///< or always, never
    bool pager = true;
    std::optional<std::string> since, severity;
    std::optional<std::size_t> last;  ///< so many events
};
/// Adds the options to a command, and the list of formats for the end of its help.
void AddReportOptions(CLI::App* command, ReportOptions* options);
std::string FormatHelp();

/// A report on its way to where the options say. Operations throw Failure.
class ReportOutput {
public:
    explicit ReportOutput(const ReportOptions& options);
    /// The writer of the report; lives no longer than the object.
    std::unique_ptr<ReportWriter> Make(const ReportHead& head);
    /// The report comes to the terminal in pieces, while it is collected.
    bool StreamsToTerminal() const;
    /// The report is whole: the file stands in its place, the pager has been read.
    void Commit();

private:
    ReportOptions options_;
    OutputFile file_;
    Pager pager_;
};

}  // namespace ipmisel
