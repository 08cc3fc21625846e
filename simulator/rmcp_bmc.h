#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "simulator/simulated_bmc.h"

namespace ipmisim {

using Packet = std::vector<std::uint8_t>;

/// The user name and the password that open a session.
constexpr const char* kUser = "root";
constexpr const char* kPassword = "secret";

/// What a BMC does otherwise than the standard has it.
struct RmcpDeviations {
    bool paddedUserName =
        false;  ///< to 16 bytes; but for RAKP 3, which has not the name's bit either
    bool longRakp2Code = false;  ///< one byte too many
    bool noPrivilege = false;    ///< Open Session grants none
    bool noIpmi20 = false;       ///< denied in the capabilities
    bool badChecksums = false;   ///< of messages inside a session
    enum class Numbers { kRight, kStandStill, kZero, kStartOver } numbers = Numbers::kRight;
};

/// A BMC over RMCP+ (IPMI 2.0, chapter 13) that answers from a simulated BMC: packets in, packets
/// out, no socket. Keys and packets are its own work, not that of the code under test.
class RmcpBmc {
public:
    struct Options {
        int cipherSuite = 17;  ///< the only one that it has: 1, 2, 3, 15, 16 or 17
        std::string kg{};      ///< its own key; empty: it has none
        /// It takes packets whose session sequence number is so much ahead of the newest, and one
        /// more behind it (6.12.13).
        unsigned sequenceWindow = 15;
        RmcpDeviations deviations{};
        std::vector<std::uint8_t> listedSuites{};  ///< told without a session; none: not told
        std::uint8_t maxPrivilege = 4;             ///< that its user may have
        bool hasFreeSession = true;
    };

    RmcpBmc(BmcDescription bmc, Options options);
    ~RmcpBmc();

    /// The answer; empty for none. `busy`: node busy is the answer to what would need the BMC.
    Packet Answer(const Packet& packet, bool busy = false);

    /// Forgets its sessions, as a BMC does that is reset.
    void Expire();
    /// A packet of the session that was answered last with the integrity code that fits it.
    Packet Signed(Packet packet) const;
    /// The last answer over again with other data in it; nothing else gives it away.
    Packet Lie() const;
    std::size_t CodeLength() const;
    static bool IsOfSession(const Packet& packet);

    /// Requests whose session sequence number lay outside the window.
    unsigned OutsideWindow() const { return outsideWindow_; }
    unsigned SessionsOpened() const { return sessionsOpened_; }
    /// Requests inside sessions that it has executed.
    unsigned Requests() const { return requests_; }

private:
    struct Session;
    class Crypto;

    Packet Sessionless(const Packet& packet) const;
    Packet ListedSuites() const;
    Packet OpenSession(const Packet& payload);
    Packet Rakp2(const Packet& payload);
    Packet Rakp4(const Packet& payload);
    Packet Execute(const Packet& packet, bool busy);
    bool IsInWindow(std::uint32_t sequence);
    Packet Answered(const Packet& message, const Packet& data);
    Packet Sealed(const Packet& message) const;
    void CountAnswer();
    Session* Find(const Packet& managedId);

    SimulatedBmc bmc_;
    Options options_;
    std::map<Packet, std::unique_ptr<Session>> sessions_;  ///< by the BMC's session ID
    Session* current_ = nullptr;                           ///< that was answered last
    Packet lastReply_;
    unsigned outsideWindow_ = 0, sessionsOpened_ = 0, requests_ = 0;
};

}  // namespace ipmisim
