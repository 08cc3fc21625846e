#include "ipmi/pef.h"

#include <algorithm>

#include "base/bytes.h"

namespace ipmi {
namespace {

constexpr std::uint8_t kAny = 0xFF;

bool MatchesOrAny(std::uint8_t wanted, std::uint8_t value) {
    return wanted == kAny || wanted == value;
}

}  // namespace

bool EventDataComparison::Matches(std::uint8_t byte) const {
    const unsigned different = (byte ^ compare2) & andMask;
    const unsigned oneOf = andMask & ~static_cast<unsigned>(compare1);
    return (different & compare1) == 0 && (oneOf == 0 || (different & oneOf) != oneOf);
}

bool EventFilter::Matches(const FilteredEvent& event) const {
    return enabled && MatchesOrAny(generator[0], event.generator[0]) &&
           MatchesOrAny(generator[1], event.generator[1]) &&
           MatchesOrAny(sensorType, event.sensorType) &&
           MatchesOrAny(sensorNumber, event.sensorNumber) &&
           MatchesOrAny(directionAndType, event.directionAndType) &&
           (offsets >> (event.data[0] & 0x0F) & 1) != 0 && data[0].Matches(event.data[0]) &&
           data[1].Matches(event.data[1]) && data[2].Matches(event.data[2]);
}

std::optional<EventFilter> EventFilter::Parse(std::span<const std::uint8_t> bytes) {
    ipmisel::ByteReader in(bytes);
    EventFilter filter;
    filter.number = in.U8() & 0x7F;
    filter.enabled = (in.U8() & 0x80) != 0;
    filter.actions = in.U8();
    filter.alertPolicy = in.U8();
    filter.severity = static_cast<PefSeverity>(in.U8());
    for (std::uint8_t& byte : filter.generator) byte = in.U8();
    filter.sensorType = in.U8();
    filter.sensorNumber = in.U8();
    filter.directionAndType = in.U8();
    filter.offsets = in.U16();
    for (EventDataComparison& comparison : filter.data) {
        comparison = {in.U8(), in.U8(), in.U8()};
    }
    if (!in.ok()) return std::nullopt;
    return filter;
}

std::optional<PefSeverity> PlatformSeverity(std::span<const EventFilter> filters,
                                            const FilteredEvent& event) {
    const auto first = std::find_if(filters.begin(), filters.end(), [&](const EventFilter& filter) {
        return filter.Matches(event);
    });
    if (first == filters.end()) return std::nullopt;
    switch (first->severity) {
        case PefSeverity::kInformation:
        case PefSeverity::kOk:
        case PefSeverity::kNonCritical:
        case PefSeverity::kCritical:
        case PefSeverity::kNonRecoverable:
            return first->severity;
        case PefSeverity::kUnspecified:
        case PefSeverity::kMonitor:
            break;
    }
    return std::nullopt;
}

}  // namespace ipmi
