// Machines made from seeds: logs and repositories with broken bits, IDs and lengths, controllers
// that fail here and there. Every record that the BMC has answered whole is in the report, or the
// report is partial. IPMISEL_SEEDS=COUNT or IPMISEL_SEEDS=FIRST-LAST runs others than the first
// 5,000.

#include <random>
#include <set>

#include "base/text.h"
#include "host/spdriver/reading.h"
#include "host/spdriver/serial_pipeline.h"
#include "tests/support/fru_inventory.h"
#include "tests/support/machine_fixture.h"
#include "tests/support/seeds.h"

namespace ipmiseltest {
namespace {

#ifdef __SANITIZE_ADDRESS__
constexpr unsigned kSeeds = 1000;  // every step costs many times as much
#else
constexpr unsigned kSeeds = 5000;
#endif

class RandomMachine : public MachineTest {
protected:
    std::mt19937 random;
    /// Log records that were answered whole, by the ID by which they were asked for.
    std::set<std::uint16_t> answered;

    unsigned Below(unsigned limit) { return static_cast<unsigned>(random() % limit); }
    bool OneIn(unsigned times) { return Below(times) == 0; }

    ipmisim::BmcDescription Describe() {
        ipmisim::BmcDescription bmc;
        const unsigned events = Below(40);
        for (unsigned i = 1; i <= events; ++i) {
            SelRecord record =
                OneIn(5) ? OtherRecord(static_cast<std::uint16_t>(i), 0xC0 + Below(64) % 64)
                         : SystemEvent(static_cast<std::uint16_t>(i), 1, 0x30);
            if (OneIn(8)) record[Below(16)] ^= static_cast<std::uint8_t>(1U << Below(8));
            bmc.selEntries.push_back(record);
        }
        for (unsigned i = 1; i <= Below(12) + 1; ++i) {
            auto record = FullSensor(static_cast<std::uint16_t>(i),
                                     static_cast<std::uint8_t>(0x2F + i), 7, 1, "Sensor");
            if (OneIn(6)) record[2 + Below(static_cast<unsigned>(record.size()) - 2)] ^= 0x10;
            if (OneIn(10)) record.resize(5 + Below(50));
            bmc.sdrRecords.push_back(record);
        }
        bmc.wholeSdr = !OneIn(3);
        bmc.fru[0] = FixedLayout("Maker", "Board", "S-0");
        constexpr std::uint8_t kCommands[] = {0x11, 0x20, 0x22, 0x23, 0x40, 0x43, 0x43, 0x43};
        for (unsigned i = Below(4); i > 0; --i) {
            ipmisim::Fault fault;
            fault.netFn = ipmi::kNetFnStorage;
            fault.command = kCommands[Below(std::size(kCommands))];
            if (!OneIn(10)) fault.call = 1 + Below(30);
            fault.kind = static_cast<ipmisim::Fault::Kind>(Below(4));
            fault.completionCode = static_cast<std::uint8_t>(0xC0 + Below(22));
            fault.truncate = Below(20);
            fault.data.resize(Below(24), static_cast<std::uint8_t>(random()));
            bmc.faults.push_back(fault);
        }
        return bmc;
    }
    void Note(const ipmi::Command& command, const std::optional<NQORTQR20::Response>& answer) {
        constexpr std::size_t kWhole = 3 + 16;
        if (command.code() != ipmi::kGetSelEntry || !answer || answer->size() < kWhole ||
            answer->front() != 0) {
            return;
        }
        answered.insert(static_cast<std::uint16_t>(command.data[2] | command.data[3] << 8));
    }

    /// The simulated BMC, watched.
    class Watched : public NQORTQR20::Transport {
    public:
        Watched(const ipmisim::BmcDescription& bmc, RandomMachine* test) : bmc_(bmc), test_(test) {}
        std::optional<NQORTQR20::Response> Exchange(
            const NQORTQR20::RequestFrame& request) override {
            auto answer =
                bmc_.Execute(request.netFn(), request.lun(), request.command(), request.data());
            test_->Note(request.ToCommand(), answer);
            return answer;
        }

    private:
        ipmisim::SimulatedBmc bmc_;
        RandomMachine* test_;
    };

    /// A pass over the machine of a seed, read ahead or request by request.
    void Run(unsigned seed, bool readAhead) {
        random.seed(seed);
        const ipmisim::BmcDescription bmc = Describe();
        answered.clear();
        written.instances.clear();
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        NQORTQR20::Source source;
        source.facts = facts;
        auto watched = std::make_unique<Watched>(bmc, this);
        if (readAhead) {
            source.nodes.push_back(
                {"", nullptr, std::make_unique<tqrhost::SerialPipeline>(std::move(watched))});
            NQORTQR20::ReadLiveNodes(source, {});
        } else {
            source.nodes.push_back({"", std::move(watched), nullptr});
        }
        NQORTQR20::OpenMachine(std::move(source));
        const NQORTQR20::OutputHandle output(written);
        const char* classes[] = {"QORSG_IPMIFRU", "QORSG_IPMILogRecord"};
        const int status =
            IPMISELGetData(context.get(), output.get(), classes, std::size(classes)).code;
        NQORTQR20::EndPass();
        NQORTQR20::NodeCompleteness account = NQORTQR20::GetCompleteness().front();
        const auto exported =
            std::count_if(written.instances.begin(), written.instances.end(),
                          [](const auto& i) { return i.className == "QORSG_IPMILogRecord"; });
        account.log.exported = static_cast<unsigned>(exported);
        const bool partial = status != 0 || !account.Whole();
        EXPECT_TRUE(partial || account.log.exported >= answered.size())
            << "seed " << seed << (readAhead ? ", read ahead: " : ": ") << answered.size()
            << " records answered, " << exported << " exported";
        EXPECT_LE(static_cast<std::size_t>(exported), bmc.selEntries.size() + bmc.faults.size())
            << seed;
    }
};

TEST_F(RandomMachine, EveryRecordThatWasAnsweredIsInTheReportOrTheReportIsPartial) {
    const auto [first, last] = Seeds(kSeeds);
    for (unsigned seed = first; seed <= last; ++seed) {
        Run(seed, false);
        Run(seed, true);
    }
}

}  // namespace
}  // namespace ipmiseltest
