#include "simulator/network_bmc.h"

#include <arpa/inet.h>
#include <gcrypt.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <initializer_list>
#include <stdexcept>

namespace ipmisim {
namespace {

constexpr std::size_t kHeader = 16;  // RMCP header and session header
constexpr std::size_t kBlock = 16;   // of AES
constexpr std::uint8_t kPassword[] = {'s', 'e', 'c', 'r', 'e', 't'};
const Packet kGuid(16, 0x6B);

/// IPMI 2.0, tables 13-17 to 13-19.
struct Algorithms {
    std::uint8_t authentication, integrity, confidentiality;
    int digest;
    std::size_t codeLength;  // of an integrity code
};
Algorithms AlgorithmsOf(int cipherSuite) {
    return cipherSuite == 3 ? Algorithms{1, 1, 1, GCRY_MD_SHA1, 12}
                            : Algorithms{3, 4, 1, GCRY_MD_SHA256, 16};
}

Packet Join(std::initializer_list<Packet> parts) {
    Packet whole;
    for (const Packet& part : parts) whole.insert(whole.end(), part.begin(), part.end());
    return whole;
}
Packet Cut(const Packet& packet, std::size_t from, std::size_t count = SIZE_MAX) {
    if (from >= packet.size()) return {};
    const auto first = packet.begin() + static_cast<std::ptrdiff_t>(from);
    return {first, first + static_cast<std::ptrdiff_t>(std::min(count, packet.size() - from))};
}
Packet Number(std::uint32_t value, std::size_t bytes = 4) {
    Packet number;
    for (; number.size() < bytes; value >>= 8) number.push_back(static_cast<std::uint8_t>(value));
    return number;
}
std::uint32_t NumberAt(const Packet& packet, std::size_t at) {
    return packet[at] | packet[at + 1] << 8 | packet[at + 2] << 16 |
           static_cast<std::uint32_t>(packet[at + 3]) << 24;
}
std::uint8_t Checksum(const Packet& bytes) {
    std::uint8_t sum = 0;
    for (const std::uint8_t byte : bytes) sum = static_cast<std::uint8_t>(sum - byte);
    return sum;
}
Packet WithChecksum(Packet bytes) {
    bytes.push_back(Checksum(bytes));
    return bytes;
}
/// The answer to a message (IPMI 2.0, clause 13.8): `data` from the completion code on.
Packet Reply(const Packet& message, const Packet& data) {
    const auto netFn = static_cast<std::uint8_t>(message[1] | 4);
    return Join({WithChecksum({message[3], netFn}),
                 WithChecksum(Join({{message[0], message[4], message[5]}, data}))});
}
Packet Setup(std::uint8_t payloadType, const Packet& payload) {
    return Join({{0x06, 0x00, 0xFF, 0x07, 0x06, payloadType},
                 Packet(8, 0),
                 Number(static_cast<std::uint32_t>(payload.size()), 2),
                 payload});
}

}  // namespace

NetworkBmc::NetworkBmc(BmcDescription bmc, Character character)
    : bmc_(std::move(bmc)), character_(std::move(character)) {
    gcry_check_version(nullptr);
    socket_ = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    auto* const place = reinterpret_cast<sockaddr*>(&address);
    if (bind(socket_, place, length) != 0 || getsockname(socket_, place, &length) != 0) {
        throw std::runtime_error("no UDP port on 127.0.0.1");
    }
    port_ = ntohs(address.sin_port);
    thread_ = std::thread([this] { Serve(); });
}

NetworkBmc::~NetworkBmc() {
    ended_ = true;
    thread_.join();
    close(socket_);
}

void NetworkBmc::Serve() {
    while (!ended_) {
        pollfd wait{socket_, POLLIN, 0};
        if (poll(&wait, 1, 20) < 1) continue;
        std::this_thread::sleep_for(std::chrono::milliseconds(character_.gatherMilliseconds));
        std::vector<Packet> packets;
        for (Packet room(1024);;) {
            socklen_t length = sizeof client_;
            const ssize_t count = recvfrom(socket_, room.data(), room.size(), 0,
                                           reinterpret_cast<sockaddr*>(&client_), &length);
            if (count < 0) break;
            packets.push_back(Cut(room, 0, static_cast<std::size_t>(count)));
        }
        if (character_.receive) character_.receive(*this, &packets);
        for (const Packet& packet : packets) {
            Answer(packet, character_.busyBeyondFirst && &packet != &packets.front());
        }
    }
}

void NetworkBmc::Answer(const Packet& packet, bool busy) {
    if (packet.size() < kHeader || packet[3] != 0x07) return;
    const Packet payload = Cut(packet, kHeader, packet[14] | packet[15] << 8);
    Packet answer;
    if (packet[4] == 0x00) {
        answer = Capabilities(packet);
    } else if (packet[5] == 0x10 && payload.size() == 32) {
        answer = OpenSession(payload);
    } else if (packet[5] == 0x12 && payload.size() >= 28) {
        answer = Rakp2(payload);
    } else if (packet[5] == 0x14 && payload.size() > 8) {
        answer = Rakp4(payload);
    } else if (IsOfSession(packet)) {
        answer = Execute(packet, busy);
    }
    if (answer.empty()) return;
    const std::vector<Packet> out =
        character_.send ? character_.send(*this, answer) : std::vector<Packet>(1, answer);
    for (const Packet& each : out) {
        sendto(socket_, each.data(), each.size(), 0, reinterpret_cast<const sockaddr*>(&client_),
               sizeof client_);
    }
}

/// In a packet of IPMI 1.5, which wants no session.
Packet NetworkBmc::Capabilities(const Packet& packet) const {
    const Packet message = Cut(packet, 14);
    if (message.size() < 9 || message[5] != 0x38) return {};
    const std::uint8_t status = character_.kg.empty() ? 0x04 : 0x24;
    const Packet reply = Reply(message, {0, 1, 0x80, status, 0x03, 0, 0, 0, 0});
    return Join({Cut(packet, 0, 13), Number(static_cast<std::uint32_t>(reply.size()), 1), reply});
}

Packet NetworkBmc::OpenSession(const Packet& payload) {
    const Algorithms ours = AlgorithmsOf(character_.cipherSuite);
    const Packet tag = Cut(payload, 0, 1);
    if (payload[12] != ours.authentication || payload[20] != ours.integrity ||
        payload[28] != ours.confidentiality) {
        return Setup(0x11, Join({tag, {0x11, 0, 0}, Cut(payload, 4, 4)}));
    }
    session_ = {};
    session_.consoleId = Cut(payload, 4, 4);
    session_.managedId = Number(0x1000 + ++sessionsOpened_);
    return Setup(
        0x11, Join({tag, {0, 4, 0}, session_.consoleId, session_.managedId, Cut(payload, 8, 24)}));
}

Packet NetworkBmc::Rakp2(const Packet& payload) {
    Session& s = session_;
    if (Cut(payload, 4, 4) != s.managedId) return {};
    s.consoleRandom = Cut(payload, 8, 16);
    s.bmcRandom = Packet(16, static_cast<std::uint8_t>(sessionsOpened_));
    s.who = Join({Cut(payload, 24, 1), Cut(payload, 27)});
    const Packet password(std::begin(kPassword), std::end(kPassword));
    const Packet key =
        character_.kg.empty() ? password : Packet(character_.kg.begin(), character_.kg.end());
    s.sik = Hmac(key, Join({s.consoleRandom, s.bmcRandom, s.who}));
    s.integrityKey = Hmac(s.sik, Packet(20, 1));
    s.confidentialityKey = Cut(Hmac(s.sik, Packet(20, 2)), 0, kBlock);
    return Setup(0x13, Join({Cut(payload, 0, 1),
                             {0, 0, 0},
                             s.consoleId,
                             s.bmcRandom,
                             kGuid,
                             Hmac(password, Join({s.consoleId, s.managedId, s.consoleRandom,
                                                  s.bmcRandom, kGuid, s.who}))}));
}

Packet NetworkBmc::Rakp4(const Packet& payload) {
    const Session& s = session_;
    const Packet password(std::begin(kPassword), std::end(kPassword));
    if (Cut(payload, 4, 4) != s.managedId ||
        Cut(payload, 8) != Hmac(password, Join({s.bmcRandom, s.consoleId, s.who}))) {
        return {};
    }
    const Packet code = Hmac(s.sik, Join({s.consoleRandom, s.managedId, kGuid}));
    return Setup(0x15,
                 Join({Cut(payload, 0, 1), {0, 0, 0}, s.consoleId, Cut(code, 0, CodeLength())}));
}

Packet NetworkBmc::Execute(const Packet& packet, bool busy) {
    const std::size_t payloadLength = packet[14] | packet[15] << 8;
    if (Cut(packet, 6, 4) != session_.managedId || packet != Signed(packet)) return {};
    const std::uint32_t sequence = NumberAt(packet, 10);
    if (sequence > session_.highest + 15 || sequence + 16 < session_.highest) ++outsideWindow_;
    if (!session_.received.insert(sequence).second) return {};
    session_.highest = std::max(session_.highest, sequence);
    const Packet plain = Aes(Cut(packet, kHeader, kBlock),
                             Cut(packet, kHeader + kBlock, payloadLength - kBlock), false);
    const Packet message = Cut(plain, 0, plain.size() - 1 - plain.back());
    const auto netFn = static_cast<std::uint8_t>(message[1] >> 2);
    const Packet data = Cut(message, 6, message.size() - 7);
    if (netFn == 0x06 && message[5] == 0x3B) return Answered(message, {0, data[0]});
    if (netFn == 0x06 && message[5] == 0x3C) return Answered(message, {0});
    if (busy) return Answered(message, {0xC0});
    const auto response = bmc_.Execute(netFn, message[1] & 3, message[5], data);
    return response ? Answered(message, *response) : Packet();
}

Packet NetworkBmc::Answered(const Packet& message, const Packet& data) {
    ++session_.sent;
    lastReply_ = Reply(message, data);
    return Sealed(lastReply_);
}

Packet NetworkBmc::Lie() const {
    Packet message = lastReply_;
    message.pop_back();
    for (std::size_t i = 7; i < message.size(); ++i) message[i] ^= 0x11;
    return Sealed(Join({Cut(message, 0, 3), WithChecksum(Cut(message, 3))}));
}

Packet NetworkBmc::Sealed(const Packet& message) const {
    Packet plain = message;
    const std::size_t padding = kBlock - 1 - message.size() % kBlock;
    for (std::size_t i = 1; i <= padding; ++i) plain.push_back(static_cast<std::uint8_t>(i));
    plain.push_back(static_cast<std::uint8_t>(padding));
    const Packet initial(kBlock, static_cast<std::uint8_t>(session_.sent));
    const Packet payload = Join({initial, Aes(initial, plain, true)});
    const Packet whole = Join(
        {{0x06, 0x00, 0xFF, 0x07, 0x06, 0xC0},
         session_.consoleId,
         Number(session_.sent),
         Number(static_cast<std::uint32_t>(payload.size()), 2),
         payload,
         {0xFF, 0xFF, 2, 0x07},  // the payload is of whole blocks: two bytes are missing to four
         Packet(CodeLength(), 0)});
    return Signed(whole);
}

std::size_t NetworkBmc::CodeLength() const {
    return AlgorithmsOf(character_.cipherSuite).codeLength;
}

Packet NetworkBmc::Signed(Packet packet) const {
    const std::size_t length = CodeLength();
    if (packet.size() < kHeader + length) return packet;
    const std::size_t end = packet.size() - length;
    const Packet code = Hmac(session_.integrityKey, Cut(packet, 4, end - 4));
    std::copy_n(code.begin(), length, packet.begin() + static_cast<std::ptrdiff_t>(end));
    return packet;
}

Packet NetworkBmc::Hmac(const Packet& key, const Packet& data) const {
    const int digest = AlgorithmsOf(character_.cipherSuite).digest;
    gcry_md_hd_t handle = nullptr;
    if (gcry_md_open(&handle, digest, GCRY_MD_FLAG_HMAC) != 0 ||
        gcry_md_setkey(handle, key.data(), key.size()) != 0) {
        throw std::runtime_error("no HMAC");
    }
    gcry_md_write(handle, data.data(), data.size());
    const std::uint8_t* const code = gcry_md_read(handle, digest);
    Packet result(code, code + gcry_md_get_algo_dlen(digest));
    gcry_md_close(handle);
    return result;
}

Packet NetworkBmc::Aes(const Packet& initial, const Packet& data, bool encrypt) const {
    Packet result(data.size());
    gcry_cipher_hd_t handle = nullptr;
    const Packet& key = session_.confidentialityKey;
    if (gcry_cipher_open(&handle, GCRY_CIPHER_AES128, GCRY_CIPHER_MODE_CBC, 0) != 0 ||
        gcry_cipher_setkey(handle, key.data(), key.size()) != 0 ||
        gcry_cipher_setiv(handle, initial.data(), initial.size()) != 0 ||
        (encrypt ? gcry_cipher_encrypt : gcry_cipher_decrypt)(handle, result.data(), result.size(),
                                                              data.data(), data.size()) != 0) {
        throw std::runtime_error("no AES");
    }
    gcry_cipher_close(handle);
    return result;
}

}  // namespace ipmisim
