#include "ipmi/units.h"

#include <array>

namespace ipmi {
namespace {

// IPMI 2.0, table 43-15.
constexpr std::array<std::string_view, 93> kUnits{"",
                                                  "degrees C",
                                                  "degrees F",
                                                  "degrees K",
                                                  "Volts",
                                                  "Amps",
                                                  "Watts",
                                                  "Joules",
                                                  "Coulombs",
                                                  "VA",
                                                  "Nits",
                                                  "lumen",
                                                  "lux",
                                                  "Candela",
                                                  "kPa",
                                                  "PSI",
                                                  "Newton",
                                                  "CFM",
                                                  "RPM",
                                                  "Hz",
                                                  "microsecond",
                                                  "millisecond",
                                                  "second",
                                                  "minute",
                                                  "hour",
                                                  "day",
                                                  "week",
                                                  "mil",
                                                  "inches",
                                                  "feet",
                                                  "cu in",
                                                  "cu feet",
                                                  "mm",
                                                  "cm",
                                                  "m",
                                                  "cu cm",
                                                  "cu m",
                                                  "liters",
                                                  "fluid ounce",
                                                  "radians",
                                                  "steradians",
                                                  "revolutions",
                                                  "cycles",
                                                  "gravities",
                                                  "ounce",
                                                  "pound",
                                                  "ft-lb",
                                                  "oz-in",
                                                  "gauss",
                                                  "gilberts",
                                                  "henry",
                                                  "millihenry",
                                                  "farad",
                                                  "microfarad",
                                                  "ohms",
                                                  "siemens",
                                                  "mole",
                                                  "becquerel",
                                                  "PPM",
                                                  "",
                                                  "Decibels",
                                                  "DbA",
                                                  "DbC",
                                                  "gray",
                                                  "sievert",
                                                  "color temp deg K",
                                                  "bit",
                                                  "kilobit",
                                                  "megabit",
                                                  "gigabit",
                                                  "byte",
                                                  "kilobyte",
                                                  "megabyte",
                                                  "gigabyte",
                                                  "word",
                                                  "dword",
                                                  "qword",
                                                  "line",
                                                  "hit",
                                                  "miss",
                                                  "retry",
                                                  "reset",
                                                  "overrun/overflow",
                                                  "underrun",
                                                  "collision",
                                                  "packets",
                                                  "messages",
                                                  "characters",
                                                  "error",
                                                  "correctable error",
                                                  "uncorrectable error",
                                                  "fatal error",
                                                  "grams"};
static_assert(kUnits[4] == "Volts" && kUnits[18] == "RPM" && kUnits[45] == "pound" &&
              kUnits[60] == "Decibels" && kUnits[75] == "dword" && kUnits[88] == "error" &&
              kUnits[92] == "grams");

// Sensor units 1, bits 5..3; 7 is reserved.
constexpr std::array<std::string_view, 8> kRates{"",       "microsecond", "millisecond", "second",
                                                 "minute", "hour",        "day",         ""};

}  // namespace

std::string_view UnitName(std::uint8_t code) { return code < kUnits.size() ? kUnits[code] : ""; }

std::string UnitText(const SensorUnits& units) {
    std::string text(UnitName(units.base));
    const std::string_view modifier = UnitName(units.modifier);
    const unsigned modifierUse = units.flags >> 1 & 0x03;
    if (!text.empty() && !modifier.empty() && modifierUse == 1) {
        text += "/" + std::string(modifier);
    } else if (!text.empty() && !modifier.empty() && modifierUse == 2) {
        text += "*" + std::string(modifier);
    }
    if (units.IsPercentage()) text = text.empty() ? "percent" : "percent " + text;
    const std::string_view rate = kRates[units.flags >> 3 & 0x07];
    if (!rate.empty()) text += (text.empty() ? "per " : " per ") + std::string(rate);
    return text;
}

}  // namespace ipmi
