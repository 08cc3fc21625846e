#pragma once

#include <array>
#include <utility>

#include "program/reports/json_text.h"
#include "program/reports/report.h"

namespace ipmisel {

/// What a node's object has beside log and sensors, where it was asked for.
inline constexpr std::array<
    std::pair<const char*, NQORTQR20::SourceAccount NQORTQR20::NodeCompleteness::*>, 3>
    kAskedAccounts{{{"controller", &NQORTQR20::NodeCompleteness::controller},
                    {"readings", &NQORTQR20::NodeCompleteness::readings},
                    {"inventory", &NQORTQR20::NodeCompleteness::inventory}}};

/// `completeness` of a report, an object per node.
Json CompletenessJson(const ReportEnd& end);
/// `{"code": 0, "text": "Success"}`.
Json StatusJson(NQORTQR20::TTQRStatusCode status);
/// `{"name": ..., "version": ..., "interface": ...}`.
Json PluginJson(const NQORTQR20::PluginInfo& plugin);

}  // namespace ipmisel
