#pragma once

#include "program/reports/json_text.h"
#include "program/reports/report.h"

namespace ipmisel {

/// `completeness` of a report, an object per node.
Json CompletenessJson(const ReportEnd& end);
/// `{"code": 0, "text": "Success"}`.
Json StatusJson(NQORTQR20::TTQRStatusCode status);
/// `{"name": ..., "version": ..., "interface": ...}`.
Json PluginJson(const tqrhost::PluginInfo& plugin);

}  // namespace ipmisel
