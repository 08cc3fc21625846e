#include <algorithm>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "host/spdriver/kinds.h"
#include "host/spdriver/lan/lan_access.h"
#include "host/spdriver/lan/lan_session.h"
#include "host/spdriver/lan/name_lookup.h"
#include "host/spdriver/stop.h"

namespace tqrhost {
namespace {

/// A BMC on its way to be a node.
struct Candidate {
    std::string name;  ///< as the user wrote it
    LanAccess access;
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

void BeginOpening(Candidate* candidate, Clock::time_point deadline) {
    const LookupResult found = Look(candidate->lookup, deadline);
    candidate->error = found.error;
    if (found.error) return;
    try {
        candidate->session =
            std::make_unique<LanSession>(candidate->name, candidate->access.session);
        candidate->session->Open(found.endpoints, Clock::now());
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

Source OpenLan(const std::vector<std::string>& places, const SourceOptions& options) {
    std::vector<Candidate> candidates;
    for (const std::string& place : places) {
        LanAccess access = ParseLanAccess(place, options);
        NameLookup lookup(access.host, access.port);
        candidates.push_back({"lan:" + place, std::move(access), std::move(lookup), nullptr, {}});
    }
    std::vector<LanSession*> opening;
    const auto began = Clock::now();
    try {
        for (Candidate& candidate : candidates) {
            BeginOpening(&candidate, began + candidate.access.session.timeout);
            if (!candidate.error) opening.push_back(candidate.session.get());
        }
        OpenTogether(opening);
    } catch (const CryptoError& error) {
        throw SourceError(error.what());
    }
    Source source;
    source.facts.ipmiLan = true;
    for (Candidate& candidate : candidates) {
        if (const auto error = ErrorOf(candidate)) {
            source.unreachable.push_back({candidate.name, Advice(candidate.name, *error)});
        } else {
            source.nodes.push_back({candidate.name, nullptr, std::move(candidate.session)});
        }
    }
    if (source.nodes.empty()) {
        std::string reasons;
        for (const UnreachableNode& node : source.unreachable) {
            reasons += (reasons.empty() ? "" : "\n") + node.reason;
        }
        throw SourceError(reasons);
    }
    return source;
}

}  // namespace tqrhost

namespace NQORTQR20 {

std::span<const WorkaroundInfo> KnownWorkarounds() { return tqrhost::LanWorkarounds(); }

}  // namespace NQORTQR20
