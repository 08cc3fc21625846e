#include "host/spdriver/lan/rmcpplus_codec.h"

#include <algorithm>
#include <iterator>

#include "base/bytes.h"

namespace tqrhost::rmcpplus {
namespace {

constexpr std::size_t kHeaderLength = 16;  // RMCP header and session header
constexpr std::size_t kSignedFrom = 4;     // the integrity code leaves out the RMCP header
constexpr std::size_t kTrailerFields = 2;  // length of the padding, next header
constexpr std::uint8_t kRmcpPlus = 0x06;   // authentication type of IPMI 2.0
constexpr std::uint8_t kNextHeader = 0x07;
constexpr std::uint8_t kEncrypted = 0x80;
constexpr std::uint8_t kAuthenticated = 0x40;
constexpr std::uint8_t kIpmi20Data = 0x80;  // asks for the extended capabilities
constexpr std::uint8_t kConsoleAddress = 0x81;
constexpr std::uint8_t kLookupByNameOnly = 0x10;
constexpr std::size_t kMaxUserName = 16;
constexpr std::size_t kMaxKey = 20;

// Payload types, IPMI 2.0, table 13-16.
constexpr std::uint8_t kIpmiPayload = 0x00;
constexpr std::uint8_t kOpenSessionRequest = 0x10;
constexpr std::uint8_t kOpenSessionResponse = 0x11;
constexpr std::uint8_t kRakp1 = 0x12;
constexpr std::uint8_t kRakp2 = 0x13;
constexpr std::uint8_t kRakp3 = 0x14;
constexpr std::uint8_t kRakp4 = 0x15;

Hmac::Digest DigestOf(const CipherSuite& suite) {
    return suite.authentication == kRakpHmacSha1 ? Hmac::Digest::kSha1 : Hmac::Digest::kSha256;
}
/// Of an integrity code, and of the check value of RAKP 4, which is cut alike (13.23, 13.28).
std::size_t CodeLength(const CipherSuite& suite) {
    return suite.authentication == kRakpHmacSha1 ? 12 : 16;
}

ByteView Bytes(const std::string& text) {
    return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

std::uint8_t Checksum(ByteView bytes) {
    unsigned sum = 0;
    for (const std::uint8_t byte : bytes) sum += byte;
    return static_cast<std::uint8_t>(-sum);
}

void AppendHeader(Packet* packet, std::uint8_t payloadType, ByteView sessionId,
                  std::uint32_t sequence, std::size_t payloadLength) {
    packet->U8(0x06).U8(0).U8(0xFF).U8(0x07).U8(kRmcpPlus).U8(payloadType);
    packet->Append(sessionId).U32(sequence);
    packet->U8(payloadLength & 0xFF).U8(payloadLength >> 8);
}

Packet SetupPacket(std::uint8_t payloadType, std::size_t payloadLength) {
    constexpr std::array<std::uint8_t, 4> kNoSession{};
    Packet packet;
    AppendHeader(&packet, payloadType, kNoSession, 0, payloadLength);
    return packet;
}

/// A request in the form that it has on a LAN (13.8).
void AppendMessage(Packet* packet, std::uint8_t netFn, std::uint8_t lun, std::uint8_t rqSeq,
                   std::uint8_t command, ByteView data) {
    const std::uint8_t head[] = {ipmi::kBmcAddress, static_cast<std::uint8_t>(netFn << 2 | lun)};
    const std::uint8_t next[] = {kConsoleAddress, static_cast<std::uint8_t>(rqSeq << 2), command};
    packet->Append(head).U8(Checksum(head));
    const std::size_t from = packet->size();
    packet->Append(next).Append(data);
    packet->U8(Checksum(packet->bytes().subspan(from)));
}
constexpr std::size_t kMessageFrame = 7;  // all of it but the data

/// An answer in that form; empty when it is none, or not to us.
std::optional<Answer> ParseMessage(ByteView message, bool skipChecksums) {
    constexpr std::size_t kLeast = kMessageFrame + 1;  // a completion code
    if (message.size() < kLeast || message[0] != kConsoleAddress) return std::nullopt;
    if (!skipChecksums && (Checksum(message.first(3)) != 0 || Checksum(message.subspan(3)) != 0)) {
        return std::nullopt;
    }
    const auto netFn = static_cast<std::uint8_t>(message[1] >> 2);
    if ((netFn & 1) == 0) return std::nullopt;  // a request
    Answer answer;
    answer.rqSeq = message[4] >> 2;
    answer.command = {static_cast<std::uint8_t>(netFn - 1), message[5]};
    answer.response = message.subspan(6, message.size() - kMessageFrame);
    return answer;
}

bool IsRmcpOfIpmi(ByteView packet) { return packet[0] == 0x06 && packet[3] == 0x07; }

}  // namespace

Packet& Packet::U8(unsigned value) {
    if (size_ < kCapacity) bytes_[size_++] = static_cast<std::uint8_t>(value);
    return *this;
}
Packet& Packet::U32(std::uint32_t value) {
    for (unsigned shift = 0; shift < 32; shift += 8) U8(value >> shift & 0xFF);
    return *this;
}
Packet& Packet::Append(ByteView bytes) {
    const std::size_t count = std::min(bytes.size(), kCapacity - size_);
    std::copy_n(bytes.begin(), count, bytes_.begin() + static_cast<std::ptrdiff_t>(size_));
    size_ += count;
    return *this;
}
Packet& Packet::Fill(std::size_t count, std::uint8_t value) {
    for (; count > 0; --count) U8(value);
    return *this;
}

// --- Before the session -----------------------------------------------------------------------

Packet SessionlessRequest(const ipmi::Command& command, std::uint8_t rqSeq) {
    Packet packet;
    // Authentication type "none", session sequence number and session ID 0.
    packet.U8(0x06).U8(0).U8(0xFF).U8(0x07).Fill(9, 0).U8(
        static_cast<unsigned>(kMessageFrame + command.data.size()));
    AppendMessage(&packet, command.netFn, command.lun, rqSeq, command.command, command.data);
    return packet;
}

std::optional<ByteView> ParseSessionlessAnswer(ByteView packet, std::uint8_t rqSeq,
                                               ipmi::CommandCode command, bool skipChecksums) {
    constexpr std::size_t kHeader15 = 14;  // RMCP header and session header of IPMI 1.5
    if (packet.size() < kHeader15 || !IsRmcpOfIpmi(packet) || packet[4] != 0) return std::nullopt;
    const std::size_t length = packet[kHeader15 - 1];
    if (length > packet.size() - kHeader15) return std::nullopt;
    const auto answer = ParseMessage(packet.subspan(kHeader15, length), skipChecksums);
    if (!answer || answer->rqSeq != rqSeq || answer->command != command) return std::nullopt;
    return answer->response;
}

Packet AuthenticationCapabilitiesRequest(std::uint8_t privilege, std::uint8_t rqSeq) {
    return SessionlessRequest(
        ipmi::MakeCommand(ipmi::kGetChannelAuthenticationCapabilities,
                          {static_cast<std::uint8_t>(kThisChannel | kIpmi20Data), privilege}),
        rqSeq);
}

std::optional<AuthenticationCapabilities> ParseAuthenticationCapabilities(ByteView packet,
                                                                          std::uint8_t rqSeq,
                                                                          bool skipChecksums) {
    const auto response = ParseSessionlessAnswer(
        packet, rqSeq, ipmi::kGetChannelAuthenticationCapabilities, skipChecksums);
    if (!response) return std::nullopt;
    // Completion code, channel, authentication types (bit 7: extended data), status (bit 5: a key
    // of the BMC's own), extended capabilities (bit 1: IPMI 2.0), IPMI 2.0, table 22-15.
    ipmisel::ByteReader in(*response);
    AuthenticationCapabilities found;
    const bool completed = in.U8() == ipmi::kCompleted;
    in.Skip(1);
    const bool extended = (in.U8() & 0x80) != 0;
    found.hasKey = (in.U8() & 0x20) != 0;
    found.ipmi20 = (in.U8() & 0x02) != 0 && in.ok() && completed && extended;
    return found;
}

// --- Opening ----------------------------------------------------------------------------------

Codec::Codec(const Credentials& credentials, const CipherSuite& suite)
    : credentials_(credentials),
      suite_(suite),
      nameLength_(credentials.deviations.paddedUserName && !credentials.user.empty()
                      ? kMaxUserName
                      : std::min(credentials.user.size(), kMaxUserName)),
      keyedByPassword_(DigestOf(suite)) {
    random_.Fill(consoleRandom_);
    random_.Fill(consoleId_);
    consoleId_[0] |= 1;                       // zero means "no session"
    std::array<std::uint8_t, kMaxKey> key{};  // padded with zeros, as HMAC would pad it
    const ByteView password = Bytes(credentials_.password);
    std::copy_n(password.begin(), std::min(password.size(), key.size()), key.begin());
    keyedByPassword_.SetKey(key);
    Wipe(key);
}

Codec::~Codec() { Wipe(plain_); }

/// Role, length of the user name, user name: what several codes are made over (13.31).
std::array<std::uint8_t, 18> Codec::Role() const {
    std::array<std::uint8_t, 18> role{};
    role[0] = static_cast<std::uint8_t>(credentials_.privilege | kLookupByNameOnly);
    role[1] = static_cast<std::uint8_t>(nameLength_);
    const ByteView name = Bytes(credentials_.user);
    std::copy_n(name.begin(), std::min(name.size(), kMaxUserName), role.begin() + 2);
    return role;
}
ByteView Codec::RoleBytes(const std::array<std::uint8_t, 18>& role) const {
    return ByteView(role).first(2 + nameLength_);
}

/// Of a packet outside a session; empty for another one.
std::optional<ByteView> Codec::PayloadOf(ByteView packet, std::uint8_t type) const {
    if (packet.size() < kHeaderLength || !IsRmcpOfIpmi(packet) || packet[4] != kRmcpPlus ||
        packet[5] != type) {
        return std::nullopt;
    }
    std::size_t length = packet[14] | static_cast<std::size_t>(packet[15]) << 8;
    const std::size_t there = packet.size() - kHeaderLength;
    if (credentials_.deviations.longRakp2Code && length == there + 1) length = there;
    if (length > there) return std::nullopt;
    return packet.subspan(kHeaderLength, length);
}

/// Message tag, status, two more bytes, our session ID, which a refusal need not have (13.18 ff.).
Check Codec::ParseHeader(ByteView payload, std::uint8_t tag, std::size_t wholeLength) {
    if (payload.size() < 2 || payload[0] != tag) return Check::kNotOurs;
    status_ = payload[1];
    if (status_ != status::kNoErrors) return Check::kStatus;
    if (payload.size() < 8 || !std::equal(consoleId_.begin(), consoleId_.end(), &payload[4])) {
        return Check::kNotOurs;
    }
    return payload.size() < wholeLength ? Check::kForged : Check::kGood;
}

Packet Codec::OpenSessionRequest(std::uint8_t tag) {
    constexpr std::size_t kLength = 32;
    Packet packet = SetupPacket(kOpenSessionRequest, kLength);
    packet.U8(tag).U8(credentials_.privilege).Fill(2, 0).Append(consoleId_);
    // One algorithm of each kind: type of the payload, its length 8, the algorithm.
    const std::uint8_t algorithms[] = {suite_.authentication, suite_.integrity,
                                       suite_.confidentiality};
    std::uint8_t kind = 0;
    for (const std::uint8_t algorithm : algorithms) {
        packet.U8(kind++).Fill(2, 0).U8(8).U8(algorithm).Fill(3, 0);
    }
    return packet;
}

Check Codec::ParseOpenSession(ByteView packet, std::uint8_t tag) {
    const auto payload = PayloadOf(packet, kOpenSessionResponse);
    if (!payload) return Check::kNotOurs;
    constexpr std::size_t kLength = 36;
    const Check check = ParseHeader(*payload, tag, kLength);
    if (check != Check::kGood) return check;
    std::copy_n(&(*payload)[8], managedId_.size(), managedId_.begin());
    constexpr std::size_t kAuthenticationAt = 16, kIntegrityAt = 24, kConfidentialityAt = 32;
    constexpr std::uint8_t kAlgorithm = 0x3F;
    const bool sameSuite = ((*payload)[kAuthenticationAt] & kAlgorithm) == suite_.authentication &&
                           ((*payload)[kIntegrityAt] & kAlgorithm) == suite_.integrity &&
                           ((*payload)[kConfidentialityAt] & kAlgorithm) == suite_.confidentiality;
    const bool hasId = managedId_ != std::array<std::uint8_t, 4>{};
    if (!sameSuite || !hasId) return Check::kForged;
    const unsigned granted = (*payload)[2] & 0x0F;
    if (granted < credentials_.privilege && !credentials_.deviations.openSessionPrivilege) {
        status_ = status::kUnauthorizedRole;
        return Check::kStatus;
    }
    return Check::kGood;
}

Packet Codec::Rakp1(std::uint8_t tag) {
    const auto role = Role();
    Packet packet = SetupPacket(kRakp1, 28 + nameLength_);
    packet.U8(tag).Fill(3, 0).Append(managedId_).Append(consoleRandom_);
    packet.U8(role[0]).Fill(2, 0).Append(RoleBytes(role).subspan(1));
    return packet;
}

Check Codec::ParseRakp2(ByteView packet, std::uint8_t tag) {
    const auto payload = PayloadOf(packet, kRakp2);
    if (!payload) return Check::kNotOurs;
    constexpr std::size_t kRandomAt = 8, kGuidAt = 24, kCodeAt = 40;
    const Check check = ParseHeader(*payload, tag, kCodeAt);
    if (check != Check::kGood) return check;
    std::copy_n(&(*payload)[kRandomAt], managedRandom_.size(), managedRandom_.begin());
    std::copy_n(&(*payload)[kGuidAt], guid_.size(), guid_.begin());
    const auto role = Role();
    const Hmac::Code code = keyedByPassword_.Compute(
        {consoleId_, managedId_, consoleRandom_, managedRandom_, guid_, RoleBytes(role)});
    ByteView sent = payload->subspan(kCodeAt);
    if (credentials_.deviations.longRakp2Code && sent.size() == keyedByPassword_.length() + 1) {
        sent = sent.first(keyedByPassword_.length());
    }
    return EqualInConstantTime(sent, ByteView(code).first(keyedByPassword_.length()))
               ? Check::kGood
               : Check::kForged;
}

Packet Codec::Rakp3(std::uint8_t tag) {
    auto role = Role();
    std::size_t nameLength = nameLength_;
    if (credentials_.deviations.paddedUserName) {
        nameLength = std::min(credentials_.user.size(), kMaxUserName);
        role[0] = credentials_.privilege;
        role[1] = static_cast<std::uint8_t>(nameLength);
    }
    const Hmac::Code code = keyedByPassword_.Compute(
        {managedRandom_, consoleId_, ByteView(role).first(2 + nameLength)});
    Packet packet = SetupPacket(kRakp3, 8 + keyedByPassword_.length());
    packet.U8(tag).U8(status::kNoErrors).Fill(2, 0).Append(managedId_);
    packet.Append(ByteView(code).first(keyedByPassword_.length()));
    ComputeKeys();
    return packet;
}

/// 13.31, 13.32: the session integrity key by the BMC's key or, without one, the password; from it
/// K1 for integrity and K2 for confidentiality.
void Codec::ComputeKeys() {
    const auto role = Role();
    const std::initializer_list<ByteView> over = {consoleRandom_, managedRandom_, RoleBytes(role)};
    Hmac sessionKey(DigestOf(suite_));
    const std::size_t length = sessionKey.length();
    Hmac::Code sik;
    if (credentials_.kg.empty()) {
        // A repeated RAKP 3 is made again, from the password that is still the key then.
        sik = keyedByPassword_.Compute(over);
    } else {
        sessionKey.SetKey(credentials_.kg);
        sik = sessionKey.Compute(over);
    }
    sessionKey.SetKey(ByteView(sik).first(length));
    Wipe(sik);
    std::array<std::uint8_t, 20> constant;
    if (suite_.integrity != kNoIntegrity) {
        constant.fill(1);
        Hmac::Code k1 = sessionKey.Compute({constant});
        integrity_.emplace(DigestOf(suite_));
        integrity_->SetKey(ByteView(k1).first(length));
        Wipe(k1);
    }
    if (suite_.confidentiality != kNoConfidentiality) {
        constant.fill(2);
        Hmac::Code k2 = sessionKey.Compute({constant});
        AesCbc::Block key;
        std::copy_n(k2.begin(), key.size(), key.begin());
        confidentiality_.emplace(key);
        Wipe(k2);
        Wipe(key);
    }
    rakp4Code_ = sessionKey.Compute({consoleRandom_, managedId_, guid_});
}

Check Codec::ParseRakp4(ByteView packet, std::uint8_t tag) {
    const auto payload = PayloadOf(packet, kRakp4);
    if (!payload) return Check::kNotOurs;
    constexpr std::size_t kCodeAt = 8;
    const Check check = ParseHeader(*payload, tag, kCodeAt);
    if (check != Check::kGood) return check;
    const bool byIntegrity = credentials_.deviations.paddedUserName;
    const std::size_t length =
        byIntegrity && suite_.integrity == kNoIntegrity ? 0 : CodeLength(suite_);
    return EqualInConstantTime(payload->subspan(kCodeAt), ByteView(rakp4Code_).first(length))
               ? Check::kGood
               : Check::kForged;
}

// --- Inside the session -----------------------------------------------------------------------

void Codec::WriteRequest(std::uint32_t sequence, std::uint8_t rqSeq, const ipmi::Command& command,
                         Packet* packet) {
    packet->Clear();
    const std::size_t message = kMessageFrame + command.data.size();
    std::uint8_t type = kIpmiPayload;
    std::size_t payloadLength = message;
    std::size_t padding = 0;
    if (confidentiality_) {
        type |= kEncrypted;
        // Message, padding, its length: whole blocks, behind an initial vector (13.29).
        padding = AesCbc::kBlock - 1 - message % AesCbc::kBlock;
        payloadLength = AesCbc::kBlock + message + padding + 1;
    }
    if (integrity_) type |= kAuthenticated;
    AppendHeader(packet, type, managedId_, sequence, payloadLength);
    AesCbc::Block initial;
    if (confidentiality_) {
        random_.Fill(initial);
        packet->Append(initial);
    }
    const std::size_t from = packet->size();
    AppendMessage(packet, command.netFn, command.lun, rqSeq, command.command, command.data);
    if (confidentiality_) {
        for (std::size_t i = 1; i <= padding; ++i) packet->U8(static_cast<unsigned>(i));
        packet->U8(static_cast<unsigned>(padding));
        const auto blocks = packet->bytes().subspan(from);
        confidentiality_->Encrypt(initial, blocks, blocks);
    }
    if (!integrity_) return;
    const std::size_t covered = packet->size() - kSignedFrom + kTrailerFields;
    const std::size_t missing = (4 - covered % 4) % 4;
    packet->Fill(missing, 0xFF).U8(static_cast<unsigned>(missing)).U8(kNextHeader);
    const Hmac::Code code = integrity_->Compute({packet->bytes().subspan(kSignedFrom)});
    packet->Append(ByteView(code).first(CodeLength(suite_)));
}

Packet Codec::CloseRequest(std::uint32_t sequence, std::uint8_t rqSeq) {
    Packet packet;
    WriteRequest(sequence, rqSeq,
                 ipmi::MakeCommand(ipmi::kCloseSession, {managedId_.begin(), managedId_.end()}),
                 &packet);
    return packet;
}

/// The payload of a packet whose integrity code is right.
std::optional<ByteView> Codec::Authenticated(ByteView packet, std::size_t payloadLength) {
    const std::size_t code = CodeLength(suite_);
    if (packet.size() < kHeaderLength + payloadLength + kTrailerFields + code) return std::nullopt;
    const ByteView covered = packet.subspan(kSignedFrom, packet.size() - kSignedFrom - code);
    const Hmac::Code expected = integrity_->Compute({covered});
    if (!EqualInConstantTime(packet.last(code), ByteView(expected).first(code))) {
        return std::nullopt;
    }
    // The payload, its padding, the length of that, and the next header fill it exactly.
    const std::size_t padding = covered[covered.size() - kTrailerFields];
    const std::size_t fields = kHeaderLength - kSignedFrom + padding + kTrailerFields;
    if (covered.size() != fields + payloadLength) return std::nullopt;
    return packet.subspan(kHeaderLength, payloadLength);
}

std::optional<ByteView> Codec::Decrypted(ByteView payload) {
    constexpr std::size_t kBlock = AesCbc::kBlock;
    if (payload.size() < 2 * kBlock || payload.size() % kBlock != 0) return std::nullopt;
    const auto initial = payload.first<kBlock>();
    const std::span<std::uint8_t> plain = std::span(plain_).first(payload.size() - kBlock);
    confidentiality_->Decrypt(initial, payload.subspan(kBlock), plain);
    const std::size_t padding = plain.back();
    if (padding >= kBlock) return std::nullopt;
    return plain.first(plain.size() - 1 - padding);
}

std::optional<Answer> Codec::ParseAnswer(ByteView packet) {
    if (packet.size() < kHeaderLength || packet.size() > kMaxAnswer || !IsRmcpOfIpmi(packet) ||
        packet[4] != kRmcpPlus) {
        return std::nullopt;
    }
    // A packet that claims to be less protected than its session is nobody's answer.
    const unsigned type =
        kIpmiPayload | (confidentiality_ ? kEncrypted : 0) | (integrity_ ? kAuthenticated : 0);
    if (packet[5] != type || !std::equal(consoleId_.begin(), consoleId_.end(), &packet[6])) {
        return std::nullopt;
    }
    ipmisel::ByteReader in(packet.subspan(10));
    const std::uint32_t sequence = in.U32();
    const std::size_t length = in.U16();
    if (length > packet.size() - kHeaderLength) return std::nullopt;
    std::optional<ByteView> payload = packet.subspan(kHeaderLength, length);
    if (integrity_) payload = Authenticated(packet, length);
    if (payload && confidentiality_) payload = Decrypted(*payload);
    if (!payload) return std::nullopt;
    auto answer = ParseMessage(*payload, credentials_.deviations.checksums);
    if (answer) answer->sequence = sequence;
    return answer;
}

}  // namespace tqrhost::rmcpplus
