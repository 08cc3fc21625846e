// Every request of a whole pass with every class of fault, held against the pass without one.

#include <random>
#include <set>

#include "base/text.h"
#include "ipmi/sel_record.h"
#include "plugins/ipmisel/pass/sections.h"
#include "tests/support/described_classes.h"
#include "tests/support/fru_inventory.h"
#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using NQORTQR20::RequestFrame;
using NQORTQR20::Response;
using Answer = std::optional<Response>;
using Answers = std::vector<Answer>;

using ipmi::kGetSdr;
using ipmi::kGetSelEntry;
using ipmi::kReadFruData;
using ipmi::kRecordAt;

/// One exchange of a pass.
struct Step {
    RequestFrame request;
    Answer answer;

    bool Is(ipmi::CommandCode command) const { return request.code() == command; }
    /// A read that names a record and is answered the next one's ID.
    bool OfRecord() const { return Is(kGetSelEntry) || Is(kGetSdr); }
    int Record() const { return request.data()[2] | request.data()[3] << 8; }
};

/// What comes instead of the answer at a position.
using Spoil = std::function<Answer(std::size_t position, const Step&)>;

class SpoiledBmc : public NQORTQR20::Transport {
public:
    SpoiledBmc(const ipmisim::BmcDescription& bmc, Spoil spoil, std::vector<Step>* steps)
        : bmc_(bmc), spoil_(std::move(spoil)), steps_(steps) {}
    Answer Exchange(const RequestFrame& request) override {
        Step step{request,
                  bmc_.Execute(request.netFn(), request.lun(), request.command(), request.data())};
        step.answer = spoil_(steps_->size(), step);
        steps_->push_back(step);
        return step.answer;
    }

private:
    ipmisim::SimulatedBmc bmc_;
    Spoil spoil_;
    std::vector<Step>* steps_;
};

std::string Shown(const NQORTQR20::PropertyValue& value) {
    const auto* const bytes = std::get_if<std::vector<std::uint8_t>>(&value);
    if (bytes == nullptr) return std::get<std::string>(value);
    return ipmisel::DumpBytes(*bytes, ipmisel::Digits::kUpperHex);
}

/// What a pass gives.
struct Pass {
    int status = 0;
    std::vector<NQORTQR20::Instance> instances;
    std::vector<Step> steps;
    NQORTQR20::NodeCompleteness account;

    /// Log records, or inventory, each as one text.
    std::vector<std::string> Texts(bool inventory) const {
        std::vector<std::string> texts;
        for (const NQORTQR20::Instance& instance : instances) {
            if ((instance.className == ipmisel::kFruClass) != inventory) continue;
            if (instance.className.find("Firmware") != std::string::npos) continue;
            texts.emplace_back();
            for (const auto& [name, value] : instance.properties) {
                texts.back() += name;
                texts.back() += "=" + Shown(value) + "\n";
            }
        }
        return texts;
    }
    /// A FRU device said that it is not there, or ends here.
    bool DeviceEnds() const {
        return std::any_of(steps.begin(), steps.end(), [](const Step& step) {
            return step.Is(kReadFruData) && step.answer && !step.answer->empty() &&
                   (step.answer->front() == ipmi::kNotPresent ||
                    step.answer->front() == ipmi::kParameterOutOfRange);
        });
    }
};

class FaultMatrix : public MachineTest {
protected:
    FaultMatrix() {
        facts.machineType = "SIM-1";
        facts.integratedBmc = true;
        facts.localTime = "20240305120000.000000+060";
        facts.smbios.push_back(OemStrings({"CPLD 2"}));
        ipmisim::BmcDescription& bmc = nodes[0];
        bmc.selEntries = {SystemEvent(1, 0x01, 0x30), SystemEvent(2, 0x07, 0x31, 0x6F, 0x01),
                          OtherRecord(3, 0xDD), OtherRecord(4, 0xE1), SystemEvent(5, 0x01, 0x00)};
        bmc.sdrRecords = {FullSensor(1, 0x30, 0x07, 1, "Ambient"),
                          FullSensor(2, 0x31, 0x03, 2, "CPU 2"), FruLocator(3, 3, "PSU 1")};
        bmc.fru = {{0, FixedLayout("Maker", "Board", "S-0")},
                   {3, FixedLayout("Maker", "Supply", "S-3")}};
        bmc.auxLogCount = 0;
        bmc.deviceId = {0x20, 1, 2, 5, 2, 0xBF, 0xD9, 0x7E, 0, 0x34, 0x12, 0x11, 0x22, 0x33, 0x44};
        bmc.replies = {{0x3A, 0x91, {0x00}, {0, 1, 7}},
                       {0x3A, 0x92, {0x00}, {0, 0x2C}},
                       {0x3A, 0x93, {0x00}, {0, 1, 4, 2}},
                       {0x3A, 0x93, {0x01}, {0, 1, 4, 3}}};
        // Healthy BMCs, also those that lack something.
        for (const int missing : {0x00, 0x01, 0x11, 0x20, 0x22, 0x5A, 0x91}) {
            const Pass healthy = Run([&](std::size_t, const Step& step) {
                return step.request.command() == missing ? Response{0xC1} : step.answer;
            });
            if (missing == 0) clean = healthy;
            for (const NQORTQR20::Instance& instance : healthy.instances) {
                for (const auto& [name, value] : instance.properties) {
                    healthyValues_.insert({name, Shown(value)});
                }
            }
        }
    }
    Pass Run(Spoil spoil) {
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        log.Clear();
        written.instances.clear();
        NQORTQR20::Source source;
        source.facts = facts;
        Pass pass;
        source.nodes.push_back(
            {"", std::make_unique<SpoiledBmc>(nodes[0], std::move(spoil), &pass.steps), nullptr});
        NQORTQR20::OpenMachine(std::move(source));
        const NQORTQR20::OutputHandle output(written);
        std::vector<const char*> classes = DefaultClasses();
        pass.status = IPMISELGetData(context.get(), output.get(), classes.data(),
                                     static_cast<int>(classes.size()))
                          .code;
        pass.account = NQORTQR20::GetCompleteness().front();
        NQORTQR20::CloseMachine();
        pass.instances = written.instances;
        return pass;
    }
    /// Runs a pass and looks at everything that must hold, whatever its BMC did: it ends, makes
    /// nothing up, and tells of what it lacks.
    void Expect(Spoil spoil, const std::string& what) {
        const Pass pass = Run(std::move(spoil));
        EXPECT_LE(pass.steps.size(), 3 * clean.steps.size()) << what;
        EXPECT_THAT(pass.status, ::testing::AnyOf(0, 3)) << what;
        ExpectNothingMadeUp(pass, what);
        if (pass.status == 0 && pass.Texts(false) != clean.Texts(false)) {
            EXPECT_FALSE(pass.account.Whole()) << what;
        }
        if (pass.Texts(true) != clean.Texts(true) && !pass.DeviceEnds()) {
            EXPECT_FALSE(pass.account.faults.empty()) << what;
        }
    }
    Pass clean;

private:
    /// Every log record came whole, and no instance holds a text that was not sent in this pass
    /// and is none of a healthy BMC's.
    void ExpectNothingMadeUp(const Pass& pass, const std::string& what) const {
        std::set<std::string> records;
        std::string inventory;
        for (const Step& step : pass.steps) {
            const Response answer = step.answer.value_or(Response());
            if (step.Is(kGetSelEntry) && answer.size() >= kRecordAt + ipmi::kSelRecordSize) {
                records.insert(
                    Shown(Response(&answer[kRecordAt], &answer[kRecordAt] + ipmi::kSelRecordSize)));
            }
            // FRU data follow completion code and count, sixteen bytes in every chunk; a name ends
            // its record.
            const std::size_t end = step.Is(kReadFruData) ? 18
                                    : step.Is(kGetSdr)    ? answer.size()
                                                          : 0;
            for (std::size_t i = 2; i < std::min(end, answer.size()); ++i) {
                inventory += static_cast<char>(answer[i]);
            }
        }
        for (const NQORTQR20::Instance& instance : pass.instances) {
            for (const auto& [name, value] : instance.properties) {
                const std::string shown = Shown(value);
                const bool known = name == "RawData" ? records.contains(shown)
                                                     : IsHealthy(name, shown) ||
                                                           inventory.find(shown) != inventory.npos;
                EXPECT_TRUE(known) << what << ": " << name << "=" << shown;
            }
        }
    }
    /// A value of a healthy BMC; of those that hold a name from the BMC also one that is cut.
    bool IsHealthy(const std::string& name, const std::string& shown) const {
        if (healthyValues_.contains({name, shown})) return true;
        static const std::set<std::string> kWithName{"Message", "SensorInformation",
                                                     "IdentifyingNumber", "ElementName"};
        if (!kWithName.contains(name)) return false;
        return std::any_of(healthyValues_.begin(), healthyValues_.end(), [&](const auto& healthy) {
            const std::string& whole = healthy.second;
            const auto same = std::mismatch(shown.begin(), shown.end(), whole.begin(), whole.end());
            const auto rest =
                std::mismatch(shown.rbegin(), shown.rend(), whole.rbegin(), whole.rend());
            return healthy.first == name &&
                   (same.first - shown.begin()) + (rest.first - shown.rbegin()) >=
                       std::ssize(shown);
        });
    }

    std::set<std::pair<std::string, std::string>> healthyValues_;
};

Answers CompletionCodes() {
    Answers codes{Response{0x80}, Response{0x81}, Response{0xFF}};
    for (std::uint8_t code = 0xC0; code <= 0xD5; ++code) codes.emplace_back(Response{code});
    return codes;
}

Answers Prefixes(const Response& answer) {
    Answers prefixes;
    for (auto end = answer.begin(); end != answer.end(); ++end) {
        prefixes.emplace_back(Response(answer.begin(), end));
    }
    return prefixes;
}

Answers OverLong(const Step& step) {
    Answers longer;
    for (const std::size_t more : {1, 20, 1000}) {
        Response response = *step.answer;
        response.resize(response.size() + more, 'A');
        longer.emplace_back(response);
    }
    return longer;
}

/// The record's own ID, the one before it and one further on; first, unknown and last ones.
Answers OtherNextRecords(const Step& step) {
    Answers answers;
    if (!step.OfRecord() || step.answer->size() < kRecordAt) return answers;
    const int own = step.Record();
    for (const int next : {own, own - 1, own + 2, 0, 1, 0x7777, 0x00FF, 0xFF00, 0xFFFF}) {
        Response response = *step.answer;
        response[1] = Low(static_cast<std::uint16_t>(next));
        response[2] = High(static_cast<std::uint16_t>(next));
        answers.emplace_back(response);
    }
    return answers;
}

/// What may come instead of one answer.
struct FaultClass {
    const char* name;
    Answers (*instead)(const Step&);
};
const FaultClass kFaultClasses[] = {
    {"no response", [](const Step&) { return Answers{std::nullopt}; }},
    {"completion code", [](const Step&) { return CompletionCodes(); }},
    {"truncated", [](const Step& step) { return Prefixes(*step.answer); }},
    {"over-long", OverLong},
    {"next record", OtherNextRecords},
};

/// What a BMC may do from one request on.
struct LastingFault {
    const char* name;
    Answer (*answer)(const Step& first, const Step& step);
};
const LastingFault kLastingFaults[] = {
    {"silent", [](const Step&, const Step&) { return Answer(); }},
    {"nothing but a completion code", [](const Step&, const Step&) { return Answer(Response{0}); }},
    {"half of every answer",
     [](const Step&, const Step& step) {
         const auto half = static_cast<std::ptrdiff_t>(step.answer->size() / 2);
         return Answer(Response(step.answer->begin(), step.answer->begin() + half));
     }},
    {"the record is gone",
     [](const Step& first, const Step& step) {
         const bool gone = first.OfRecord() && step.request.command() == first.request.command() &&
                           step.Record() == first.Record();
         return gone ? Answer(Response{0xCB}) : step.answer;
     }},
    {"no reservation holds",
     [](const Step&, const Step& step) {
         const bool needed = step.Is(kGetSdr) && step.request.data()[4] != 0;
         return needed ? Answer(Response{0xC5}) : step.answer;
     }},
    {"every record leads to the first again",
     [](const Step&, const Step& step) {
         Answer answer = step.answer;
         if (step.OfRecord() && answer->size() >= kRecordAt) (*answer)[1] = (*answer)[2] = 0;
         return answer;
     }},
};

TEST_F(FaultMatrix, EveryRequestOnce) {
    EXPECT_EQ(clean.instances.size(), 12U);
    for (std::size_t at = 0; at < clean.steps.size(); ++at) {
        const Step& hit = clean.steps[at];
        for (const FaultClass& fault : kFaultClasses) {
            const Answers answers = fault.instead(hit);
            for (std::size_t i = 0; i < answers.size(); ++i) {
                Expect([&](std::size_t position,
                           const Step& step) { return position == at ? answers[i] : step.answer; },
                       ipmisel::Format("request %zu, command %02x, %s, %zu", at,
                                       hit.request.command(), fault.name, i));
            }
        }
    }
}

TEST_F(FaultMatrix, FromEveryRequestOn) {
    for (std::size_t at = 0; at < clean.steps.size(); ++at) {
        for (const LastingFault& fault : kLastingFaults) {
            Expect(
                [&](std::size_t position, const Step& step) {
                    return position < at ? step.answer : fault.answer(clean.steps[at], step);
                },
                ipmisel::Format("from request %zu on, %s", at, fault.name));
        }
    }
}

TEST_F(FaultMatrix, AllTogether) {
    for (unsigned seed = 1; seed <= 400; ++seed) {
        std::minstd_rand random(seed);
        Expect(
            [&](std::size_t, const Step& step) {
                if (random() % 12 != 0) return step.answer;
                const auto& fault = kFaultClasses[random() % std::size(kFaultClasses)];
                const Answers answers = fault.instead(step);
                return answers.empty() ? step.answer : answers[random() % answers.size()];
            },
            ipmisel::Format("seed %u", seed));
    }
}

}  // namespace
}  // namespace ipmiseltest
