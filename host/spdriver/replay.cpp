#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <fstream>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "host/spdriver/kinds.h"
#include "host/spdriver/stop_gate.h"
#include "simulator/strict_json.h"

// A capture: one JSON object a line. The first holds the facts of the machine, every other one
// exchange: {"node": 0, "request": "0120...", "response": "00..." or null}.

namespace tqrhost {
namespace {

using ipmisel::JsonValue;

constexpr std::uint32_t kVersion = 1;
constexpr std::uint32_t kMostNodes = 1024;

/// What identifies a request: all of it but the padding of its frame.
std::string KeyOf(const RequestFrame& request) {
    std::string key{static_cast<char>(request.netFn()), static_cast<char>(request.lun()),
                    static_cast<char>(request.command())};
    key.append(request.data().begin(), request.data().end());
    return key;
}

/// The exchanges of one node. The same request is answered in the order recorded; after its last
/// answer that one is given again.
class ReplayTransport : public Transport {
public:
    void Add(const RequestFrame& request, std::optional<Response> response) {
        answers_[KeyOf(request)].recorded.push_back(std::move(response));
    }
    std::optional<Response> Exchange(const RequestFrame& request) override {
        const auto found = answers_.find(KeyOf(request));
        if (found == answers_.end()) return std::nullopt;
        Answers& answers = found->second;
        const std::size_t position = std::min(answers.given, answers.recorded.size() - 1);
        ++answers.given;
        return answers.recorded[position];
    }

private:
    struct Answers {
        std::vector<std::optional<Response>> recorded;
        std::size_t given = 0;
    };
    std::unordered_map<std::string, Answers> answers_;
};

/// The nodes whose number the first line says.
std::size_t ReadFacts(const JsonValue& line, MachineFacts* facts) {
    std::size_t nodes = 0;
    line.Object({
        {"ipmisel_capture", [](const JsonValue& v) { v.Number(kVersion, kVersion); }, true},
        {"machine_type", [&](const JsonValue& v) { facts->machineType = v.Text(); }},
        {"integrated_bmc", [&](const JsonValue& v) { facts->integratedBmc = v.Flag(); }},
        {"ipmi_driver", [&](const JsonValue& v) { facts->ipmiDriver = v.Flag(); }},
        {"ipmi_lan", [&](const JsonValue& v) { facts->ipmiLan = v.Flag(); }},
        {"local_time",
         [&](const JsonValue& v) {
             if (!v.IsNull()) facts->localTime = v.Text();
         }},
        {"smbios",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& s) { facts->smbios.push_back(s.Hex()); });
         }},
        {"nodes", [&](const JsonValue& v) { nodes = v.Number(0, kMostNodes); }, true},
    });
    return nodes;
}

void ReadExchange(const JsonValue& line,
                  const std::vector<std::unique_ptr<ReplayTransport>>& nodes) {
    std::size_t node = 0;
    std::optional<RequestFrame> request;
    std::optional<Response> response;
    line.Object({
        {"node",
         [&](const JsonValue& v) {
             node = v.Number(0, kMostNodes);
             if (node >= nodes.size()) v.Refuse("the first line announces fewer nodes");
         },
         true},
        {"request",
         [&](const JsonValue& v) {
             request = RequestFrame::FromBuffer(v.Hex());
             if (!request) v.Refuse("is no request frame: shorter than it says itself");
         },
         true},
        {"response",
         [&](const JsonValue& v) {
             if (v.IsNull()) return;
             response = v.Hex();
             if (response->empty()) v.Refuse("begins with a completion code, or is null");
         },
         true},
    });
    nodes[node]->Add(*request, std::move(response));
}

}  // namespace

Source OpenReplay(const std::vector<std::string>& places, const SourceOptions& /*options*/) {
    const std::string& place = places.front();
    Source source;
    std::vector<std::unique_ptr<ReplayTransport>> nodes;
    std::size_t number = 0;
    const auto readLine = [&](const JsonValue& line) {
        if (number > 1) return ReadExchange(line, nodes);
        const std::size_t count = ReadFacts(line, &source.facts);
        while (nodes.size() < count) nodes.push_back(std::make_unique<ReplayTransport>());
    };
    errno = 0;
    std::ifstream in(place, std::ios::binary);
    try {
        for (std::string line; std::getline(in, line);) {
            ipmisel::ReadStrictJson(line, place, readLine, ++number);
        }
    } catch (const ipmisel::JsonFileError& error) {
        throw SourceError(std::string(error.what()) +
                          "; correct the file or name another with --from");
    }
    if (in.bad() || (number == 0 && errno != 0)) {
        throw SourceError(place + ": cannot be read: " + std::strerror(errno) +
                          "; name another with --from");
    }
    if (number == 0) {
        throw SourceError(place + ": is empty, not a capture; name another with --from");
    }
    for (auto& node : nodes) {
        source.nodes.push_back(
            {"replay:" + place, std::make_unique<StopGate>(std::move(node)), nullptr});
    }
    return source;
}

}  // namespace tqrhost
