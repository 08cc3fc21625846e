#pragma once

#include <sys/socket.h>

#include <array>
#include <cstddef>
#include <memory>
#include <span>
#include <vector>

#include "host/spdriver/lan/name_lookup.h"
#include "host/spdriver/lan/rmcpplus_codec.h"

namespace tqrhost {

/// A UDP socket that is connected to one BMC; not blocking. Packets are sent and received by the
/// batch, so that many cost one system call.
class UdpSocket {
public:
    static constexpr std::size_t kBatch = 32;

    /// Takes the first endpoint that can be had. Throws OpeningError.
    explicit UdpSocket(std::span<const Endpoint> endpoints);
    ~UdpSocket();
    UdpSocket(const UdpSocket&) = delete;
    UdpSocket& operator=(const UdpSocket&) = delete;

    int fd() const { return fd_; }
    /// A packet that the system does not take is a lost packet: the retry finds out.
    void Send(std::span<const rmcpplus::Packet> packets);
    /// What has come, at most kBatch packets, until the next call; none when nothing is waiting.
    std::span<const ByteView> Receive();
    /// Whether a port-unreachable answer has come since this was last asked: nobody listens there.
    bool TakeRefusal();

private:
    /// What recvmmsg(2) fills.
    struct Rooms {
        std::array<std::array<std::uint8_t, rmcpplus::Codec::kMaxAnswer>, kBatch> bytes;
        std::array<iovec, kBatch> places;
        std::array<mmsghdr, kBatch> messages;
        std::array<ByteView, kBatch> packets;
    };

    int fd_ = -1;
    bool refused_ = false;
    std::unique_ptr<Rooms> rooms_;
};

}  // namespace tqrhost
