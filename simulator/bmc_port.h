#pragma once

#include <netinet/in.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <vector>

#include "simulator/rmcp_bmc.h"

namespace ipmisim {

/// How long things take, and what is not taken at all.
struct Service {
    using Duration = std::chrono::microseconds;
    Duration perRequest{0};
    bool oneAtATime = false;       ///< requests wait for those before them
    bool slowerTogether = false;   ///< each takes as many times as long as there are outstanding
    unsigned maxOutstanding = 0;   ///< those beyond are dropped; 0: any number
    bool refusesWhenFull = false;  ///< node busy is their answer instead
    /// Round trip of the line for the so-manieth packet; none when left out.
    std::function<Duration(unsigned number)> roundTrip{};
};

/// A BMC on a UDP port. One thread serves any number of them: Descriptor, NextDue, Serve.
class BmcPort {
public:
    using Clock = std::chrono::steady_clock;
    /// What has come together, before it is read: to be dropped and reordered.
    using ReceiveHook = std::function<void(std::vector<Packet>*)>;
    /// What goes out instead of an answer.
    using SendHook = std::function<std::vector<Packet>(const Packet&)>;

    /// `port` 0 takes any. Throws std::runtime_error when there is none.
    BmcPort(BmcDescription bmc, RmcpBmc::Options options, std::uint16_t port, Service service = {});
    ~BmcPort();
    BmcPort(const BmcPort&) = delete;
    BmcPort& operator=(const BmcPort&) = delete;

    std::uint16_t port() const { return port_; }
    RmcpBmc& bmc() { return bmc_; }
    const RmcpBmc& bmc() const { return bmc_; }
    void SetHooks(ReceiveHook receive, SendHook send);

    int Descriptor() const { return socket_; }
    /// When the next answer is to go out; time_point::max() for never.
    Clock::time_point NextDue() const;
    /// Takes in what has come and sends what is due.
    void Serve();

private:
    struct Outgoing {
        sockaddr_storage client;
        Packet packet;
        bool ofSession;
    };

    void Receive();
    void Take(const Packet& packet, const sockaddr_storage& client, Clock::time_point now);
    void SendDue();

    RmcpBmc bmc_;
    Service service_;
    ReceiveHook receive_;
    SendHook send_;
    int socket_ = -1;
    std::uint16_t port_ = 0;
    std::multimap<Clock::time_point, Outgoing> outgoing_;
    unsigned outstanding_ = 0;  ///< of a session, among the outgoing
    unsigned packets_ = 0;
    Clock::time_point busyUntil_{};
};

}  // namespace ipmisim
