#include "plugins/ipmisel/texts/oem_detail.h"

#include <optional>

#include "base/text.h"

namespace ipmisel {
namespace {

/// The value that a row is about; nothing when the event does not carry it.
std::optional<unsigned> ValueOf(const OemDetail& row, const EventData& event) {
    const bool has3 = event.Use3() == DataUse::kOem;
    switch (row.data) {
        case OemData::kData2:
            return event.data2;
        case OemData::kData3:
            return has3 ? std::optional<unsigned>(event.data3) : std::nullopt;
        case OemData::kBoth:
            return event.data2 | (has3 ? static_cast<unsigned>(event.data3) << 8 : 0U);
    }
    return std::nullopt;
}

std::string Unknown(unsigned value) { return Format("Unknown OEM value: %02x. ", value); }

std::string Named(std::string_view name) { return std::string(name) + ". "; }

std::string NamesByBit(std::span<const std::string_view> names, unsigned bits) {
    std::string text;
    for (std::size_t bit = 0; bit < names.size(); ++bit) {
        if ((bits >> bit & 1U) != 0) text += Named(names[bit]);
    }
    const unsigned unnamed = bits >> names.size() << names.size();
    return unnamed == 0 ? text : text + Unknown(unnamed);
}

}  // namespace

std::string OemDetailText(std::span<const OemDetail> rows, std::uint8_t sensorType,
                          std::uint8_t sensorNumber, const EventData& event) {
    std::string text;
    if (event.Use2() != DataUse::kOem) return text;
    for (const OemDetail& row : rows) {
        if (row.sensorType != sensorType || sensorNumber < row.firstSensor ||
            sensorNumber > row.lastSensor) {
            continue;
        }
        const std::optional<unsigned> value = ValueOf(row, event);
        if (!value) continue;
        text += row.heading;
        if (row.form == OemForm::kBits) {
            text += NamesByBit(row.names, *value);
        } else {
            text += *value < row.names.size() ? Named(row.names[*value]) : Unknown(*value);
        }
    }
    return text;
}

}  // namespace ipmisel
