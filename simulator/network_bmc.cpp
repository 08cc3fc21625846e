#include "simulator/network_bmc.h"

#include <poll.h>

#include <algorithm>
#include <chrono>

namespace ipmisim {

NetworkBmc::NetworkBmc(BmcDescription bmc, const Character& character, std::uint16_t port)
    : port_(std::move(bmc), character.options, port, character.service),
      gatherMilliseconds_(character.gatherMilliseconds) {
    BmcPort::ReceiveHook receive;
    BmcPort::SendHook send;
    if (character.receive) {
        receive = [this, hook = character.receive](std::vector<Packet>* packets) {
            hook(*this, packets);
        };
    }
    if (character.send) {
        send = [this, hook = character.send](const Packet& packet) { return hook(*this, packet); };
    }
    port_.SetHooks(std::move(receive), std::move(send));
    thread_ = std::thread([this] { Run(); });
}

NetworkBmc::~NetworkBmc() {
    ended_ = true;
    thread_.join();
}

void NetworkBmc::Run() {
    using std::chrono::milliseconds;
    constexpr milliseconds kLooksForItsEnd{20};
    while (!ended_) {
        const auto now = BmcPort::Clock::now();
        const auto due = std::min(port_.NextDue(), now + kLooksForItsEnd);
        const auto rest = std::chrono::ceil<milliseconds>(due - now).count();
        pollfd wait{port_.Descriptor(), POLLIN, 0};
        if (poll(&wait, 1, static_cast<int>(std::max<milliseconds::rep>(rest, 0))) > 0) {
            std::this_thread::sleep_for(milliseconds(gatherMilliseconds_));
        }
        port_.Serve();
    }
}

}  // namespace ipmisim
