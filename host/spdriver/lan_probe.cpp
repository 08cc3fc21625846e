#include "host/spdriver/lan_probe.h"

#include <netdb.h>
#include <poll.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <functional>
#include <span>

#include "host/spdriver/lan/lan_place.h"
#include "host/spdriver/lan/name_lookup.h"
#include "host/spdriver/lan/opening_error.h"
#include "host/spdriver/lan/rmcpplus_codec.h"
#include "host/spdriver/lan/udp_socket.h"
#include "host/spdriver/stop.h"

namespace tqrhost {
namespace {

using rmcpplus::Packet;
using ProbeClock = std::chrono::steady_clock;

constexpr std::uint8_t kPingTag = 0x51;
constexpr std::uint8_t kPong = 0x40;

/// Presence Ping (ASF 2.0, 3.2.4.2): RMCP header of class ASF, enterprise number 4542, type 80h,
/// tag, reserved, no data.
Packet PresencePing() {
    Packet packet;
    packet.U8(0x06).U8(0).U8(0xFF).U8(0x06);
    packet.U8(0).U8(0).U8(0x11).U8(0xBE).U8(0x80).U8(kPingTag).U8(0).U8(0);
    return packet;
}

bool IsPong(ByteView packet) {
    return packet.size() >= 12 && packet[3] == 0x06 && packet[8] == kPong && packet[9] == kPingTag;
}

std::string InNumbers(const Endpoint& endpoint) {
    std::array<char, NI_MAXHOST> name{};
    const auto* const address = reinterpret_cast<const sockaddr*>(&endpoint.address);
    const int error =
        getnameinfo(address, endpoint.length, name.data(), name.size(), nullptr, 0, NI_NUMERICHOST);
    return error == 0 ? name.data() : "";
}

/// One request at a time over a socket.
class ProbeRequests {
public:
    ProbeRequests(std::span<const Endpoint> endpoints, std::chrono::milliseconds patience)
        : socket_(endpoints), patience_(patience) {}

    /// Sends the packet, three times when need be, until `take` says that an answer was the one.
    /// How long it took; empty when it did not come.
    std::optional<std::chrono::microseconds> Exchange(const Packet& packet,
                                                      const std::function<bool(ByteView)>& take) {
        return Exchange(packet, patience_, take);
    }
    /// The same for an answer that many BMCs do not give.
    std::optional<std::chrono::microseconds> ExchangeBriefly(
        const Packet& packet, const std::function<bool(ByteView)>& take) {
        constexpr std::chrono::milliseconds kBrief{1000};
        return Exchange(packet, std::min(patience_, kBrief), take);
    }
    bool refused() const { return refused_; }

private:
    std::optional<std::chrono::microseconds> Exchange(const Packet& packet,
                                                      std::chrono::milliseconds patience,
                                                      const std::function<bool(ByteView)>& take) {
        constexpr int kTries = 3;
        for (int i = 0; i < kTries && !refused_ && Stopped() == StopReason::kNone; ++i) {
            const auto sent = ProbeClock::now();
            socket_.Send({&packet, 1});
            const auto until = sent + patience / kTries;
            for (auto now = sent; now < until && !refused_; now = ProbeClock::now()) {
                pollfd wait{socket_.fd(), POLLIN, 0};
                const auto rest = std::chrono::ceil<std::chrono::milliseconds>(until - now);
                poll(&wait, 1, static_cast<int>(rest.count()));
                for (const ByteView answer : socket_.Receive()) {
                    if (!take(answer)) continue;
                    return std::chrono::duration_cast<std::chrono::microseconds>(ProbeClock::now() -
                                                                                 sent);
                }
                refused_ = socket_.TakeRefusal();
            }
        }
        return std::nullopt;
    }

    UdpSocket socket_;
    std::chrono::milliseconds patience_;
    bool refused_ = false;
};

/// Get Channel Cipher Suites (IPMI 2.0, 22.15): the records of the list follow each other in
/// answers of 16 bytes. A record begins with C0h and the suite's number, or C1h, a vendor's number
/// and its enterprise number; what follows up to the next one are its algorithms.
std::vector<int> ListedSuites(ProbeRequests* requests) {
    constexpr std::size_t kFullAnswer = 16;
    constexpr std::uint8_t kListBySuite = 0x80, kStandard = 0xC0, kVendors = 0xC1;
    constexpr unsigned kMaxAnswers = 64;
    std::vector<std::uint8_t> records;
    for (std::uint8_t index = 0; index < kMaxAnswers; ++index) {
        const ipmi::Command command = ipmi::MakeCommand(
            ipmi::kGetChannelCipherSuites,
            {rmcpplus::kThisChannel, 0, static_cast<std::uint8_t>(kListBySuite | index)});
        std::optional<std::size_t> count;
        requests->ExchangeBriefly(
            rmcpplus::SessionlessRequest(command, index), [&](ByteView packet) {
                const auto answer =
                    rmcpplus::ParseSessionlessAnswer(packet, index, command.code(), true);
                if (!answer) return false;
                // Completion code and channel come before the records.
                if (answer->size() < 2 || (*answer)[0] != ipmi::kCompleted) return true;
                count = answer->size() - 2;
                records.insert(records.end(), answer->begin() + 2, answer->end());
                return true;
            });
        if (!count || *count < kFullAnswer) break;
    }
    std::vector<int> suites;
    for (std::size_t i = 0; i + 1 < records.size(); ++i) {
        if (records[i] == kStandard) {
            suites.push_back(records[++i]);
        } else if (records[i] == kVendors) {
            i += 4;
        }
    }
    std::sort(suites.begin(), suites.end());
    suites.erase(std::unique(suites.begin(), suites.end()), suites.end());
    return suites;
}

}  // namespace
}  // namespace tqrhost

namespace NQORTQR20 {

LanProbe ProbeLan(const std::string& place, std::chrono::milliseconds patience) {
    using namespace tqrhost;
    constexpr std::uint8_t kUser = 2, kRqSeq = 63;
    const LanPlace at = ParseLanPlace(place);
    const std::string name = "lan:" + place;
    LanProbe probe;
    const auto found = NameLookup(at.host, at.port).Wait(ProbeClock::now() + patience);
    if (!found || found->error) {
        probe.problem = Advice(name, found ? *found->error : OpeningError::kNameServerSilent);
        return probe;
    }
    for (const Endpoint& endpoint : found->endpoints) {
        probe.addresses.push_back(InNumbers(endpoint));
    }
    try {
        ProbeRequests requests(found->endpoints, patience);
        LanProbe::Capabilities capabilities;
        const auto took = requests.Exchange(
            rmcpplus::AuthenticationCapabilitiesRequest(kUser, kRqSeq), [&](ByteView packet) {
                const auto answer = rmcpplus::ParseAuthenticationCapabilities(packet, kRqSeq, true);
                if (answer) capabilities = {answer->ipmi20, answer->hasKey, {}};
                return answer.has_value();
            });
        if (took) {
            capabilities.took = *took;
            probe.capabilities = capabilities;
            probe.cipherSuites = ListedSuites(&requests);
        }
        if (!requests.refused()) probe.pong = requests.ExchangeBriefly(PresencePing(), IsPong);
        probe.refused = requests.refused();
        if (probe.refused) probe.problem = Advice(name, OpeningError::kPortClosed);
        if (!took && !probe.refused) probe.problem = Advice(name, OpeningError::kNoAnswer);
    } catch (OpeningError error) {
        probe.problem = Advice(name, error);
    }
    return probe;
}

}  // namespace NQORTQR20
