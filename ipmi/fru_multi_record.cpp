#include "ipmi/fru_multi_record.h"

#include <array>
#include <optional>
#include <utility>

#include "base/hex.h"
#include "base/text.h"
#include "ipmi/id_string.h"

namespace ipmi {
namespace {

using Bytes = std::span<const std::uint8_t>;
using ipmisel::Format;

enum RecordType : std::uint8_t {
    kPowerSupply = 0x00,
    kDcOutput = 0x01,
    kDcLoad = 0x02,
    kManagementAccess = 0x03,
    kBaseCompatibility = 0x04,
    kExtendedCompatibility = 0x05,
    kAsfFixedDevice = 0x06,
    kAsfLegacyAlerts = 0x07,
    kAsfRemoteControl = 0x08,
    kExtendedDcOutput = 0x09,
    kExtendedDcLoad = 0x0A,
    kFirstOem = 0xC0,
};

constexpr std::size_t kPowerSupplyLength = 24;
constexpr std::size_t kDcLength = 13;

std::string RecordName(std::uint8_t type) {
    constexpr std::array<const char*, 11> kNames{"Power supply",
                                                 "DC output",
                                                 "DC load",
                                                 "Management access",
                                                 "Base compatibility",
                                                 "Extended compatibility",
                                                 "ASF fixed SMBus device",
                                                 "ASF legacy device alerts",
                                                 "ASF remote control",
                                                 "Extended DC output",
                                                 "Extended DC load"};
    if (type < kNames.size()) return kNames[type];
    return Format(type >= kFirstOem ? "OEM record %02xh" : "Record %02xh", type);
}

/// The values of a record, read from fixed places of its data.
class Values {
public:
    explicit Values(Bytes data) : data_(data) {}

    /// The number at `at`, of one or two bytes; empty when the data end before its end.
    std::optional<unsigned> Number(std::size_t at, std::size_t length) const {
        if (at + length > data_.size()) return std::nullopt;
        return length == 1 ? data_[at] : data_[at] | unsigned{data_[at + 1]} << 8;
    }

    void Add(const char* name, std::string value, const char* unit = "") {
        values_.push_back({name, std::move(value), unit});
    }
    /// Adds a number times `scale`, unless it is `none`.
    void AddNumber(const char* name, std::size_t at, std::size_t length, const char* unit,
                   std::optional<unsigned> none = {}, unsigned scale = 1) {
        const auto number = Number(at, length);
        if (number && number != none) Add(name, std::to_string(*number * scale), unit);
    }
    /// Adds a signed number of 10 mV in volts, unless it is `none`.
    void AddVoltage(const char* name, std::size_t at, std::optional<unsigned> none = {}) {
        const auto number = Number(at, 2);
        if (!number || number == none) return;
        Add(name, Format("%.2f", static_cast<std::int16_t>(*number) / 100.0), "V");
    }
    void AddHex(const char* name, std::size_t at) {
        if (at >= data_.size()) return;
        Add(name, "0x" + ipmisel::HexText(data_.subspan(at)));
    }
    /// Adds the IANA number of a manufacturer in three bytes; false when the data end before it.
    bool AddManufacturer() {
        constexpr unsigned kNumber = 0xFFFFF;  // the four bits above are reserved
        if (data_.size() < 3) return false;
        Add("manufacturer ID",
            std::to_string((data_[0] | data_[1] << 8 | unsigned{data_[2]} << 16) & kNumber));
        return true;
    }

    Bytes data() const { return data_; }
    std::vector<FruValue> Take() { return std::move(values_); }

private:
    Bytes data_;
    std::vector<FruValue> values_;
};

// ---- Power supply (18.1) ------------------------------------------------------------------------

const char* YesNo(unsigned flags, unsigned bit) { return (flags & bit) != 0 ? "yes" : "no"; }

void AddPowerSupplyFlags(Values* values) {
    enum : unsigned { kPredictiveFail = 1, kCorrection = 2, kSwitch = 4, kHotSwap = 8, kMode = 16 };
    const auto flags = values->Number(17, 1);
    if (!flags) return;
    values->Add("predictive failure signal", YesNo(*flags, kPredictiveFail));
    // A threshold of 0 is a pin that tells of failure, any other one belongs to a tachometer.
    const auto threshold = values->Number(23, 1);
    if ((*flags & kPredictiveFail) != 0 && threshold) {
        const bool set = (*flags & kMode) != 0;
        if (*threshold == 0) {
            values->Add("failure signalled by", set ? "assertion" : "deassertion");
        } else {
            values->Add("tachometer pulses per rotation", set ? "2" : "1");
            values->AddNumber("predictive failure threshold", 23, 1, "rotations per second");
        }
    }
    values->Add("power factor correction", YesNo(*flags, kCorrection));
    values->Add("automatic input voltage switch", YesNo(*flags, kSwitch));
    values->Add("hot swap", YesNo(*flags, kHotSwap));
}

void AddPowerSupply(Values* values) {
    constexpr unsigned kTwelveBits = 0x0FFF;
    constexpr std::array<const char*, 4> kVoltages{"12 V", "-12 V", "5 V", "3.3 V"};
    const auto capacity = values->Number(0, 2);
    if (capacity) values->Add("overall capacity", std::to_string(*capacity & kTwelveBits), "W");
    values->AddNumber("peak apparent power", 2, 2, "VA", 0xFFFF);
    values->AddNumber("inrush current", 4, 1, "A", 0xFF);
    values->AddNumber("inrush interval", 5, 1, "ms", 0);
    values->AddVoltage("input voltage range 1 low end", 6);
    values->AddVoltage("input voltage range 1 high end", 8);
    values->AddVoltage("input voltage range 2 low end", 10, 0);
    values->AddVoltage("input voltage range 2 high end", 12, 0);
    values->AddNumber("input frequency low end", 14, 1, "Hz", 0);
    values->AddNumber("input frequency high end", 15, 1, "Hz", 0);
    values->AddNumber("input dropout tolerance", 16, 1, "ms");
    AddPowerSupplyFlags(values);
    const auto peak = values->Number(18, 2);
    if (peak && (*peak & kTwelveBits) != kTwelveBits) {
        values->Add("peak capacity", std::to_string(*peak & kTwelveBits), "W");
        values->Add("peak capacity held for", std::to_string(*peak >> 12), "s");
    }
    const auto voltages = values->Number(20, 1);
    const auto combined = values->Number(21, 2);
    if (voltages && combined && *combined != 0 && *voltages >> 4 < kVoltages.size() &&
        (*voltages & 0x0F) < kVoltages.size()) {
        values->Add("combined voltages",
                    std::string(kVoltages[*voltages >> 4]) + " and " + kVoltages[*voltages & 0x0F]);
        values->Add("combined capacity", std::to_string(*combined), "W");
    }
}

// ---- DC output and load (18.2, 18.3, 18.8, 18.9) ------------------------------------------------

/// The extended records count their currents in 10 mA, or in 100 mA with bit 4 of the first byte.
void AddDc(Values* values, std::uint8_t type) {
    const bool output = type == kDcOutput || type == kExtendedDcOutput;
    const bool extended = type == kExtendedDcOutput || type == kExtendedDcLoad;
    const auto information = values->Number(0, 1);
    if (!information) return;
    values->Add(output ? "output" : "output needed", std::to_string(*information & 0x0F));
    if (output) values->Add("on in standby", YesNo(*information, 0x80));
    values->AddVoltage("nominal voltage", 1);
    values->AddVoltage(output ? "maximum negative deviation" : "minimum voltage", 3);
    values->AddVoltage(output ? "maximum positive deviation" : "maximum voltage", 5);
    values->AddNumber("ripple and noise", 7, 2, "mV");
    const unsigned scale = !extended ? 1 : (*information & 0x10) != 0 ? 100 : 10;
    values->AddNumber(output ? "minimum current draw" : "minimum current load", 9, 2, "mA", {},
                      scale);
    values->AddNumber(output ? "maximum current draw" : "maximum current load", 11, 2, "mA", {},
                      scale);
}

// ---- Others -------------------------------------------------------------------------------------

/// 18.4: the kind, then a text, or the sixteen bytes of an ID.
void AddManagementAccess(Values* values) {
    constexpr std::array<const char*, 8> kKinds{nullptr,
                                                "system management URL",
                                                "system name",
                                                "system ping address",
                                                "component management URL",
                                                "component name",
                                                "component ping address",
                                                "system unique ID"};
    constexpr unsigned kUniqueId = 7;
    const auto kind = values->Number(0, 1);
    if (!kind) return;
    if (*kind == 0 || *kind >= kKinds.size()) {
        values->Add("kind", std::to_string(*kind));
        values->AddHex("data", 1);
    } else if (*kind == kUniqueId) {
        values->AddHex(kKinds[kUniqueId], 1);
    } else {
        values->Add(kKinds[*kind], DecodeLatin1(values->data().subspan(1)));
    }
}

/// 18.5, 18.6
void AddCompatibility(Values* values) {
    if (!values->AddManufacturer()) return;
    values->AddNumber("entity ID", 3, 1, "");
    values->AddNumber("compatibility base", 4, 1, "");
    values->AddNumber("first compatible code", 5, 1, "");
    values->AddHex("mask of compatible codes", 6);
}

}  // namespace

std::size_t FixedMultiRecordLength(std::uint8_t type) {
    switch (type) {
        case kPowerSupply:
            return kPowerSupplyLength;
        case kDcOutput:
        case kDcLoad:
        case kExtendedDcOutput:
        case kExtendedDcLoad:
            return kDcLength;
        default:
            return 0;
    }
}

FruMultiRecord ReadMultiRecord(std::uint8_t type, Bytes data) {
    Values values(data);
    switch (type) {
        case kPowerSupply:
            AddPowerSupply(&values);
            break;
        case kDcOutput:
        case kDcLoad:
        case kExtendedDcOutput:
        case kExtendedDcLoad:
            AddDc(&values, type);
            break;
        case kManagementAccess:
            AddManagementAccess(&values);
            break;
        case kBaseCompatibility:
        case kExtendedCompatibility:
            AddCompatibility(&values);
            break;
        default:
            values.AddHex("data", type >= kFirstOem && values.AddManufacturer() ? 3 : 0);
    }
    return {type, RecordName(type), values.Take()};
}

std::string MultiRecordText(const FruMultiRecord& record) {
    std::string text = record.name;
    for (const FruValue& value : record.values) {
        text += "; " + value.name + " " + value.value;
        if (!value.unit.empty()) text += " " + value.unit;
    }
    return text;
}

}  // namespace ipmi
