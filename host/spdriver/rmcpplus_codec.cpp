#include "host/spdriver/rmcpplus_codec.h"

#include <freeipmi/freeipmi.h>
#include <sys/random.h>

#include <algorithm>
#include <stdexcept>

namespace tqrhost::rmcpplus {
namespace {

constexpr unsigned kFlags = IPMI_INTERFACE_FLAGS_DEFAULT;
constexpr std::uint8_t kBmcAddress = 0x20;
constexpr std::uint8_t kThisChannel = 0x0E;
constexpr std::size_t kLargestPacket = 1024;
constexpr std::size_t kKeyRoom = 64;

constexpr CipherSuite kCipherSuites[] = {
    {3, 1, 1, 1},   // HMAC-SHA1, HMAC-SHA1-96, AES-CBC-128
    {8, 2, 2, 1},   // HMAC-MD5, HMAC-MD5-128, AES-CBC-128
    {12, 2, 3, 1},  // HMAC-MD5, MD5-128, AES-CBC-128
    {15, 3, 0, 0},  // HMAC-SHA256
    {16, 3, 4, 0},  // HMAC-SHA256, HMAC-SHA256-128
    {17, 3, 4, 1},  // HMAC-SHA256, HMAC-SHA256-128, AES-CBC-128
};

// A request or response of any command: its number, its completion code, the rest.
fiid_field_t kCommandTemplate[] = {
    {8 * 300, "bytes", FIID_FIELD_OPTIONAL | FIID_FIELD_LENGTH_VARIABLE}, {0, "", 0}};

/// One packet object of libfreeipmi.
class Fiid {
public:
    explicit Fiid(fiid_field_t* fields) : object_(fiid_obj_create(fields)) {
        if (object_ == nullptr) throw std::bad_alloc();
    }
    ~Fiid() { fiid_obj_destroy(object_); }
    Fiid(const Fiid&) = delete;
    Fiid& operator=(const Fiid&) = delete;

    operator fiid_obj_t() const { return object_; }
    std::uint64_t Get(const char* field) const {
        std::uint64_t value = 0;
        if (fiid_obj_get(object_, field, &value) <= 0) return 0;
        return value;
    }
    bool Has(const char* field, unsigned bytes) const {
        return fiid_obj_field_len_bytes(object_, field) >= static_cast<int>(bytes);
    }
    template <std::size_t N>
    bool GetBytes(const char* field, std::array<std::uint8_t, N>* bytes) const {
        return fiid_obj_get_data(object_, field, bytes->data(), N) == static_cast<int>(N);
    }
    std::vector<std::uint8_t> All() const {
        std::array<std::uint8_t, kLargestPacket> room;
        const int length = fiid_obj_get_all(object_, room.data(), room.size());
        if (length <= 0) return {};
        return {room.begin(), room.begin() + length};
    }

private:
    fiid_obj_t object_;
};

const void* OrNull(const std::vector<std::uint8_t>& bytes) {
    return bytes.empty() ? nullptr : bytes.data();
}
unsigned Length(const std::vector<std::uint8_t>& bytes) {
    return static_cast<unsigned>(bytes.size());
}
const char* OrNull(const std::string& text) { return text.empty() ? nullptr : text.c_str(); }
unsigned Length(const std::string& text) { return static_cast<unsigned>(text.size()); }

}  // namespace

struct Codec::Objects {
    Fiid rmcpHeader{tmpl_rmcp_hdr};
    Fiid lanSessionHeader{tmpl_lan_session_hdr};
    Fiid sessionHeader{tmpl_rmcpplus_session_hdr};
    Fiid sessionTrailer{tmpl_rmcpplus_session_trlr};
    Fiid payload{tmpl_rmcpplus_payload};
    Fiid messageRequest{tmpl_lan_msg_hdr_rq};
    Fiid messageResponse{tmpl_lan_msg_hdr_rs};
    Fiid messageTrailer{tmpl_lan_msg_trlr};
    Fiid command{kCommandTemplate};
    Fiid capabilitiesRequest{tmpl_cmd_get_channel_authentication_capabilities_rq};
    Fiid capabilitiesResponse{tmpl_cmd_get_channel_authentication_capabilities_rs};
    Fiid openRequest{tmpl_rmcpplus_open_session_request};
    Fiid openResponse{tmpl_rmcpplus_open_session_response};
    Fiid rakp1{tmpl_rmcpplus_rakp_message_1};
    Fiid rakp2{tmpl_rmcpplus_rakp_message_2};
    Fiid rakp3{tmpl_rmcpplus_rakp_message_3};
    Fiid rakp4{tmpl_rmcpplus_rakp_message_4};
};

const CipherSuite* FindCipherSuite(int id) {
    const auto* const found =
        std::find_if(std::begin(kCipherSuites), std::end(kCipherSuites),
                     [id](const CipherSuite& suite) { return suite.id == id; });
    return found == std::end(kCipherSuites) ? nullptr : found;
}

Codec::Codec(Credentials credentials)
    : credentials_(std::move(credentials)), objects_(std::make_unique<Objects>()) {
    if (ipmi_rmcpplus_init() < 0) throw SourceError("the crypto library cannot be initialised");
}

Codec::~Codec() = default;

void Codec::Begin(const CipherSuite& suite) {
    suite_ = suite;
    managedSystemId_ = 0;
    sik_.clear();
    integrityKey_.clear();
    confidentialityKey_.clear();
    status_ = 0;
    struct {
        std::array<std::uint8_t, 16> random;
        std::uint32_t id;
    } fresh;
    if (getrandom(&fresh, sizeof fresh, 0) != sizeof fresh) {
        throw SourceError("the system gives no random numbers");
    }
    consoleRandom_ = fresh.random;
    consoleId_ = fresh.id | 1;  // zero means "no session"
}

Packet Codec::AuthenticationCapabilitiesRequest(std::uint8_t rqSeq) {
    Objects& o = *objects_;
    Packet packet(kLargestPacket);
    if (fill_rmcp_hdr_ipmi(o.rmcpHeader) < 0 ||
        fill_lan_session_hdr(IPMI_AUTHENTICATION_TYPE_NONE, 0, 0, o.lanSessionHeader) < 0 ||
        fill_lan_msg_hdr(kBmcAddress, IPMI_NET_FN_APP_RQ, 0, rqSeq, o.messageRequest) < 0 ||
        fill_cmd_get_channel_authentication_capabilities(kThisChannel, credentials_.privilege, 1,
                                                         o.capabilitiesRequest) < 0) {
        return {};
    }
    const int length = assemble_ipmi_lan_pkt(o.rmcpHeader, o.lanSessionHeader, o.messageRequest,
                                             o.capabilitiesRequest, nullptr, 0, packet.data(),
                                             kLargestPacket, kFlags);
    packet.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    return packet;
}

std::optional<AuthenticationCapabilities> Codec::ParseAuthenticationCapabilities(
    std::span<const std::uint8_t> packet, std::uint8_t rqSeq) {
    Objects& o = *objects_;
    if (unassemble_ipmi_lan_pkt(packet.data(), static_cast<unsigned>(packet.size()), o.rmcpHeader,
                                o.lanSessionHeader, o.messageResponse, o.capabilitiesResponse,
                                o.messageTrailer, kFlags) != 1 ||
        ipmi_lan_check_checksum(o.messageResponse, o.capabilitiesResponse, o.messageTrailer) != 1 ||
        o.messageResponse.Get("rq_seq") != rqSeq ||
        o.capabilitiesResponse.Get("cmd") != IPMI_CMD_GET_CHANNEL_AUTHENTICATION_CAPABILITIES ||
        !o.capabilitiesResponse.Has("comp_code", 1)) {
        return std::nullopt;
    }
    AuthenticationCapabilities found;
    const Fiid& answer = o.capabilitiesResponse;
    if (answer.Get("comp_code") != 0) return found;
    found.ipmi20 = answer.Get("authentication_type.ipmi_v2.0_extended_capabilities_available") &&
                   answer.Get("channel_supports_ipmi_v2.0_connections");
    found.twoKeys = answer.Get("authentication_status.k_g") != 0;
    found.userNames = answer.Get("authentication_status.non_null_username") != 0;
    found.nullUser = answer.Get("authentication_status.null_username") != 0;
    return found;
}

Packet Codec::Setup(std::uint8_t payloadType, void* command) {
    Objects& o = *objects_;
    Packet packet(kLargestPacket);
    if (fill_rmcp_hdr_ipmi(o.rmcpHeader) < 0 ||
        fill_rmcpplus_session_hdr(payloadType, 0, 0, 0, 0, 0, 0, o.sessionHeader) < 0 ||
        fill_rmcpplus_session_trlr(o.sessionTrailer) < 0) {
        return {};
    }
    const int length = assemble_ipmi_rmcpplus_pkt(
        0, 0, 0, nullptr, 0, nullptr, 0, nullptr, 0, o.rmcpHeader, o.sessionHeader, nullptr,
        static_cast<fiid_obj_t>(command), o.sessionTrailer, packet.data(), kLargestPacket, kFlags);
    packet.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    return packet;
}

bool Codec::ParseSetup(std::span<const std::uint8_t> packet, std::uint8_t payloadType,
                       void* command) {
    Objects& o = *objects_;
    return unassemble_ipmi_rmcpplus_pkt(
               0, 0, 0, nullptr, 0, nullptr, 0, packet.data(), static_cast<unsigned>(packet.size()),
               o.rmcpHeader, o.sessionHeader, o.payload, o.messageResponse,
               static_cast<fiid_obj_t>(command), o.messageTrailer, o.sessionTrailer, kFlags) >= 0 &&
           ipmi_rmcpplus_check_payload_type(o.sessionHeader, payloadType) == 1;
}

Packet Codec::OpenSessionRequest(std::uint8_t tag) {
    if (fill_rmcpplus_open_session(tag, credentials_.privilege, consoleId_, suite_.authentication,
                                   suite_.integrity, suite_.confidentiality,
                                   objects_->openRequest) < 0) {
        return {};
    }
    return Setup(IPMI_PAYLOAD_TYPE_RMCPPLUS_OPEN_SESSION_REQUEST, objects_->openRequest);
}

Check Codec::ParseOpenSession(std::span<const std::uint8_t> packet, std::uint8_t tag) {
    const Fiid& answer = objects_->openResponse;
    if (!ParseSetup(packet, IPMI_PAYLOAD_TYPE_RMCPPLUS_OPEN_SESSION_RESPONSE, answer) ||
        !answer.Has("rmcpplus_status_code", 1) || answer.Get("message_tag") != tag) {
        return Check::kNotOurs;
    }
    status_ = static_cast<std::uint8_t>(answer.Get("rmcpplus_status_code"));
    if (status_ != RMCPPLUS_STATUS_NO_ERRORS) return Check::kStatus;
    if (answer.Get("remote_console_session_id") != consoleId_ ||
        !answer.Has("managed_system_session_id", 4)) {
        return Check::kNotOurs;
    }
    managedSystemId_ = static_cast<std::uint32_t>(answer.Get("managed_system_session_id"));
    const bool sameSuite =
        answer.Get("authentication_payload.authentication_algorithm") == suite_.authentication &&
        answer.Get("integrity_payload.integrity_algorithm") == suite_.integrity &&
        answer.Get("confidentiality_payload.confidentiality_algorithm") == suite_.confidentiality;
    if (!sameSuite || managedSystemId_ == 0) return Check::kForged;
    if (answer.Get("maximum_privilege_level") < credentials_.privilege &&
        !credentials_.openSessionPrivilege) {
        status_ = RMCPPLUS_STATUS_UNAUTHORIZED_ROLE_OR_PRIVILEGE_LEVEL_REQUESTED;
        return Check::kStatus;
    }
    return Check::kGood;
}

Packet Codec::Rakp1(std::uint8_t tag) {
    if (fill_rmcpplus_rakp_message_1(tag, managedSystemId_, consoleRandom_.data(),
                                     consoleRandom_.size(), credentials_.privilege,
                                     credentials_.nameOnlyLookup ? 1 : 0, OrNull(credentials_.user),
                                     Length(credentials_.user), objects_->rakp1) < 0) {
        return {};
    }
    return Setup(IPMI_PAYLOAD_TYPE_RAKP_MESSAGE_1, objects_->rakp1);
}

Check Codec::ParseRakp2(std::span<const std::uint8_t> packet, std::uint8_t tag) {
    const Fiid& answer = objects_->rakp2;
    if (!ParseSetup(packet, IPMI_PAYLOAD_TYPE_RAKP_MESSAGE_2, answer) ||
        !answer.Has("rmcpplus_status_code", 1) || answer.Get("message_tag") != tag) {
        return Check::kNotOurs;
    }
    status_ = static_cast<std::uint8_t>(answer.Get("rmcpplus_status_code"));
    if (status_ != RMCPPLUS_STATUS_NO_ERRORS) return Check::kStatus;
    if (answer.Get("remote_console_session_id") != consoleId_) return Check::kNotOurs;
    if (!answer.GetBytes("managed_system_random_number", &managedRandom_) ||
        !answer.GetBytes("managed_system_guid", &guid_)) {
        return Check::kForged;
    }
    const int good = ipmi_rmcpplus_check_rakp_2_key_exchange_authentication_code(
        suite_.authentication, OrNull(credentials_.password), Length(credentials_.password),
        consoleId_, managedSystemId_, consoleRandom_.data(), consoleRandom_.size(),
        managedRandom_.data(), managedRandom_.size(), guid_.data(), guid_.size(),
        credentials_.nameOnlyLookup ? 1 : 0, credentials_.privilege, OrNull(credentials_.user),
        Length(credentials_.user), answer);
    return good == 1 && ComputeKeys() ? Check::kGood : Check::kForged;
}

bool Codec::ComputeKeys() {
    std::array<std::uint8_t, kKeyRoom> sik{}, integrity{}, confidentiality{};
    // The pointers come back at the keys, which need not lie at the start of the rooms.
    void* sikKey = sik.data();
    void* integrityKey = integrity.data();
    void* confidentialityKey = confidentiality.data();
    unsigned sikLength = kKeyRoom, integrityLength = kKeyRoom, confidentialityLength = kKeyRoom;
    if (ipmi_calculate_rmcpplus_session_keys(
            suite_.authentication, suite_.integrity, suite_.confidentiality,
            OrNull(credentials_.password), Length(credentials_.password), OrNull(credentials_.kg),
            Length(credentials_.kg), consoleRandom_.data(), consoleRandom_.size(),
            managedRandom_.data(), managedRandom_.size(), credentials_.nameOnlyLookup ? 1 : 0,
            credentials_.privilege, OrNull(credentials_.user), Length(credentials_.user), &sikKey,
            &sikLength, &integrityKey, &integrityLength, &confidentialityKey,
            &confidentialityLength) < 0) {
        return false;
    }
    const auto take = [](std::vector<std::uint8_t>* key, const void* from, unsigned length) {
        const auto* const bytes = static_cast<const std::uint8_t*>(from);
        if (bytes != nullptr) key->assign(bytes, bytes + std::min<std::size_t>(length, kKeyRoom));
    };
    take(&sik_, sikKey, sikLength);
    take(&integrityKey_, integrityKey, integrityLength);
    take(&confidentialityKey_, confidentialityKey, confidentialityLength);
    return true;
}

Packet Codec::Rakp3(std::uint8_t tag) {
    std::array<std::uint8_t, kKeyRoom> code{};
    const int length = ipmi_calculate_rakp_3_key_exchange_authentication_code(
        suite_.authentication, OrNull(credentials_.password), Length(credentials_.password),
        managedRandom_.data(), managedRandom_.size(), consoleId_,
        credentials_.nameOnlyLookup ? 1 : 0, credentials_.privilege, OrNull(credentials_.user),
        Length(credentials_.user), code.data(), code.size());
    if (length < 0 ||
        fill_rmcpplus_rakp_message_3(tag, RMCPPLUS_STATUS_NO_ERRORS, managedSystemId_, code.data(),
                                     static_cast<unsigned>(length), objects_->rakp3) < 0) {
        return {};
    }
    return Setup(IPMI_PAYLOAD_TYPE_RAKP_MESSAGE_3, objects_->rakp3);
}

Check Codec::ParseRakp4(std::span<const std::uint8_t> packet, std::uint8_t tag) {
    const Fiid& answer = objects_->rakp4;
    if (!ParseSetup(packet, IPMI_PAYLOAD_TYPE_RAKP_MESSAGE_4, answer) ||
        !answer.Has("rmcpplus_status_code", 1) || answer.Get("message_tag") != tag) {
        return Check::kNotOurs;
    }
    status_ = static_cast<std::uint8_t>(answer.Get("rmcpplus_status_code"));
    if (status_ != RMCPPLUS_STATUS_NO_ERRORS) return Check::kStatus;
    if (answer.Get("remote_console_session_id") != consoleId_) return Check::kNotOurs;
    if (credentials_.acceptNoCheckValue && !answer.Has("integrity_check_value", 1)) {
        return Check::kGood;
    }
    return ipmi_rmcpplus_check_rakp_4_integrity_check_value(
               suite_.authentication, OrNull(sik_), Length(sik_), consoleRandom_.data(),
               consoleRandom_.size(), managedSystemId_, guid_.data(), guid_.size(), answer) == 1
               ? Check::kGood
               : Check::kForged;
}

Packet Codec::Request(std::uint32_t sequence, std::uint8_t rqSeq, std::uint8_t netFn,
                      std::uint8_t lun, std::uint8_t command, std::span<const std::uint8_t> data) {
    Objects& o = *objects_;
    std::vector<std::uint8_t> bytes{command};
    bytes.insert(bytes.end(), data.begin(), data.end());
    Packet packet(kLargestPacket);
    fiid_obj_clear(o.command);
    if (fill_rmcp_hdr_ipmi(o.rmcpHeader) < 0 ||
        fill_rmcpplus_session_hdr(IPMI_PAYLOAD_TYPE_IPMI, suite_.integrity != 0 ? 1 : 0,
                                  suite_.confidentiality != 0 ? 1 : 0, 0, 0, managedSystemId_,
                                  sequence, o.sessionHeader) < 0 ||
        fill_lan_msg_hdr(kBmcAddress, netFn, lun, rqSeq, o.messageRequest) < 0 ||
        fiid_obj_set_all(o.command, bytes.data(), Length(bytes)) < 0 ||
        fill_rmcpplus_session_trlr(o.sessionTrailer) < 0) {
        return {};
    }
    const int length = assemble_ipmi_rmcpplus_pkt(
        suite_.authentication, suite_.integrity, suite_.confidentiality, OrNull(integrityKey_),
        Length(integrityKey_), OrNull(confidentialityKey_), Length(confidentialityKey_),
        OrNull(credentials_.password), Length(credentials_.password), o.rmcpHeader, o.sessionHeader,
        o.messageRequest, o.command, o.sessionTrailer, packet.data(), kLargestPacket, kFlags);
    packet.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    return packet;
}

std::optional<Answer> Codec::ParseAnswer(std::span<const std::uint8_t> packet) {
    Objects& o = *objects_;
    const auto length = static_cast<unsigned>(packet.size());
    fiid_obj_clear(o.command);
    fiid_obj_clear(o.sessionTrailer);
    if (unassemble_ipmi_rmcpplus_pkt(
            suite_.authentication, suite_.integrity, suite_.confidentiality, OrNull(integrityKey_),
            Length(integrityKey_), OrNull(confidentialityKey_), Length(confidentialityKey_),
            packet.data(), length, o.rmcpHeader, o.sessionHeader, o.payload, o.messageResponse,
            o.command, o.messageTrailer, o.sessionTrailer, kFlags) != 1 ||
        ipmi_rmcpplus_check_payload_type(o.sessionHeader, IPMI_PAYLOAD_TYPE_IPMI) != 1 ||
        ipmi_rmcpplus_check_session_id(o.sessionHeader, consoleId_) != 1) {
        return std::nullopt;
    }
    // A packet that claims to be unprotected inside a protected session is nobody's answer.
    if (suite_.integrity != 0 &&
        (o.sessionHeader.Get("payload_type.authenticated") != 1 ||
         ipmi_rmcpplus_check_packet_session_authentication_code(
             suite_.integrity, packet.data(), length, OrNull(integrityKey_), Length(integrityKey_),
             OrNull(credentials_.password), Length(credentials_.password),
             o.sessionTrailer) != 1)) {
        return std::nullopt;
    }
    if (suite_.confidentiality != 0 && o.sessionHeader.Get("payload_type.encrypted") != 1) {
        return std::nullopt;
    }
    if (ipmi_lan_check_checksum(o.messageResponse, o.command, o.messageTrailer) != 1) {
        return std::nullopt;
    }
    const std::vector<std::uint8_t> bytes = o.command.All();
    const auto netFn = static_cast<std::uint8_t>(o.messageResponse.Get("net_fn"));
    if (bytes.size() < 2 || (netFn & 1) == 0) return std::nullopt;
    Answer answer;
    answer.sequence = static_cast<std::uint32_t>(o.sessionHeader.Get("session_sequence_number"));
    answer.rqSeq = static_cast<std::uint8_t>(o.messageResponse.Get("rq_seq"));
    answer.netFn = static_cast<std::uint8_t>(netFn - 1);
    answer.command = bytes[0];
    answer.response.assign(bytes.begin() + 1, bytes.end());
    return answer;
}

}  // namespace tqrhost::rmcpplus
