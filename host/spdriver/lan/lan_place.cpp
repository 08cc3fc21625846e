#include "host/spdriver/lan/lan_place.h"

#include <charconv>
#include <string_view>

#include "host/spdriver/access.h"

namespace tqrhost {
namespace {

constexpr std::string_view kRmcpPort = "623";  // IPMI 2.0, clause 13.1.2

constexpr std::size_t kShownOfLongPlace = 80;

[[noreturn]] void RefusePlace(const std::string& place, const char* reason) {
    throw SourceUsageError("lan:" + place + ": " + reason +
                           "; write lan:HOST, lan:HOST:PORT or lan:[ADDRESS]:PORT");
}

}  // namespace

LanPlace ParseLanPlace(const std::string& place) {
    if (place.size() > NQORTQR20::kMaxPlace) {
        RefusePlace(place.substr(0, kShownOfLongPlace) + "...", "it is too long for a host");
    }
    std::string host = place;
    std::string port(kRmcpPort);
    const auto bracket = place.rfind(']');
    const auto colon = place.find(':', bracket == std::string::npos ? 0 : bracket);
    if (place.starts_with('[') && bracket == std::string::npos) {
        RefusePlace(place, "the address has no closing bracket");
    }
    if (colon != std::string::npos) {
        host = place.substr(0, colon);
        port = place.substr(colon + 1);
        if (port.find(':') != std::string::npos) {
            RefusePlace(place, "an IPv6 address stands in brackets");
        }
    }
    if (host.empty() || host == "[]") RefusePlace(place, "no host is named");
    if (host.back() != ']' && bracket != std::string::npos) {
        RefusePlace(place, "something stands between address and port");
    }
    unsigned number = 0;
    const auto [end, error] = std::from_chars(port.data(), port.data() + port.size(), number);
    if (error != std::errc() || end != port.data() + port.size() || number < 1 || number > 0xFFFF) {
        RefusePlace(place, "the port is no number from 1 to 65535");
    }
    return {host.front() == '[' ? host.substr(1, host.size() - 2) : host, std::to_string(number)};
}

}  // namespace tqrhost
