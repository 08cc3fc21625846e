#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <cstddef>
#include <cstring>
#include <fstream>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <span>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "base/text.h"
#include "host/spdriver/capture.h"
#include "host/spdriver/kinds.h"
#include "host/spdriver/stop_gate.h"
#include "simulator/strict_json.h"
#include "tqr/datetime.h"

// A capture: one JSON object a line (docs/capture.md). The first holds the facts of the machine,
// every other one exchange: {"node": 0, "request": "0120...", "response": "00..." or null}.

namespace tqrhost {
namespace {

using ipmisel::JsonValue;
using NQORTQR20::kMaxCaptureLine;
using NQORTQR20::TCIMDateTime;
using Bytes = std::span<const std::uint8_t>;

constexpr std::uint32_t kVersion = 1;
constexpr std::uint32_t kMaxNodes = 1024;
constexpr std::size_t kMaxMissing = 100;

std::string TextOf(std::int64_t microseconds, short utcOffsetMinutes) {
    using namespace std::chrono;
    const sys_time<std::chrono::microseconds> time(std::chrono::microseconds(microseconds) +
                                                   minutes(utcOffsetMinutes));
    const auto day = floor<days>(time);
    const year_month_day date(day);
    const hh_mm_ss clock(time - day);
    TCIMDateTime text;
    text.Set(static_cast<unsigned short>(static_cast<int>(date.year())),
             static_cast<unsigned short>(static_cast<unsigned>(date.month())),
             static_cast<unsigned>(date.day()), static_cast<unsigned short>(clock.hours().count()),
             static_cast<unsigned short>(clock.minutes().count()),
             static_cast<unsigned short>(clock.seconds().count()),
             static_cast<unsigned>(clock.subseconds().count()), utcOffsetMinutes);
    return text.ToString();
}

/// When the controllers were asked for their time, in the order in which they were. The time that
/// the plug-ins see is the one before the next question, and after an answer the one when it came.
class ReplayClock {
public:
    void Add(const std::string& at, double tookSeconds) {
        const TCIMDateTime answered(at.c_str());
        const std::int64_t took = std::llround(std::min(tookSeconds, kMaxSeconds) * 1e6);
        times_.push_back(
            {TextOf(answered.TotalMicroseconds() - took, answered.GetUTCOffset()), at});
    }
    void Answered(bool time) {
        if (time && next_ < times_.size()) {
            SetLocalTime(times_[next_++].after);
        } else if (!time && next_ < times_.size()) {
            SetLocalTime(times_[next_].before);
        }
    }

private:
    static constexpr double kMaxSeconds = 24 * 60 * 60;
    struct Times {
        std::string before, after;
    };
    std::vector<Times> times_;
    std::size_t next_ = 0;
};

/// The exchanges of one node. The same request is answered in the order recorded; after its last
/// answer that one is given again.
class ReplayTransport : public Transport {
public:
    explicit ReplayTransport(std::shared_ptr<ReplayClock> clock) : clock_(std::move(clock)) {}
    void Add(const RequestFrame& request, const std::optional<Response>& response) {
        const auto number = static_cast<std::uint32_t>(recorded_.size());
        const auto [found, isNew] = answers_.try_emplace(KeyOf(request), Answers{number, number});
        Recorded recorded;
        if (!isNew) {
            Recorded& previous = recorded_[std::exchange(found->second.last, number)];
            previous.next = number;
            recorded.at = previous.at;
            recorded.length = previous.length;
        }
        // Of two plug-ins that were given the same, the bytes stand once.
        const Bytes bytes = response ? Bytes(*response) : Bytes();
        if (!std::ranges::equal(bytes, BytesOf(recorded))) {
            recorded.at = bytes_.size();
            recorded.length = static_cast<std::uint32_t>(bytes.size());
            bytes_.insert(bytes_.end(), bytes.begin(), bytes.end());
        }
        recorded_.push_back(recorded);
    }
    std::optional<Response> Exchange(const RequestFrame& request) override {
        const auto found = answers_.find(KeyOf(request));
        if (found == answers_.end()) {
            NoteMissing(request);
            return std::nullopt;
        }
        Answers& answers = found->second;
        const Recorded& recorded = recorded_[answers.next];
        answers.spent = answers.next == answers.last;
        answers.given = true;
        if (!answers.spent) answers.next = recorded.next;
        clock_->Answered(request.code() == ipmi::kGetSelTime);
        if (recorded.length == 0) return std::nullopt;
        const Bytes bytes = BytesOf(recorded);
        return Response(bytes.begin(), bytes.end());
    }
    /// Those with which the recording ends and which this pass has not asked.
    std::vector<ipmi::Command> LaterInfos() const {
        std::vector<ipmi::Command> commands{ipmi::GetSelInfo(), ipmi::GetSdrRepositoryInfo()};
        std::erase_if(commands, [this](const ipmi::Command& command) {
            const auto found = answers_.find(KeyOf(RequestFrame(command)));
            return found == answers_.end() || !found->second.given || found->second.spent;
        });
        return commands;
    }
    const std::vector<ReadFault>& Missing() const { return missing_; }

private:
    /// An answer; a length of 0 is none at all. There are as many as the longest log has records,
    /// hence all bytes in one piece.
    struct Recorded {
        std::size_t at = 0;
        std::uint32_t length = 0;
        std::uint32_t next = 0;  ///< the next one to the same request, where there is one
    };
    /// The answers to one request, by their numbers.
    struct Answers {
        std::uint32_t next;
        std::uint32_t last;
        bool given = false;
        bool spent = false;  ///< the last one was given
    };

    Bytes BytesOf(const Recorded& recorded) const {
        return Bytes(bytes_).subspan(recorded.at, recorded.length);
    }

    /// Short enough, mostly, to need no memory of its own.
    static std::string KeyOf(const RequestFrame& request) {
        const ipmi::Command command = request.ToCommand();
        std::string key{static_cast<char>(command.netFn), static_cast<char>(command.lun),
                        static_cast<char>(command.command)};
        key.append(command.data.begin(), command.data.end());
        return key;
    }

    void NoteMissing(const RequestFrame& request) {
        const std::string name(ipmi::CommandName(request.code()));
        ReadFault fault{name.empty() ? ipmisel::Format("NetFn %02x command %02x", request.netFn(),
                                                       request.command())
                                     : name,
                        "", "not in the capture", true};
        if (missing_.size() < kMaxMissing &&
            std::find(missing_.begin(), missing_.end(), fault) == missing_.end()) {
            missing_.push_back(std::move(fault));
        }
    }

    std::shared_ptr<ReplayClock> clock_;
    std::vector<std::uint8_t> bytes_;
    std::vector<Recorded> recorded_;
    std::unordered_map<std::string, Answers> answers_;
    std::vector<ReadFault> missing_;
};

using Nodes = std::vector<std::unique_ptr<ReplayTransport>>;

/// The nodes whose number the first line says.
std::size_t ReadFacts(const JsonValue& line, Source* source) {
    MachineFacts& facts = source->facts;
    std::size_t nodes = 0;
    line.Object({
        {"ipmisel_capture", [](const JsonValue& v) { v.Number(kVersion, kVersion); }, true},
        {"machine_type", [&](const JsonValue& v) { facts.machineType = v.Text(); }},
        {"integrated_bmc", [&](const JsonValue& v) { facts.integratedBmc = v.Flag(); }},
        {"ipmi_driver", [&](const JsonValue& v) { facts.ipmiDriver = v.Flag(); }},
        {"ipmi_lan", [&](const JsonValue& v) { facts.ipmiLan = v.Flag(); }},
        {"local_time",
         [&](const JsonValue& v) {
             if (!v.IsNull()) facts.localTime = v.TimeText();
         }},
        {"smbios",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& s) { facts.smbios.push_back(s.Hex()); });
         }},
        {"nodes", [&](const JsonValue& v) { nodes = v.Number(0, kMaxNodes); }, true},
        {"classes",
         [&](const JsonValue& v) {
             v.List([&](const JsonValue& name) { source->classes.push_back(name.Text()); });
         }},
    });
    return nodes;
}

void ReadExchange(const JsonValue& line, const Nodes& nodes, ReplayClock* clock) {
    std::size_t node = 0;
    std::optional<RequestFrame> request;
    std::optional<Response> response;
    std::string at;
    double took = 0;
    line.Object({
        {"node",
         [&](const JsonValue& v) {
             node = v.Number(0, kMaxNodes);
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
        {"at",
         [&](const JsonValue& v) {
             at = v.Text();
             if (TCIMDateTime(at.c_str()).ToString() != at) {
                 v.Refuse("is no time; write it as in 20240305120000.000000+060");
             }
         }},
        {"took", [&](const JsonValue& v) { took = v.Real(); }},
    });
    if (!at.empty()) clock->Add(at, took);
    nodes[node]->Add(*request, response);
}

/// The next line without its end, at most kMaxCaptureLine bytes and one more; empty at the end of
/// the file. `whole` says whether the line has its end.
std::optional<std::string> ReadLine(std::istream& in, bool* whole) {
    std::string line;
    for (int c = in.get(); c != std::istream::traits_type::eof(); c = in.get()) {
        if (c == '\n') {
            *whole = true;
            return line;
        }
        line += static_cast<char>(c);
        if (line.size() > kMaxCaptureLine) break;
    }
    *whole = false;
    if (line.empty()) return std::nullopt;
    return line;
}

[[noreturn]] void Refuse(const std::string& reason, const char* advice) {
    throw SourceError(reason + "; " + advice);
}

}  // namespace

Source OpenReplay(const std::vector<std::string>& places, const Access& /*access*/) {
    const std::string& place = places.front();
    Source source;
    Nodes nodes;
    const auto clock = std::make_shared<ReplayClock>();
    std::size_t number = 0;
    bool cutShort = false;
    const auto readLine = [&](const JsonValue& line) {
        if (number > 1) return ReadExchange(line, nodes, clock.get());
        const std::size_t count = ReadFacts(line, &source);
        while (nodes.size() < count) nodes.push_back(std::make_unique<ReplayTransport>(clock));
    };
    errno = 0;
    std::ifstream in(place, std::ios::binary);
    bool whole = true;
    while (const auto line = ReadLine(in, &whole)) {
        ++number;
        if (line->size() > kMaxCaptureLine) {
            Refuse(ipmisel::Format("%s:%zu: the line is longer than %zu bytes", place.c_str(),
                                   number, kMaxCaptureLine),
                   "name another file with --from");
        }
        // The last line of a recording that was ended from outside.
        cutShort = !whole && number > 1 && !nlohmann::json::accept(*line, true);
        if (cutShort) break;
        try {
            ipmisel::ReadStrictJson(*line, place, readLine, number);
        } catch (const ipmisel::JsonFileError& error) {
            Refuse(error.what(), "correct the file or name another with --from");
        }
    }
    if (in.bad() || (number == 0 && errno != 0)) {
        Refuse(place + ": cannot be read: " + std::strerror(errno), "name another with --from");
    }
    if (number == 0) Refuse(place + ": is empty, not a capture", "name another with --from");
    for (auto& node : nodes) {
        const ReplayTransport* const replay = node.get();
        source.nodes.push_back(
            {"replay:" + place, std::make_unique<StopGate>(std::move(node)), nullptr});
        source.nodes.back().endPass = [replay] { return replay->LaterInfos(); };
        source.nodes.back().missing = [replay, cutShort] {
            std::vector<ReadFault> faults;
            if (cutShort)
                faults.push_back({"the capture", "", "ends in the middle of a line", true});
            faults.insert(faults.end(), replay->Missing().begin(), replay->Missing().end());
            return faults;
        };
    }
    return source;
}

}  // namespace tqrhost
