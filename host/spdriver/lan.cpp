#include <algorithm>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "host/spdriver/kinds.h"
#include "host/spdriver/lan/crypto.h"
#include "host/spdriver/lan/lan_place.h"
#include "host/spdriver/lan/lan_session.h"
#include "host/spdriver/lan/name_lookup.h"
#include "host/spdriver/stop.h"

namespace tqrhost {
namespace {

constexpr std::size_t kMaxPassword = 20;

/// With the password and the key, which are asked for here.
LanSessionOptions OptionsOf(const Access& access) {
    LanSessionOptions options{.credentials = {.user = access.user,
                                              .password = access.password ? access.password() : "",
                                              .kg = {},
                                              .privilege = access.privilege,
                                              .deviations = access.deviations},
                              .cipherSuites = access.cipherSuites,
                              .window = access.window,
                              .timeout = access.timeout};
    if (options.credentials.password.size() > kMaxPassword) {
        throw SourceUsageError("the password is longer than the 20 bytes of IPMI 2.0; check it");
    }
    if (access.kg) options.credentials.kg = access.kg();
    return options;
}

/// A BMC on its way to be a node.
struct Candidate {
    std::string name;  ///< as the user wrote it
    NameLookup lookup;
    std::unique_ptr<LanSession> session;
    std::optional<OpeningError> error;
};

/// Waits for the name; a stop is seen within a tenth of a second.
LookupResult Look(const NameLookup& lookup, Clock::time_point deadline) {
    constexpr std::chrono::milliseconds kMaxWait{100};
    for (;;) {
        const auto now = Clock::now();
        if (Stopped() != StopReason::kNone) return {{}, OpeningError::kStopped};
        if (auto result = lookup.Wait(std::min({now + kMaxWait, deadline, StopTime()}))) {
            return *std::move(result);
        }
        if (Clock::now() >= deadline) return {{}, OpeningError::kNameServerSilent};
    }
}

/// When the opening is given up. One that stays silent leaves the others half of what the
/// collection has, to be read in.
Clock::time_point OpeningDeadline(std::size_t nodes, std::chrono::milliseconds timeout) {
    const auto now = Clock::now();
    const auto stop = StopTime();
    if (nodes == 1 || stop == Clock::time_point::max()) return now + timeout;
    return std::min(now + timeout, now + (stop - now) / 2);
}

void BeginOpening(Candidate* candidate, const LanSessionOptions& options,
                  Clock::time_point deadline) {
    const LookupResult found = Look(candidate->lookup, deadline);
    candidate->error = found.error;
    if (found.error) return;
    try {
        candidate->session = std::make_unique<LanSession>(candidate->name, options);
        candidate->session->Open(found.endpoints, Clock::now(), deadline);
    } catch (OpeningError error) {
        candidate->error = error;
    }
}

std::optional<OpeningError> ErrorOf(const Candidate& candidate) {
    if (candidate.error) return candidate.error;
    if (candidate.session->IsOpening()) return OpeningError::kStopped;
    return candidate.session->error();
}

}  // namespace

Source OpenLan(const std::vector<std::string>& places, const Access& access) {
    std::vector<Candidate> candidates;
    for (const std::string& place : places) {
        const LanPlace at = ParseLanPlace(place);
        candidates.push_back({"lan:" + place, NameLookup(at.host, at.port), nullptr, {}});
    }
    const LanSessionOptions options = OptionsOf(access);
    std::vector<LanSession*> opening;
    const auto deadline = OpeningDeadline(candidates.size(), options.timeout);
    try {
        for (Candidate& candidate : candidates) {
            BeginOpening(&candidate, options, deadline);
            if (!candidate.error) opening.push_back(candidate.session.get());
        }
        OpenTogether(opening);
    } catch (const CryptoError& error) {
        throw SourceError(error.what());
    }
    Source source;
    source.facts.ipmiLan = true;
    Refusal refusal = Refusal::kOther;
    for (Candidate& candidate : candidates) {
        if (const auto error = ErrorOf(candidate)) {
            if (source.unreachable.empty()) refusal = RefusalOf(*error);
            source.unreachable.push_back({candidate.name, Advice(candidate.name, *error)});
        } else {
            source.nodes.push_back({candidate.name, nullptr, std::move(candidate.session)});
        }
    }
    if (source.nodes.empty()) {
        std::string reasons;
        for (const UnreachableNode& node : source.unreachable) {
            reasons += (reasons.empty() ? "" : "; ") + node.reason;
        }
        throw SourceError(reasons, refusal);
    }
    return source;
}

void PrepareLan() {
    try {
        for (const Hmac::Digest digest : {Hmac::Digest::kSha1, Hmac::Digest::kSha256}) {
            Hmac hmac(digest);
            hmac.SetKey(AesCbc::Block{});
            hmac.Compute({AesCbc::Block{}});
        }
        AesCbc::Block block{};
        AesCbc cipher(block);
        cipher.Encrypt(block, block, block);
        cipher.Decrypt(block, block, block);
    } catch (const CryptoError&) {
        // Told when a session is opened.
    }
}

}  // namespace tqrhost
