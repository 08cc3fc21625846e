#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "host/spdriver/source.h"

// The packets of an RMCP+ session (IPMI 2.0, chapter 13), built and taken apart with libfreeipmi,
// which also does the cryptography. No sockets and no time here: bytes in, bytes out.

namespace tqrhost::rmcpplus {

using Packet = std::vector<std::uint8_t>;

/// A cipher suite by its number (IPMI 2.0, table 22-20) and its algorithm numbers.
struct CipherSuite {
    int id;
    std::uint8_t authentication;
    std::uint8_t integrity;
    std::uint8_t confidentiality;
};
/// Null for a suite that is not supported here.
const CipherSuite* FindCipherSuite(int id);

/// Who opens a session, and as what.
struct Credentials {
    std::string user;
    std::string password;          ///< at most 20 bytes
    std::vector<std::uint8_t> kg;  ///< key of the BMC; empty: the password serves
    std::uint8_t privilege = 4;    ///< IPMI 2.0, table 22-19: 2 user, 3 operator, 4 administrator
    bool nameOnlyLookup = true;
    /// Workaround: ask for the highest privilege in Open Session, where a BMC answers it wrongly.
    bool openSessionPrivilege = false;
    /// Workaround: believe the session although the answer to RAKP 3 carries no check value.
    bool acceptNoCheckValue = false;
};

struct AuthenticationCapabilities {
    bool ipmi20 = false;
    bool twoKeys = false;  ///< a Kg key other than zeros is set
    bool userNames = false;
    bool nullUser = false;
};

struct OpenSessionResponse {
    std::uint8_t status = 0;
    std::uint8_t privilege = 0;
    std::uint32_t managedSystemId = 0;
    std::uint8_t authentication = 0, integrity = 0, confidentiality = 0;
};

/// The answer to an IPMI request inside a session.
struct Answer {
    std::uint32_t sequence = 0;  ///< session sequence number of the packet
    std::uint8_t rqSeq = 0;
    std::uint8_t netFn = 0;  ///< of the request
    std::uint8_t command = 0;
    Response response;
};

/// What came of a RAKP answer.
enum class Check {
    kNotOurs,  ///< another packet, another message tag: wait on
    kStatus,   ///< the BMC refuses with a status; see LastStatus()
    kForged,   ///< the check value is wrong: the password is, or somebody else answers
    kGood,
};

/// One session's keys and numbers, and its packets. Not copied: it holds keys.
class Codec {
public:
    explicit Codec(Credentials credentials);
    ~Codec();
    Codec(const Codec&) = delete;
    Codec& operator=(const Codec&) = delete;

    /// A new attempt: fresh session ID and random number, no keys.
    void Begin(const CipherSuite& suite);

    Packet AuthenticationCapabilitiesRequest(std::uint8_t rqSeq);
    std::optional<AuthenticationCapabilities> ParseAuthenticationCapabilities(
        std::span<const std::uint8_t> packet, std::uint8_t rqSeq);

    Packet OpenSessionRequest(std::uint8_t tag);
    /// Keeps the BMC's session ID and the algorithms. Forged: it names other algorithms than were
    /// asked for.
    Check ParseOpenSession(std::span<const std::uint8_t> packet, std::uint8_t tag);
    Packet Rakp1(std::uint8_t tag);
    Check ParseRakp2(std::span<const std::uint8_t> packet, std::uint8_t tag);
    Packet Rakp3(std::uint8_t tag);
    /// Good: the session is open and its keys stand.
    Check ParseRakp4(std::span<const std::uint8_t> packet, std::uint8_t tag);
    /// RMCP+ status code of the last answer that refused (IPMI 2.0, table 13-15).
    std::uint8_t LastStatus() const { return status_; }

    Packet Request(std::uint32_t sequence, std::uint8_t rqSeq, std::uint8_t netFn, std::uint8_t lun,
                   std::uint8_t command, std::span<const std::uint8_t> data);
    /// Empty for every packet that is not an answer of this session with the right integrity code
    /// and checksums. Replays are the caller's: see Answer::sequence.
    std::optional<Answer> ParseAnswer(std::span<const std::uint8_t> packet);

    std::uint32_t ManagedSystemId() const { return managedSystemId_; }
    std::uint8_t Privilege() const { return credentials_.privilege; }

private:
    struct Objects;  // libfreeipmi's packet objects, made once

    Packet Setup(std::uint8_t payloadType, void* command);
    bool ParseSetup(std::span<const std::uint8_t> packet, std::uint8_t payloadType, void* command);
    bool ComputeKeys();

    Credentials credentials_;
    CipherSuite suite_{};
    std::unique_ptr<Objects> objects_;
    std::uint32_t consoleId_ = 0;
    std::uint32_t managedSystemId_ = 0;
    std::array<std::uint8_t, 16> consoleRandom_{};
    std::array<std::uint8_t, 16> managedRandom_{};
    std::array<std::uint8_t, 16> guid_{};
    std::vector<std::uint8_t> sik_;
    std::vector<std::uint8_t> integrityKey_;
    std::vector<std::uint8_t> confidentialityKey_;
    std::uint8_t status_ = 0;
};

}  // namespace tqrhost::rmcpplus
