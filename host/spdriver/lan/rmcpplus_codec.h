#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "host/spdriver/access.h"
#include "host/spdriver/lan/cipher_suites.h"
#include "host/spdriver/lan/crypto.h"
#include "ipmi/command.h"

// The packets of an RMCP+ session (IPMI 2.0, chapter 13), built and taken apart. No sockets and no
// time here: bytes in, bytes out.
//
// A packet of a session: RMCP header (06 00 FF 07), authentication type 06, payload type with the
// bits "encrypted" and "authenticated", session ID, session sequence number, payload length; the
// payload, which is initial vector and blocks of AES where it is encrypted; and where it is
// authenticated, padding to a multiple of four bytes, its length, 07, and the integrity code over
// everything from the authentication type on.

namespace tqrhost::rmcpplus {

using NQORTQR20::Deviations;

/// A packet to be sent, in a room of its own.
class Packet {
public:
    static constexpr std::size_t kCapacity = 352;

    std::span<const std::uint8_t> bytes() const { return std::span(bytes_).first(size_); }
    std::span<std::uint8_t> bytes() { return std::span(bytes_).first(size_); }
    std::size_t size() const { return size_; }
    void Clear() { size_ = 0; }

    /// What would go past the end is left out; nothing that is built here does.
    Packet& U8(unsigned value);
    Packet& U32(std::uint32_t value);
    Packet& Append(ByteView bytes);
    Packet& Fill(std::size_t count, std::uint8_t value);

private:
    std::array<std::uint8_t, kCapacity> bytes_;
    std::size_t size_ = 0;
};

/// Who opens a session, and as what.
struct Credentials {
    std::string user;              ///< at most 16 bytes
    std::string password;          ///< at most 20 bytes
    std::vector<std::uint8_t> kg;  ///< key of the BMC; empty: the password serves
    std::uint8_t privilege = 4;    ///< IPMI 2.0, table 22-19: 2 user, 3 operator, 4 administrator
    Deviations deviations{};
};

/// The channel that a request came in by (IPMI 2.0, 22.13).
constexpr std::uint8_t kThisChannel = 0x0E;

struct AuthenticationCapabilities {
    bool ipmi20 = false;
    bool hasKey = false;  ///< the BMC has a key of its own (Kg)
};

/// The answer to an IPMI request inside a session.
struct Answer {
    std::uint32_t sequence = 0;  ///< session sequence number of the packet
    std::uint8_t rqSeq = 0;
    ipmi::CommandCode command;  ///< of the request
    ByteView response;          ///< from the completion code on; until the next packet is parsed
};

/// What came of an answer while a session is opened.
enum class Check {
    kNotOurs,  ///< another packet, another message tag: wait on
    kStatus,   ///< the BMC refuses with a status; see LastStatus()
    kForged,   ///< the check value is wrong: the password is, or somebody else answers
    kGood,
};

/// RMCP+ status codes, IPMI 2.0, table 13-15.
namespace status {
constexpr std::uint8_t kNoErrors = 0x00;
constexpr std::uint8_t kNoResources = 0x01;
constexpr std::uint8_t kInvalidSessionId = 0x02;
constexpr std::uint8_t kInvalidAuthenticationAlgorithm = 0x04;
constexpr std::uint8_t kInvalidIntegrityAlgorithm = 0x05;
constexpr std::uint8_t kNoMatchingAuthenticationPayload = 0x06;
constexpr std::uint8_t kNoMatchingIntegrityPayload = 0x07;
constexpr std::uint8_t kInactiveSessionId = 0x08;
constexpr std::uint8_t kInvalidRole = 0x09;
constexpr std::uint8_t kUnauthorizedRole = 0x0A;
constexpr std::uint8_t kNoResourcesForRole = 0x0B;
constexpr std::uint8_t kInvalidNameLength = 0x0C;
constexpr std::uint8_t kUnauthorizedName = 0x0D;
constexpr std::uint8_t kInvalidIntegrityCheckValue = 0x0F;
constexpr std::uint8_t kInvalidConfidentialityAlgorithm = 0x10;
constexpr std::uint8_t kNoCipherSuiteMatch = 0x11;
}  // namespace status

/// A command in a packet of IPMI 1.5 without a session, with little data. `rqSeq` has six bits.
Packet SessionlessRequest(const ipmi::Command& command, std::uint8_t rqSeq);
/// From the completion code on, within the packet; empty for every other packet.
std::optional<ByteView> ParseSessionlessAnswer(ByteView packet, std::uint8_t rqSeq,
                                               ipmi::CommandCode command, bool skipChecksums);

/// Get Channel Authentication Capabilities in a packet of IPMI 1.5, which wants no session and no
/// cryptography. `rqSeq` has six bits.
Packet AuthenticationCapabilitiesRequest(std::uint8_t privilege, std::uint8_t rqSeq);
/// Empty for every other packet.
std::optional<AuthenticationCapabilities> ParseAuthenticationCapabilities(ByteView packet,
                                                                          std::uint8_t rqSeq,
                                                                          bool skipChecksums);

/// One attempt at a session and, when it succeeds, the session: its keys and numbers, and its
/// packets.
class Codec {
public:
    /// Request data that fit into a packet.
    static constexpr std::size_t kMaxRequestData = 255;
    /// Longer packets are nobody's answer.
    static constexpr std::size_t kMaxAnswer = 1024;

    /// The credentials are borrowed. Fresh session ID and random number, no keys. Throws
    /// CryptoError, as every other operation here may.
    Codec(const Credentials& credentials, const CipherSuite& suite);
    ~Codec();
    Codec(const Codec&) = delete;
    Codec& operator=(const Codec&) = delete;

    Packet OpenSessionRequest(std::uint8_t tag);
    /// Keeps the BMC's session ID. Forged: it names other algorithms than were asked for.
    Check ParseOpenSession(ByteView packet, std::uint8_t tag);
    Packet Rakp1(std::uint8_t tag);
    Check ParseRakp2(ByteView packet, std::uint8_t tag);
    Packet Rakp3(std::uint8_t tag);
    /// Good: the session is open and its keys stand.
    Check ParseRakp4(ByteView packet, std::uint8_t tag);
    /// RMCP+ status code of the last answer that refused.
    std::uint8_t LastStatus() const { return status_; }

    /// The command has at most kMaxRequestData bytes of data.
    void WriteRequest(std::uint32_t sequence, std::uint8_t rqSeq, const ipmi::Command& command,
                      Packet* packet);
    Packet CloseRequest(std::uint32_t sequence, std::uint8_t rqSeq);
    /// Empty for every packet that is not an answer of this session with the right integrity code
    /// and checksums. Replays are the caller's: see Answer::sequence.
    std::optional<Answer> ParseAnswer(ByteView packet);

private:
    std::array<std::uint8_t, 18> Role() const;
    ByteView RoleBytes(const std::array<std::uint8_t, 18>& role) const;
    std::optional<ByteView> PayloadOf(ByteView packet, std::uint8_t type) const;
    Check ParseHeader(ByteView payload, std::uint8_t tag, std::size_t wholeLength);
    void ComputeKeys();
    std::optional<ByteView> Authenticated(ByteView packet, std::size_t payloadLength);
    std::optional<ByteView> Decrypted(ByteView payload);

    const Credentials& credentials_;
    CipherSuite suite_;
    std::size_t nameLength_;  ///< of the user name as it is sent
    RandomSource random_;
    Hmac keyedByPassword_;  ///< Kuid
    std::optional<Hmac> integrity_;
    std::optional<AesCbc> confidentiality_;
    std::array<std::uint8_t, 4> consoleId_{};
    std::array<std::uint8_t, 4> managedId_{};
    std::array<std::uint8_t, 16> consoleRandom_{};
    std::array<std::uint8_t, 16> managedRandom_{};
    std::array<std::uint8_t, 16> guid_{};
    Hmac::Code rakp4Code_{};  ///< what RAKP 4 is to carry
    std::array<std::uint8_t, kMaxAnswer> plain_;
    std::uint8_t status_ = 0;
};

}  // namespace tqrhost::rmcpplus
