#include "plugins/ipmisel/texts/sensor_units.h"

#include <cmath>
#include <cstdint>

#include "base/text.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/texts/numbered_texts.h"

namespace ipmisel {
namespace {

constexpr int kRateTexts = 720;  // + rate unit 1 to 7
constexpr int kUnitTexts = 730;  // + unit code
constexpr unsigned kLastUnitCode = 92;
constexpr std::size_t kUnitCapacity = 64;

constexpr std::uint8_t kFullSensorRecord = 1;
constexpr std::uint8_t kLinear = 0;

int SignExtend(std::uint16_t raw, unsigned bits) {
    const int value = raw;
    return value >> (bits - 1) != 0 ? value - (1 << bits) : value;
}

double TimesPowerOfTen(double value, int exponent) {
    return exponent > 0 ? value * std::pow(10.0, exponent) : value / std::pow(10.0, -exponent);
}

/// IPMI 2.0, 36.3: value = (M * reading + B * 10^Bexp) * 10^Rexp.
double ConvertReading(const s_SDR_Mod_Units& units, int reading) {
    const int m = SignExtend(units.M, 10);
    const int b = SignExtend(units.B, 10);
    const int rExponent = SignExtend(units.Rexp, 4);
    const int bExponent = SignExtend(units.Bexp, 4);
    const std::int64_t product = std::int64_t{m} * reading;
    const double bTerm = TimesPowerOfTen(b, bExponent);
    const double rFactor = TimesPowerOfTen(1.0, rExponent);
    const double value = (static_cast<double>(product) + bTerm) * rFactor;

    if (LogEnabled(kTrace)) {
        const struct {
            const char* name;
            int value;
        } factors[] = {{". M = ", units.M},       {". FinalM = ", m},
                       {". B = ", units.B},       {". FinalB = ", b},
                       {". Rexp = ", units.Rexp}, {". FinalRexp = ", rExponent},
                       {". Bexp = ", units.Bexp}, {". FinalBexp = ", bExponent}};
        for (const auto& factor : factors) {
            WriteLog(kTrace, factor.name + std::to_string(factor.value));
        }
        WriteLog(kTrace, "Value = " + std::to_string(product));
        WriteLog(kTrace, ". Value1 = " + std::to_string(bTerm));
        WriteLog(kTrace, ". Value2 = " + std::to_string(rFactor));
        WriteLog(kTrace, ". FinalValue = " + std::to_string(value));
    }
    return value;
}

double ReadingValue(const s_SDR_Mod_Units& units, int reading) {
    if (units.SDRType != kFullSensorRecord) return reading;
    WriteLog(kTrace, "SDRType is 1");
    if (units.Linearization != kLinear) return reading;
    WriteLog(kTrace, "Linear sensor.");
    return ConvertReading(units, reading);
}

/// By the analog data format. Compatibility: signed readings are shown as they come, without the
/// conversion (SensorUnits.ConvertsAndFormats).
std::string ValueText(const s_SDR_Mod_Units& units, double value, int reading) {
    switch (units.SensorUnits1 >> 6) {
        case 1:
            return OnesComplementText(static_cast<char>(reading));
        case 2:
            return std::to_string(static_cast<std::int8_t>(reading));
        default:
            return Format("%.2f", static_cast<double>(static_cast<float>(value)));
    }
}

std::string UnitText(NQORTQR20::TCPluginCallbacks* context, unsigned code) {
    if (code > kLastUnitCode) return {};
    return FetchText(context, kUnitTexts + static_cast<int>(code), kUnitCapacity);
}

std::string UnitWords(NQORTQR20::TCPluginCallbacks* context, const s_SDR_Mod_Units& units) {
    const auto pair = [&](const char* separator) {
        const std::string base = UnitText(context, units.SensorUnits2);
        return " " + base + separator + UnitText(context, units.SensorUnits3);
    };
    switch (units.SensorUnits1 >> 1 & 0x03) {
        case 0:
            return " " + UnitText(context, units.SensorUnits2);
        case 1:
            return pair("/");
        case 2:
            return pair("*");
        default:
            return " reserved units";
    }
}

}  // namespace

std::string OnesComplementText(char value) {
    const auto byte = static_cast<std::uint8_t>(value);
    const bool negative = (byte & 0x80) != 0;
    std::string text =
        negative ? "-" + std::to_string(static_cast<std::uint8_t>(~byte)) : std::to_string(byte);
    WriteLog(kTrace, "IPMIMapping::GetOnesComplement() function completed.");
    return text;
}

std::string SensorUnitsText(NQORTQR20::TCPluginCallbacks* context, const s_SDR_Mod_Units& units,
                            int reading) {
    TraceScope trace("IPMIMapping::GetSensorUnits()", TraceScope::kFunction);
    std::string text = ValueText(units, ReadingValue(units, reading), reading);
    if ((units.SensorUnits1 & 0x01) != 0) text += "%";
    // Compatibility: the rate stands before the unit that it belongs to, not behind it
    // (SensorUnits.ConvertsAndFormats).
    if (const int rate = units.SensorUnits1 >> 3 & 0x07; rate != 0) {
        text += " " + FetchText(context, kRateTexts + rate, kUnitCapacity);
    }
    return text + UnitWords(context, units);
}

}  // namespace ipmisel
