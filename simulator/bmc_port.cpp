#include "simulator/bmc_port.h"

#include <arpa/inet.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <stdexcept>
#include <string>

namespace ipmisim {

BmcPort::BmcPort(BmcDescription bmc, RmcpBmc::Options options, std::uint16_t port, Service service)
    : bmc_(std::move(bmc), std::move(options)), service_(std::move(service)) {
    socket_ = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(port);
    socklen_t length = sizeof address;
    auto* const place = reinterpret_cast<sockaddr*>(&address);
    if (socket_ < 0 || bind(socket_, place, length) != 0 ||
        getsockname(socket_, place, &length) != 0) {
        if (socket_ >= 0) close(socket_);
        throw std::runtime_error("UDP port " + std::to_string(port) +
                                 " of 127.0.0.1 cannot be had; name another one");
    }
    port_ = ntohs(address.sin_port);
}

BmcPort::~BmcPort() { close(socket_); }

void BmcPort::SetHooks(ReceiveHook receive, SendHook send) {
    receive_ = std::move(receive);
    send_ = std::move(send);
}

BmcPort::Clock::time_point BmcPort::NextDue() const {
    return outgoing_.empty() ? Clock::time_point::max() : outgoing_.begin()->first;
}

void BmcPort::Serve() {
    Receive();
    SendDue();
}

void BmcPort::Receive() {
    std::vector<Packet> packets;
    sockaddr_storage client{};
    const auto now = Clock::now();
    for (Packet room(1024);;) {
        socklen_t length = sizeof client;
        const ssize_t count = recvfrom(socket_, room.data(), room.size(), 0,
                                       reinterpret_cast<sockaddr*>(&client), &length);
        if (count < 0) break;
        Packet packet(room.begin(), room.begin() + count);
        if (receive_) {
            packets.push_back(std::move(packet));
        } else {
            Take(packet, client, now);
        }
    }
    if (packets.empty()) return;
    receive_(&packets);  // one client is assumed
    for (const Packet& packet : packets) Take(packet, client, now);
}

void BmcPort::Take(const Packet& packet, const sockaddr_storage& client, Clock::time_point now) {
    const bool ofSession = RmcpBmc::IsOfSession(packet);
    const bool isFull =
        ofSession && service_.maxOutstanding != 0 && outstanding_ >= service_.maxOutstanding;
    if (isFull && !service_.refusesWhenFull) return;
    Packet answer = bmc_.Answer(packet, isFull);
    if (answer.empty()) return;
    auto due = now;
    if (ofSession && !isFull) {
        auto time = service_.perRequest;
        if (service_.slowerTogether) time *= outstanding_ + 1;
        if (service_.oneAtATime) due = std::max(due, busyUntil_);
        due = busyUntil_ = due + time;
    }
    if (service_.roundTrip) due += service_.roundTrip(packets_);
    ++packets_;
    outstanding_ += ofSession ? 1 : 0;
    outgoing_.emplace(due, Outgoing{client, std::move(answer), ofSession});
    SendDue();  // the BMC may take its time for the next
}

void BmcPort::SendDue() {
    while (!outgoing_.empty() && outgoing_.begin()->first <= Clock::now()) {
        const Outgoing outgoing = std::move(outgoing_.extract(outgoing_.begin()).mapped());
        outstanding_ -= outgoing.ofSession ? 1 : 0;
        const std::vector<Packet> packets =
            send_ ? send_(outgoing.packet) : std::vector<Packet>(1, outgoing.packet);
        for (const Packet& packet : packets) {
            sendto(socket_, packet.data(), packet.size(), 0,
                   reinterpret_cast<const sockaddr*>(&outgoing.client), sizeof(sockaddr_in));
        }
    }
}

}  // namespace ipmisim
