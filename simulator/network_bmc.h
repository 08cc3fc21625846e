#pragma once

#include <atomic>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "simulator/bmc_port.h"

namespace ipmisim {

/// A BMC on a loopback port, served by a thread of its own, that misbehaves as it is told.
class NetworkBmc {
public:
    struct Character {
        RmcpBmc::Options options{};
        Service service{};
        int gatherMilliseconds = 0;  ///< from the first packet on, before it looks at them
        // Both are called by the BMC's own thread.
        /// What has come together, before it is read: to be dropped and reordered.
        std::function<void(NetworkBmc&, std::vector<Packet>*)> receive{};
        /// What goes out instead of an answer.
        std::function<std::vector<Packet>(NetworkBmc&, const Packet&)> send{};
    };

    NetworkBmc(BmcDescription bmc, const Character& character, std::uint16_t port = 0);
    ~NetworkBmc();
    NetworkBmc(const NetworkBmc&) = delete;
    NetworkBmc& operator=(const NetworkBmc&) = delete;

    /// "lan:HOST:PORT"
    std::string Place() const { return "lan:127.0.0.1:" + std::to_string(port_.port()); }
    /// To be asked by the hooks, or when the thread is at rest.
    RmcpBmc& bmc() { return port_.bmc(); }

private:
    void Run();

    BmcPort port_;
    int gatherMilliseconds_;
    std::atomic<bool> ended_ = false;
    std::thread thread_;
};

}  // namespace ipmisim
