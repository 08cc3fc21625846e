#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string_view>

#include "host/core/sink.h"
#include "program/reports/report.h"
#include "program/reports/severity.h"

namespace ipmisel {

/// Which events a reader wants to see.
struct EventWish {
    std::optional<NQORTQR20::Time> since{};
    std::optional<Severity> severity{};  ///< this one or worse
    std::optional<std::size_t> last{};   ///< so many of each node, the newest
    bool Everything() const { return !since && !severity && !last; }
};

/// A moment as a user names it: RFC 3339, a date or a date and time in UTC ("2026-03-09",
/// "2026-03-09 18:00"), or how long ago ("90m", "12h", "7d"). Empty when it is none of them.
std::optional<NQORTQR20::Time> ParseMoment(std::string_view text, NQORTQR20::Time now);

/// Hands on all but the events that are not wished for. An event without a time is as old as the
/// one before it.
std::unique_ptr<ReportWriter> FilterEvents(std::unique_ptr<ReportWriter> report,
                                           const EventWish& wish);

}  // namespace ipmisel
