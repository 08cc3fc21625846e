#pragma once

#include <netinet/in.h>

#include <atomic>
#include <cstdint>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "simulator/simulated_bmc.h"

namespace ipmisim {

using Packet = std::vector<std::uint8_t>;

/// A BMC over RMCP+ (IPMI 2.0, chapter 13) on a loopback port, with the user "root" and the
/// password "secret", that answers from a simulated BMC and misbehaves as it is told. Keys and
/// packets are its own work, not that of the code under test.
class NetworkBmc {
public:
    struct Character {
        int cipherSuite = 17;  ///< or 3
        std::string kg{};
        int gatherMilliseconds = 0;    ///< from the first packet on, before it looks at them
        bool busyBeyondFirst = false;  ///< of requests that come together it takes one
        // Both are called by the peer's own thread.
        /// What has come together, before it is read: to be dropped and reordered.
        std::function<void(NetworkBmc&, std::vector<Packet>*)> receive{};
        /// What goes out instead of an answer.
        std::function<std::vector<Packet>(NetworkBmc&, const Packet&)> send{};
    };

    NetworkBmc(BmcDescription bmc, Character character);
    ~NetworkBmc();
    NetworkBmc(const NetworkBmc&) = delete;
    NetworkBmc& operator=(const NetworkBmc&) = delete;

    /// "lan:HOST:PORT"
    std::string Place() const { return "lan:127.0.0.1:" + std::to_string(port_); }
    /// Forgets its session, as a BMC does that is reset.
    void Expire() { session_ = {}; }
    /// A packet of the session with the integrity code that fits it.
    Packet Signed(Packet packet) const;
    /// The last answer over again with other data in it; nothing else gives it away.
    Packet Lie() const;
    std::size_t CodeLength() const;
    static bool IsOfSession(const Packet& packet) { return packet.size() > 5 && packet[5] == 0xC0; }
    /// Requests whose session sequence number lay outside the window of IPMI 2.0, clause 6.12.13.
    unsigned OutsideWindow() const { return outsideWindow_; }
    unsigned SessionsOpened() const { return sessionsOpened_; }

private:
    struct Session {
        Packet consoleId, managedId;  // empty: no session
        Packet consoleRandom, bmcRandom;
        Packet who;  // role, length of the user name, user name
        Packet sik, integrityKey, confidentialityKey;
        std::uint32_t highest = 0, sent = 0;
        std::set<std::uint32_t> received;
    };

    void Serve();
    void Answer(const Packet& packet, bool busy);
    Packet Capabilities(const Packet& packet) const;
    Packet OpenSession(const Packet& payload);
    Packet Rakp2(const Packet& payload);
    Packet Rakp4(const Packet& payload);
    Packet Execute(const Packet& packet, bool busy);
    Packet Answered(const Packet& message, const Packet& data);
    Packet Sealed(const Packet& message) const;
    Packet Hmac(const Packet& key, const Packet& data) const;
    Packet Aes(const Packet& initial, const Packet& data, bool encrypt) const;

    SimulatedBmc bmc_;
    Character character_;
    Session session_;
    Packet lastReply_;
    int socket_ = -1;
    std::uint16_t port_ = 0;
    sockaddr_in client_{};
    std::atomic<bool> ended_ = false;
    std::atomic<unsigned> outsideWindow_ = 0, sessionsOpened_ = 0;
    std::thread thread_;
};

}  // namespace ipmisim
