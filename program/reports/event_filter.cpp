#include "program/reports/event_filter.h"

#include <charconv>
#include <deque>
#include <map>
#include <string>
#include <utility>

#include "program/reports/view.h"

namespace ipmisel {
namespace {

class EventFilter : public ReportWriter {
public:
    EventFilter(std::unique_ptr<ReportWriter> report, const EventWish& wish)
        : report_(std::move(report)), wish_(wish) {}

    void Add(const NQORTQR20::Instance& instance) override {
        if (instance.className != kEventClass) {
            report_->Add(instance);
            return;
        }
        const Event event = EventOf(instance);
        if (!IsWished(event)) {
            ++hidden_;
            return;
        }
        if (!wish_.last) {
            report_->Add(instance);
            return;
        }
        auto& newest = newest_[event.node];
        newest.push_back(instance);
        if (newest.size() > *wish_.last) {
            newest.pop_front();
            ++hidden_;
        }
    }
    void Finish(const ReportEnd& end) override {
        for (const auto& [node, newest] : newest_) {
            for (const NQORTQR20::Instance& instance : newest) report_->Add(instance);
        }
        ReportEnd told = end;
        told.hiddenEvents = hidden_;
        report_->Finish(told);
    }

private:
    bool IsWished(const Event& event) {
        if (event.time) last_ = event.time;
        if (wish_.since && (!last_ || last_->seconds < wish_.since->seconds)) return false;
        return !wish_.severity || event.severity >= wish_.severity;
    }

    std::unique_ptr<ReportWriter> report_;
    EventWish wish_;
    MaybeTime last_;
    std::map<Integer, std::deque<NQORTQR20::Instance>> newest_;  ///< by node
    std::size_t hidden_ = 0;
};

}  // namespace

std::optional<NQORTQR20::Time> ParseMoment(std::string_view text, NQORTQR20::Time now) {
    for (const char* rest : {"", "Z", ":00Z", " 00:00:00Z"}) {
        if (const MaybeTime time = ParseTime(std::string(text) + rest)) return time;
    }
    constexpr struct {
        char unit;
        std::int64_t seconds;
    } kUnits[] = {{'m', 60}, {'h', 3600}, {'d', 86400}};
    std::int64_t count = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
    if (error != std::errc() || end + 1 != text.data() + text.size()) return std::nullopt;
    if (count < 0 || count > 100000) return std::nullopt;
    for (const auto& [unit, seconds] : kUnits) {
        if (*end == unit) return NQORTQR20::Time{now.seconds - count * seconds};
    }
    return std::nullopt;
}

std::unique_ptr<ReportWriter> FilterEvents(std::unique_ptr<ReportWriter> report,
                                           const EventWish& wish) {
    if (wish.Everything()) return report;
    return std::make_unique<EventFilter>(std::move(report), wish);
}

}  // namespace ipmisel
