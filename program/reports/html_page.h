#pragma once

namespace ipmisel {

/// The style and the script of an html report: program/reports/html/report.css and report.js.
extern const char* const kPageStyle;
extern const char* const kPageScript;

}  // namespace ipmisel
