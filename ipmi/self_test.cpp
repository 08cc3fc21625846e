#include "ipmi/self_test.h"

#include <string_view>

#include "base/bytes.h"
#include "base/text.h"

namespace ipmi {
namespace {

// Table 20-5, second byte of result 57h, from bit 7 down.
constexpr std::string_view kCorrupted[] = {
    "cannot access SEL device",
    "cannot access SDR repository",
    "cannot access BMC FRU device",
    "IPMB signal lines do not respond",
    "SDR repository empty",
    "internal use area of BMC FRU corrupted",
    "controller update boot block firmware corrupted",
    "controller operational firmware corrupted",
};

}  // namespace

std::optional<std::string> SelfTestText(std::span<const std::uint8_t> data) {
    ipmisel::ByteReader in(data);
    const std::uint8_t result = in.U8();
    const std::uint8_t detail = in.U8();
    if (!in.ok()) return std::nullopt;
    switch (result) {
        case 0x55:
            return "passed";
        case 0x56:
            return "not implemented";
        case 0x57: {
            std::string text;
            for (unsigned i = 0; i < std::size(kCorrupted); ++i) {
                if ((detail >> (7 - i) & 1) == 0) continue;
                if (!text.empty()) text += ", ";
                text += kCorrupted[i];
            }
            return text.empty() ? "corrupted or inaccessible data or devices" : text;
        }
        case 0x58:
            return ipmisel::Format("fatal hardware error, device-specific code %02xh", detail);
        case 0xFF:
            return "reserved result ffh";
        default:
            return ipmisel::Format("device-specific failure, codes %02xh %02xh", result, detail);
    }
}

}  // namespace ipmi
