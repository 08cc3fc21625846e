#include "plugins/ipmisel/texts/oem_records.h"

#include <string_view>

#include "base/bytes.h"
#include "base/text.h"

namespace ipmisel {
namespace {

constexpr std::size_t kShortestRun = 4;

std::string HexBytes(std::span<const std::uint8_t> bytes) {
    std::string text = DumpBytes(bytes, Digits::kUpperHex);
    if (!text.empty()) text.pop_back();
    return text;
}

/// ` "run"` for every run of printable ASCII that is long enough to be meant as text.
std::string PrintableRuns(std::span<const std::uint8_t> bytes) {
    std::string text;
    std::string run;
    const auto endRun = [&] {
        if (run.size() >= kShortestRun) text += " \"" + run + "\"";
        run.clear();
    };
    for (const std::uint8_t byte : bytes) {
        if (byte >= 0x20 && byte <= 0x7E) {
            run += static_cast<char>(byte);
        } else {
            endRun();
        }
    }
    endRun();
    return text;
}

}  // namespace

std::string OemTimestampedText(std::span<const std::uint8_t> bytes) {
    ByteReader in(bytes);
    const std::uint32_t manufacturer = in.U24();
    if (!in.ok()) return OemPlainText(bytes);
    return Format("Manufacturer ID: %u (0x%06X). OEM data: ", manufacturer, manufacturer) +
           HexBytes(bytes.subspan(3));
}

std::string OemPlainText(std::span<const std::uint8_t> bytes) {
    const std::string runs = PrintableRuns(bytes);
    return "OEM data: " + HexBytes(bytes) + (runs.empty() ? "" : ". Text:" + runs);
}

}  // namespace ipmisel
