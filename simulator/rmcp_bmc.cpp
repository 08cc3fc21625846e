#include "simulator/rmcp_bmc.h"

#include <openssl/core_names.h>
#include <openssl/evp.h>
#include <openssl/params.h>

#include <algorithm>
#include <array>
#include <initializer_list>
#include <set>
#include <stdexcept>
#include <string_view>

#include "ipmi/command.h"

namespace ipmisim {
namespace {

constexpr std::size_t kHeader = 16;  // RMCP header and session header
constexpr std::size_t kBlock = 16;   // of AES
constexpr std::size_t kMaxSessions = 16;
constexpr std::size_t kPaddedName = 16;
constexpr std::uint8_t kAuthenticated = 0x40;
constexpr std::uint8_t kEncrypted = 0x80;
const Packet kGuid(16, 0x6B);

/// IPMI 2.0, tables 13-17 to 13-19.
struct Algorithms {
    std::uint8_t authentication, integrity, confidentiality;
    bool sha1() const { return authentication == 1; }
    std::size_t codeLength() const { return sha1() ? 12 : 16; }
};
Algorithms AlgorithmsOf(int cipherSuite) {
    switch (cipherSuite) {
        case 1:
            return {1, 0, 0};
        case 2:
            return {1, 1, 0};
        case 3:
            return {1, 1, 1};
        case 15:
            return {3, 0, 0};
        case 16:
            return {3, 4, 0};
        case 17:
            return {3, 4, 1};
        default:
            throw std::invalid_argument("no such cipher suite");
    }
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
Packet Text(std::string_view text) { return {text.begin(), text.end()}; }
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

void Check(bool good) {
    if (!good) throw std::runtime_error("libcrypto fails");
}

}  // namespace

/// A keyed HMAC, and AES where there is a key for it.
class RmcpBmc::Crypto {
public:
    Crypto(bool sha1, const Packet& key) {
        EVP_MAC* const mac = EVP_MAC_fetch(nullptr, "HMAC", nullptr);
        hmac_.reset(EVP_MAC_CTX_new(mac));
        EVP_MAC_free(mac);
        char digest[] = "SHA256";
        if (sha1) std::string_view("SHA1").copy(digest, sizeof digest);
        if (sha1) digest[4] = '\0';
        const OSSL_PARAM parameters[] = {
            OSSL_PARAM_construct_utf8_string(OSSL_MAC_PARAM_DIGEST, digest, 0),
            OSSL_PARAM_construct_end()};
        Check(hmac_ && EVP_MAC_init(hmac_.get(), key.data(), key.size(), parameters) == 1);
    }
    Packet Hmac(const Packet& data) const {
        Packet code(EVP_MAX_MD_SIZE);
        std::size_t length = 0;
        Check(EVP_MAC_init(hmac_.get(), nullptr, 0, nullptr) == 1 &&
              EVP_MAC_update(hmac_.get(), data.data(), data.size()) == 1 &&
              EVP_MAC_final(hmac_.get(), code.data(), &length, code.size()) == 1);
        code.resize(length);
        return code;
    }
    void SetCipherKey(const Packet& key) {
        for (const bool encrypt : {false, true}) {
            auto& context = encrypt ? encrypt_ : decrypt_;
            context.reset(EVP_CIPHER_CTX_new());
            Check(context &&
                  EVP_CipherInit_ex(context.get(), EVP_aes_128_cbc(), nullptr, key.data(), nullptr,
                                    encrypt ? 1 : 0) == 1 &&
                  EVP_CIPHER_CTX_set_padding(context.get(), 0) == 1);
        }
    }
    Packet Aes(const Packet& initial, const Packet& data, bool encrypt) const {
        EVP_CIPHER_CTX* const context = (encrypt ? encrypt_ : decrypt_).get();
        Packet result(data.size());
        int length = 0;
        Check(EVP_CipherInit_ex(context, nullptr, nullptr, nullptr, initial.data(), -1) == 1 &&
              EVP_CipherUpdate(context, result.data(), &length, data.data(),
                               static_cast<int>(data.size())) == 1);
        return result;
    }

private:
    struct Free {
        void operator()(EVP_MAC_CTX* context) const { EVP_MAC_CTX_free(context); }
        void operator()(EVP_CIPHER_CTX* context) const { EVP_CIPHER_CTX_free(context); }
    };
    std::unique_ptr<EVP_MAC_CTX, Free> hmac_;
    std::unique_ptr<EVP_CIPHER_CTX, Free> encrypt_, decrypt_;
};

struct RmcpBmc::Session {
    Packet consoleId, managedId, consoleRandom, bmcRandom;
    Packet who;         // role, length of the user name, user name
    Packet whoInRakp3;  // the same, as the code of RAKP 3 has it
    Packet rakp4Code;
    std::unique_ptr<Crypto> crypto;  // keyed with K1 and K2
    bool open = false;
    std::uint32_t highest = 0, sent = 0;
    std::set<std::uint32_t> received;
};

RmcpBmc::RmcpBmc(BmcDescription bmc, Options options)
    : bmc_(std::move(bmc)), options_(std::move(options)) {
    AlgorithmsOf(options_.cipherSuite);
}

RmcpBmc::~RmcpBmc() = default;

void RmcpBmc::Expire() {
    sessions_.clear();
    current_ = nullptr;
}

bool RmcpBmc::IsOfSession(const Packet& packet) {
    return packet.size() > kHeader && packet[4] == 0x06 && (packet[5] & 0x3F) == 0;
}

RmcpBmc::Session* RmcpBmc::Find(const Packet& managedId) {
    const auto found = sessions_.find(managedId);
    return found == sessions_.end() ? nullptr : found->second.get();
}

Packet RmcpBmc::Answer(const Packet& packet, bool busy) {
    if (packet.size() < kHeader || packet[3] != 0x07) return {};
    if (packet[4] == 0x00) return Sessionless(packet);
    const Packet payload =
        Cut(packet, kHeader, packet[14] | static_cast<std::size_t>(packet[15]) << 8);
    switch (packet[5]) {
        case 0x10:
            return payload.size() == 32 ? OpenSession(payload) : Packet();
        case 0x12:
            return payload.size() >= 28 ? Rakp2(payload) : Packet();
        case 0x14:
            return payload.size() > 8 ? Rakp4(payload) : Packet();
        default:
            return IsOfSession(packet) ? Execute(packet, busy) : Packet();
    }
}

/// In a packet of IPMI 1.5, which wants no session.
Packet RmcpBmc::Sessionless(const Packet& packet) const {
    const Packet message = Cut(packet, 14);
    if (message.size() < 9) return {};
    const std::uint8_t status = options_.kg.empty() ? 0x04 : 0x24;
    const std::uint8_t versions = options_.deviations.noIpmi20 ? 0x01 : 0x03;
    Packet data;
    const ipmi::CommandCode command{ipmi::kNetFnApplication, message[5]};
    if (command == ipmi::kGetChannelAuthenticationCapabilities) {
        data = {0, 1, 0x80, status, versions, 0, 0, 0, 0};
    } else if (command == ipmi::kGetChannelCipherSuites && message[8] == 0x80) {
        data = ListedSuites();  // the first answer
    }
    if (data.empty()) return {};
    const Packet reply = Reply(message, data);
    return Join({Cut(packet, 0, 13), Number(static_cast<std::uint32_t>(reply.size()), 1), reply});
}

/// Records of a list by suite (22.15.2); no more of them than one answer holds.
Packet RmcpBmc::ListedSuites() const {
    Packet data;
    if (!options_.listedSuites.empty()) data = {0, 1};
    for (const std::uint8_t suite : options_.listedSuites) {
        data = Join({data, {0xC0, suite, 0x00, 0x40, 0x80}});
    }
    return data;
}

Packet RmcpBmc::OpenSession(const Packet& payload) {
    const Algorithms ours = AlgorithmsOf(options_.cipherSuite);
    const Packet tag = Cut(payload, 0, 1);
    if (payload[12] != ours.authentication || payload[20] != ours.integrity ||
        payload[28] != ours.confidentiality) {
        return Setup(0x11, Join({tag, {0x11, 0, 0}, Cut(payload, 4, 4)}));
    }
    if (!options_.hasFreeSession) {
        return Setup(0x11, Join({tag, {0x01, 0, 0}, Cut(payload, 4, 4)}));
    }
    if (sessions_.size() >= kMaxSessions) Expire();
    auto session = std::make_unique<Session>();
    session->consoleId = Cut(payload, 4, 4);
    session->managedId = Number(0x1000 + ++sessionsOpened_);
    const std::uint8_t privilege = options_.deviations.noPrivilege ? 0 : 4;
    Packet answer = Setup(
        0x11,
        Join(
            {tag, {0, privilege, 0}, session->consoleId, session->managedId, Cut(payload, 8, 24)}));
    sessions_[session->managedId] = std::move(session);
    return answer;
}

Packet RmcpBmc::Rakp2(const Packet& payload) {
    Session* const s = Find(Cut(payload, 4, 4));
    if (s == nullptr) return {};
    const Packet tag = Cut(payload, 0, 1);
    const Packet name = Cut(payload, 28, payload[27]);
    Packet known = Text(kUser);
    if (options_.deviations.paddedUserName) known.resize(kPaddedName);
    if (name != known) return Setup(0x13, Join({tag, {0x0D, 0, 0}, s->consoleId}));
    if ((payload[24] & 0x0F) > options_.maxPrivilege) {
        return Setup(0x13, Join({tag, {0x0A, 0, 0}, s->consoleId}));
    }
    s->consoleRandom = Cut(payload, 8, 16);
    s->bmcRandom = Packet(16, static_cast<std::uint8_t>(sessionsOpened_));
    s->who = s->whoInRakp3 = Join({Cut(payload, 24, 1), Cut(payload, 27, 1), name});
    if (options_.deviations.paddedUserName) {
        const Packet bare = Text(kUser);
        s->whoInRakp3 = Join({{static_cast<std::uint8_t>(payload[24] & 0x0F)},
                              Number(static_cast<std::uint32_t>(bare.size()), 1),
                              bare});
    }
    const Algorithms ours = AlgorithmsOf(options_.cipherSuite);
    const Crypto byPassword(ours.sha1(), Text(kPassword));
    const Crypto byKey(ours.sha1(), Text(options_.kg.empty() ? kPassword : options_.kg));
    const Crypto bySik(ours.sha1(), byKey.Hmac(Join({s->consoleRandom, s->bmcRandom, s->who})));
    s->crypto = std::make_unique<Crypto>(ours.sha1(), bySik.Hmac(Packet(20, 1)));
    s->crypto->SetCipherKey(Cut(bySik.Hmac(Packet(20, 2)), 0, kBlock));
    s->rakp4Code =
        Cut(bySik.Hmac(Join({s->consoleRandom, s->managedId, kGuid})), 0, ours.codeLength());
    if (options_.deviations.paddedUserName && ours.integrity == 0) s->rakp4Code.clear();
    const Packet code = byPassword.Hmac(
        Join({s->consoleId, s->managedId, s->consoleRandom, s->bmcRandom, kGuid, s->who}));
    const Packet extra(options_.deviations.longRakp2Code ? 1 : 0, 0);
    return Setup(0x13, Join({tag, {0, 0, 0}, s->consoleId, s->bmcRandom, kGuid, code, extra}));
}

Packet RmcpBmc::Rakp4(const Packet& payload) {
    Session* const s = Find(Cut(payload, 4, 4));
    if (s == nullptr || !s->crypto) return {};
    const Crypto byPassword(AlgorithmsOf(options_.cipherSuite).sha1(), Text(kPassword));
    if (Cut(payload, 8) != byPassword.Hmac(Join({s->bmcRandom, s->consoleId, s->whoInRakp3}))) {
        return {};
    }
    s->open = true;
    return Setup(0x15, Join({Cut(payload, 0, 1), {0, 0, 0}, s->consoleId, s->rakp4Code}));
}

/// Takes a session sequence number in; false for one that is not to be answered.
bool RmcpBmc::IsInWindow(std::uint32_t sequence) {
    const std::uint32_t window = options_.sequenceWindow;
    if (sequence > current_->highest + window || sequence + window + 1 < current_->highest) {
        ++outsideWindow_;
        return false;
    }
    current_->highest = std::max(current_->highest, sequence);
    auto& received = current_->received;
    received.erase(received.begin(),
                   received.lower_bound(sequence - std::min(sequence, 2 * window + 2)));
    return received.insert(sequence).second;
}

Packet RmcpBmc::Execute(const Packet& packet, bool busy) {
    const Algorithms ours = AlgorithmsOf(options_.cipherSuite);
    const std::size_t payloadLength = packet[14] | static_cast<std::size_t>(packet[15]) << 8;
    Session* const session = Find(Cut(packet, 6, 4));
    const unsigned type =
        (ours.integrity != 0 ? kAuthenticated : 0U) | (ours.confidentiality != 0 ? kEncrypted : 0U);
    if (session == nullptr || !session->open || packet[5] != type) return {};
    current_ = session;
    if (packet != Signed(packet) || !IsInWindow(NumberAt(packet, 10))) return {};
    Packet message = Cut(packet, kHeader, payloadLength);
    if (ours.confidentiality != 0) {
        if (message.size() < 2 * kBlock || message.size() % kBlock != 0) return {};
        message = session->crypto->Aes(Cut(message, 0, kBlock), Cut(message, kBlock), false);
        if (message.back() >= kBlock) return {};
        message.resize(message.size() - 1 - message.back());
    }
    if (message.size() < 7) return {};
    const auto netFn = static_cast<std::uint8_t>(message[1] >> 2);
    const Packet data = Cut(message, 6, message.size() - 7);
    const ipmi::CommandCode command{netFn, message[5]};
    if (command == ipmi::kSetSessionPrivilegeLevel && !data.empty()) {
        return Answered(message, {ipmi::kCompleted, data[0]});
    }
    if (command == ipmi::kCloseSession) return Answered(message, {ipmi::kCompleted});
    ++requests_;
    if (busy) return Answered(message, {ipmi::kNodeBusy});
    const auto response = bmc_.Execute(netFn, message[1] & 3, command.number, data);
    return response ? Answered(message, *response) : Packet();
}

void RmcpBmc::CountAnswer() {
    constexpr std::uint32_t kStartsOverAfter = 40;
    std::uint32_t& sent = current_->sent;
    switch (options_.deviations.numbers) {
        case RmcpDeviations::Numbers::kRight:
            ++sent;
            break;
        case RmcpDeviations::Numbers::kStandStill:
            sent = 1;
            break;
        case RmcpDeviations::Numbers::kZero:
            sent = 0;
            break;
        case RmcpDeviations::Numbers::kStartOver:
            sent = sent % kStartsOverAfter + 1;
            break;
    }
}

Packet RmcpBmc::Answered(const Packet& message, const Packet& data) {
    CountAnswer();
    lastReply_ = Reply(message, data);
    if (options_.deviations.badChecksums) ++lastReply_.back();
    return Sealed(lastReply_);
}

Packet RmcpBmc::Lie() const {
    Packet message = lastReply_;
    message.pop_back();
    for (std::size_t i = 7; i < message.size(); ++i) message[i] ^= 0x11;
    return Sealed(Join({Cut(message, 0, 3), WithChecksum(Cut(message, 3))}));
}

Packet RmcpBmc::Sealed(const Packet& message) const {
    const Algorithms ours = AlgorithmsOf(options_.cipherSuite);
    Packet payload = message;
    std::uint8_t type = 0;
    if (ours.confidentiality != 0) {
        type |= kEncrypted;
        const std::size_t padding = kBlock - 1 - message.size() % kBlock;
        for (std::size_t i = 1; i <= padding; ++i) {
            payload.push_back(static_cast<std::uint8_t>(i));
        }
        payload.push_back(static_cast<std::uint8_t>(padding));
        const Packet initial(kBlock, static_cast<std::uint8_t>(current_->sent));
        payload = Join({initial, current_->crypto->Aes(initial, payload, true)});
    }
    if (ours.integrity != 0) type |= kAuthenticated;
    Packet whole = Join({{0x06, 0x00, 0xFF, 0x07, 0x06, type},
                         current_->consoleId,
                         Number(current_->sent),
                         Number(static_cast<std::uint32_t>(payload.size()), 2),
                         payload});
    if (ours.integrity == 0) return whole;
    // From the authentication type on, a multiple of four bytes.
    const std::size_t padding = (4 - (whole.size() - 4 + 2) % 4) % 4;
    whole = Join({whole,
                  Packet(padding, 0xFF),
                  {static_cast<std::uint8_t>(padding), 0x07},
                  Packet(CodeLength(), 0)});
    return Signed(whole);
}

std::size_t RmcpBmc::CodeLength() const { return AlgorithmsOf(options_.cipherSuite).codeLength(); }

Packet RmcpBmc::Signed(Packet packet) const {
    const std::size_t length = CodeLength();
    const bool isSigned = AlgorithmsOf(options_.cipherSuite).integrity != 0;
    if (!isSigned || packet.size() < kHeader + length || current_ == nullptr) return packet;
    const std::size_t end = packet.size() - length;
    const Packet code = current_->crypto->Hmac(Cut(packet, 4, end - 4));
    std::copy_n(code.begin(), length, packet.begin() + static_cast<std::ptrdiff_t>(end));
    return packet;
}

}  // namespace ipmisim
