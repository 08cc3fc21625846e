#include "plugins/ipmisel/records/sel_texts.h"

#include <array>
#include <string_view>

#include "base/text.h"
#include "ipmi/event_types.h"
#include "plugins/ipmisel/texts/numbered_texts.h"

namespace ipmisel {
namespace {

std::string_view EventClass(std::uint8_t type) {
    switch (ipmi::ClassOfEventType(type)) {
        case ipmi::EventClass::kThreshold:
            return "Threshold.";
        case ipmi::EventClass::kGeneric:
            return "Generic.";
        case ipmi::EventClass::kSensorSpecific:
            return "Sensor-specific.";
        default:
            return "Unknown event type.";  // the OEM types 0x70 to 0x7F too
    }
}

// System software IDs, IPMI 2.0, table 5-4.
struct SoftwareRange {
    std::uint8_t last;
    int text;
};
constexpr std::array<SoftwareRange, 7> kSoftwareRanges{
    {{0x0F, 535}, {0x1F, 536}, {0x2F, 537}, {0x3F, 538}, {0x46, 539}, {0x47, 540}, {0x7F, 541}}};

constexpr int kLunFormat = 543;
constexpr int kChannelFormat = 544;

int SoftwareText(int softwareId) {
    for (const SoftwareRange& range : kSoftwareRanges) {
        if (softwareId <= range.last) return range.text;
    }
    return kSoftwareRanges.back().text;
}

}  // namespace

std::string EventTypeText(std::uint8_t directionAndType) {
    const bool deasserted = (directionAndType & 0x80) != 0;
    return std::string(deasserted ? "Deassertion, " : "Assertion, ")
        .append(EventClass(directionAndType & 0x7F));
}

std::string SourceText(NQORTQR20::TCPluginCallbacks* context, std::uint8_t generator1,
                       std::uint8_t generator2) {
    const auto fetch = [context](int number) {
        return FetchText(context, number, kSelTextCapacity);
    };
    const int id = generator1 >> 1;
    const int lun = generator2 & 0x03;
    const int channel = generator2 >> 4;
    FixedText<kSelTextCapacity> source;
    if ((generator1 & 0x01) != 0) {
        source.Append(fetch(SoftwareText(id)));
    } else {
        source.Append(Format("%d (address). ", id));
        source.Append(FormatIntegers(fetch(kLunFormat), &lun, 1));
    }
    source.Append(FormatIntegers(fetch(kChannelFormat), &channel, 1));
    return source.str();
}

std::string ShutDownText(std::span<const std::uint8_t, 5> bytes) {
    if (bytes[0] != 0) {
        const std::uint32_t reason = bytes[1] | std::uint32_t{bytes[2]} << 8 |
                                     std::uint32_t{bytes[3]} << 16 | std::uint32_t{bytes[4]} << 24;
        return Format("(Shutdown Event): ReasonCode: %d", static_cast<std::int32_t>(reason));
    }
    // Compatibility: the same byte tells a comment from a reason and numbers its part, so that only
    // part 0 carries a comment (ShutDown.OnlyPartZeroCarriesComment).
    std::string text = Format("(Shutdown Event): Comment String Part %d: ", int{bytes[0]});
    for (const std::uint8_t byte : bytes.subspan(1)) {
        if (byte != 0) text += static_cast<char>(byte);
    }
    return text;
}

}  // namespace ipmisel
