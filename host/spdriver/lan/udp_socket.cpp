#include "host/spdriver/lan/udp_socket.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

namespace tqrhost {
namespace {

/// The port is closed, or a firewall on the way or on this machine says no.
bool IsRefusal(int error) {
    return error == ECONNREFUSED || error == EHOSTUNREACH || error == EPERM || error == EACCES;
}

}  // namespace

UdpSocket::UdpSocket(std::span<const Endpoint> endpoints) : rooms_(std::make_unique<Rooms>()) {
    OpeningError error = OpeningError::kNetwork;
    for (const Endpoint& endpoint : endpoints) {
        const int fd = socket(endpoint.address.ss_family, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK,
                              IPPROTO_UDP);
        if (fd < 0) {
            if (errno == EMFILE || errno == ENFILE) error = OpeningError::kOutOfDescriptors;
            continue;
        }
        if (connect(fd, reinterpret_cast<const sockaddr*>(&endpoint.address), endpoint.length) ==
            0) {
            fd_ = fd;
            break;
        }
        close(fd);
    }
    if (fd_ < 0) throw error;
    for (std::size_t i = 0; i < kBatch; ++i) {
        rooms_->places[i] = {rooms_->bytes[i].data(), rooms_->bytes[i].size()};
        rooms_->messages[i] = {};
        rooms_->messages[i].msg_hdr.msg_iov = &rooms_->places[i];
        rooms_->messages[i].msg_hdr.msg_iovlen = 1;
    }
}

UdpSocket::~UdpSocket() {
    if (fd_ >= 0) close(fd_);
}

void UdpSocket::Send(std::span<const rmcpplus::Packet> packets) {
    std::array<iovec, kBatch> places;
    std::array<mmsghdr, kBatch> messages;
    while (!packets.empty()) {
        const std::size_t count = std::min(packets.size(), kBatch);
        for (std::size_t i = 0; i < count; ++i) {
            const ByteView bytes = packets[i].bytes();
            places[i] = {const_cast<std::uint8_t*>(bytes.data()), bytes.size()};
            messages[i] = {};
            messages[i].msg_hdr.msg_iov = &places[i];
            messages[i].msg_hdr.msg_iovlen = 1;
        }
        const int sent = sendmmsg(fd_, messages.data(), static_cast<unsigned>(count), 0);
        if (sent < 0 && errno == EINTR) continue;
        if (sent < 0 && IsRefusal(errno)) refused_ = true;
        // The refusal of an earlier packet is reported instead of sending the next one, once.
        packets = packets.subspan(sent > 0 ? static_cast<std::size_t>(sent) : 1);
    }
}

std::span<const ByteView> UdpSocket::Receive() {
    for (;;) {
        const int count = recvmmsg(fd_, rooms_->messages.data(), kBatch, MSG_DONTWAIT, nullptr);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0 && IsRefusal(errno)) refused_ = true;
        if (count <= 0) return {};
        for (std::size_t i = 0; i < static_cast<std::size_t>(count); ++i) {
            rooms_->packets[i] = ByteView(rooms_->bytes[i]).first(rooms_->messages[i].msg_len);
        }
        return std::span(rooms_->packets).first(static_cast<std::size_t>(count));
    }
}

bool UdpSocket::TakeRefusal() { return std::exchange(refused_, false); }

}  // namespace tqrhost
