#pragma once

#include <poll.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <deque>
#include <functional>
#include <random>
#include <thread>
#include <vector>

#include "tests/support/ipmi_sim.h"

namespace ipmiseltest {

/// A line between one client and a UDP port of 127.0.0.1, with a thread of its own. What it does to
/// packets follows from its seed; seed 0 hands all of them on as they are.
class UdpRelay {
public:
    using Packet = std::vector<std::uint8_t>;
    /// Called with the number of each packet from the client, from 1, before that is handed on.
    using Observer = std::function<void(unsigned number)>;

    UdpRelay(std::uint16_t target, unsigned seed, Observer observer = {})
        : random_(seed), observer_(std::move(observer)), target_(target) {
        if (seed != 0) {
            for (unsigned* const share : {&lost_, &doubled_, &late_, &old_, &cut_}) {
                *share = Below(3) == 0 ? 0 : Below(6);
            }
            if (Below(3) == 0) silentFrom_ = 20 + Below(200);
        }
        thread_ = std::thread([this] { Run(); });
    }
    ~UdpRelay() {
        ended_ = true;
        thread_.join();
    }
    UdpRelay(const UdpRelay&) = delete;
    UdpRelay& operator=(const UdpRelay&) = delete;

    std::string Place() const { return "lan:127.0.0.1:" + std::to_string(client_.Port()); }

private:
    using Clock = std::chrono::steady_clock;
    struct Held {
        Clock::time_point due;
        bool toTarget;
        Packet packet;
    };

    unsigned Below(unsigned limit) { return static_cast<unsigned>(random_() % limit); }
    bool InPercent(unsigned share) { return Below(100) < share; }

    void Run() {
        while (!ended_) {
            pollfd waits[] = {{client_.Handle(), POLLIN, 0}, {target_.Handle(), POLLIN, 0}};
            poll(waits, 2, held_.empty() ? 20 : 1);
            if (waits[0].revents != 0) Take(client_.Handle(), true);
            if (waits[1].revents != 0) Take(target_.Handle(), false);
            while (!held_.empty() && held_.front().due <= Clock::now()) {
                HandOn(held_.front().packet, held_.front().toTarget);
                held_.pop_front();
            }
        }
    }
    void Take(int socket, bool toTarget) {
        Packet packet(2048);
        sockaddr_in from{};
        socklen_t length = sizeof from;
        const ssize_t count = recvfrom(socket, packet.data(), packet.size(), MSG_DONTWAIT,
                                       reinterpret_cast<sockaddr*>(&from), &length);
        if (count < 0) return;
        packet.resize(static_cast<std::size_t>(count));
        if (toTarget) {
            clientAddress_ = from;
            ++number_;
            if (observer_) observer_(number_);
        }
        Spoil(std::move(packet), toTarget);
    }
    void Spoil(Packet packet, bool toTarget) {
        if (number_ == silentFrom_ && !silentUntil_) {
            silentUntil_ = Clock::now() + std::chrono::milliseconds(Below(3000));
        }
        if (InPercent(lost_) || (silentUntil_ && Clock::now() < *silentUntil_)) return;
        if (InPercent(cut_)) packet.resize(Below(static_cast<unsigned>(packet.size()) + 1));
        sent_.push_back({{}, toTarget, packet});
        if (InPercent(old_)) {
            const Held& old = sent_[Below(static_cast<unsigned>(sent_.size()))];
            HandOn(old.packet, old.toTarget);
        }
        if (InPercent(late_)) {
            const auto wait = std::chrono::milliseconds(1 + Below(30));
            held_.push_back({Clock::now() + wait, toTarget, packet});
            return;
        }
        HandOn(packet, toTarget);
        if (InPercent(doubled_)) HandOn(packet, toTarget);
    }
    void HandOn(const Packet& packet, bool toTarget) {
        if (toTarget) {
            send(target_.Handle(), packet.data(), packet.size(), 0);
        } else {
            sendto(client_.Handle(), packet.data(), packet.size(), 0,
                   reinterpret_cast<const sockaddr*>(&clientAddress_), sizeof clientAddress_);
        }
    }

    std::mt19937 random_;
    Observer observer_;
    UdpSocket client_{0};
    UdpSocket target_;
    sockaddr_in clientAddress_{};
    // Percent of the packets, each way.
    unsigned lost_ = 0, doubled_ = 0, late_ = 0, old_ = 0, cut_ = 0;
    unsigned silentFrom_ = 0;  ///< packet with which the line is dead for a while; 0 for never
    std::optional<Clock::time_point> silentUntil_;
    unsigned number_ = 0;
    std::deque<Held> held_;
    std::vector<Held> sent_;
    std::atomic<bool> ended_ = false;
    std::thread thread_;
};

}  // namespace ipmiseltest
