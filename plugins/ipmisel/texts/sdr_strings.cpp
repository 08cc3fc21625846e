#include "plugins/ipmisel/texts/sdr_strings.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>

#include "base/text.h"

namespace {

constexpr std::size_t kWorkLength = 127;  // of the ID string, and of each expanded word
constexpr std::string_view kIndent = "               ";

struct Abbreviation {
    std::string_view word;
    std::string_view expansion;
};
constexpr std::array<Abbreviation, 51> SDR_Strings{{
    {"Amb", "Ambient"},
    {"Ambient", "Ambient"},
    {"Audit", "Audit"},
    {"BINIT", "BINIT"},
    {"BP", "Backplane"},
    {"Cable", "Cable"},
    {"Check", "Check"},
    {"CPU", "Processor"},
    {"DASD", "Hard Drive"},
    {"DDR", "DDR"},
    {"Detect", "Detect"},
    {"DIMM", "Memory DIMM"},
    {"Disabled", "Disabled"},
    {"Drive", "Drive"},
    {"Fan", "Fan"},
    {"Fault", "Fault"},
    {"Flt", "Fault"},
    {"FP", "Front Panel"},
    {"IERR", "IERR"},
    {"LED", "LED"},
    {"Log", "Log"},
    {"Machine", "Machine"},
    {"MCH", "MCH"},
    {"NMI", "Non-Maskable Interrupt"},
    {"NonRed", "Non Redundant"},
    {"PCI", "PCI"},
    {"PCX", "PCIX"},
    {"Planar", "Planar"},
    {"Plnr", "Planar"},
    {"Power", "Power"},
    {"Present", "Present"},
    {"PS", "Power Supply"},
    {"Pwr", "Power"},
    {"RAID", "RAID"},
    {"Riser", "Riser"},
    {"TSBII", "TSB II"},
    {"Scrty", "Security"},
    {"SCSI", "SCSI Component"},
    {"Session", "Session"},
    {"Stat", "Status"},
    {"State", "State"},
    {"Status", "Status"},
    {"Tach", "Tachometer"},
    {"Temp", "Temperature"},
    {"USB", "USB"},
    {"VBAT", "Battery Voltage"},
    {"VCore", "Core Voltage"},
    {"Violation", "Violation"},
    {"VRM", "Voltage Regulator Module"},
    {"Vtt", "Vtt"},
    {"Watchdog", "Watchdog"},
}};

// Markers within a word that is no abbreviation; the first row that fits counts.
struct Marker {
    std::string_view marker;
    std::string_view before;
    std::string_view after;
};
constexpr std::array<Marker, 3> kMarkers{{
    {"VSB", "", " Volts Standby "},
    {"V", "", " Volts "},
    {"AUX", "Auxiliary ", " Volts "},
}};

std::string ExpandWord(std::string_view word) {
    const auto* const abbreviation =
        std::find_if(SDR_Strings.begin(), SDR_Strings.end(),
                     [word](const Abbreviation& row) { return row.word == word; });
    if (abbreviation != SDR_Strings.end()) return std::string(abbreviation->expansion) + " ";
    for (const Marker& row : kMarkers) {
        const std::size_t at = word.find(row.marker);
        if (at == std::string_view::npos) continue;
        return std::string(row.before) + std::string(word.substr(0, at)) + std::string(row.after);
    }
    return std::string(word) + " ";
}

std::string ExpandSdrString(std::string_view text) {
    std::string expanded(kIndent);
    for (std::size_t at = 0; (at = text.find_first_not_of(' ', at)) != std::string_view::npos;) {
        const std::size_t end = std::min(text.find(' ', at), text.size());
        expanded.append(ExpandWord(text.substr(at, end - at)), 0, kWorkLength);
        at = end;
    }
    return expanded;
}

}  // namespace

int Translate_SDRString(char* in, char* out, unsigned int /*inLen*/, unsigned int outLen) {
    const std::string_view text =
        in == nullptr ? std::string_view() : ipmisel::BoundedView(in, kWorkLength);
    if (out != nullptr && outLen > 0) StringCchCopy(out, outLen, ExpandSdrString(text).c_str());
    return 0;
}
