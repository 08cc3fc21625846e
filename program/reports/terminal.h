#pragma once

#include <string_view>

#include "program/reports/report.h"

namespace ipmisel {

/// How a table looks where standard output goes: as wide as the terminal (COLUMNS where that is
/// set; 100 without a terminal), in colours when it is one. `colour` is auto, always or never;
/// NO_COLOR (no-color.org) and a dumb terminal turn auto into never.
ReportLook LookOfOutput(std::string_view colour, bool toFile);

/// A pager between standard output and the terminal, as IPMISEL_PAGER or PAGER say, else `less`,
/// which shows at once what fits on a screen. Without a terminal nothing happens.
class Pager {
public:
    Pager() = default;
    ~Pager() { Wait(); }
    Pager(const Pager&) = delete;
    Pager& operator=(const Pager&) = delete;
    /// From here on what is written to standard output goes through the pager.
    bool Start();
    /// Ends the pager's input and waits until it has been read. Nothing may be written any more.
    void Wait();

private:
    int process_ = -1;
};

}  // namespace ipmisel
