#include <algorithm>
#include <iterator>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/spdriver/kinds.h"
#include "host/spdriver/source.h"

namespace NQORTQR20 {
namespace {

struct Kind {
    std::string_view name;   ///< with its colon where a place follows
    std::string_view usage;  ///< as the user writes it
    bool joins;              ///< several of them make one machine
    /// One place, or several of a kind that joins: their nodes follow each other.
    /// Null for a kind that is not built in.
    Source (*open)(const std::vector<std::string>& places, const Access& access);
};

constexpr Kind kKinds[] = {
    {"inband", "inband", false, tqrhost::OpenInband},
#ifdef IPMISEL_LAN
    {"lan:", "lan:HOST[:PORT]", true, tqrhost::OpenLan},
#else
    {"lan:", "lan:HOST[:PORT]", true, nullptr},
#endif
    {"sim:", "sim:FILE", false, tqrhost::OpenSimulated},
    {"replay:", "replay:FILE", false, tqrhost::OpenReplay},
};

bool IsOfKind(std::string_view source, const Kind& kind) {
    return kind.name.back() == ':' ? source.starts_with(kind.name) : source == kind.name;
}

const Kind& FindKind(const std::string& source) {
    const auto kind = std::find_if(std::begin(kKinds), std::end(kKinds),
                                   [&](const Kind& k) { return IsOfKind(source, k); });
    if (kind != std::end(kKinds) && kind->open != nullptr) return *kind;
    std::string known;
    for (const Kind& k : kKinds) {
        if (k.open != nullptr) known += (known.empty() ? "" : ", ") + std::string(k.usage);
    }
    const std::string line =
        "there is no source \"" + source + "\" here; name one of " + known + " with --from";
    if (kind != std::end(kKinds)) throw SourceError(line);
    throw SourceUsageError(line);
}

std::string PlaceOf(const std::string& source, const Kind& kind) {
    std::string place = source.substr(kind.name.size());
    if (place.empty() && kind.name.back() == ':') {
        throw SourceUsageError("the source \"" + source + "\" names no place; write it as " +
                               std::string(kind.usage));
    }
    return place;
}

}  // namespace

Source OpenSources(const std::vector<std::string>& sources, const SourceOptions& options) {
    if (sources.empty()) throw SourceError("no source is named");
    const Access access = ParseAccess(options);
    for (const std::string& source : sources) {
        if (FindKind(source).joins || sources.size() == 1) continue;
        throw SourceUsageError("the source \"" + source +
                               "\" stands alone; only several of the kind lan: make one machine");
    }
    const Kind& kind = FindKind(sources.front());
    std::vector<std::string> places;
    places.reserve(sources.size());
    for (const std::string& source : sources) places.push_back(PlaceOf(source, kind));
    return kind.open(places, access);
}

void PrepareSources() {
#ifdef IPMISEL_LAN
    tqrhost::PrepareLan();
#endif
}

}  // namespace NQORTQR20
