// What has been used against readers of BMCs: texts that are instructions, lengths that lie, counts
// that lead nowhere.

#include "tests/support/fru_inventory.h"
#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Lt;
using ::testing::SizeIs;
using Bytes = ipmisim::Bytes;

constexpr const char* kDirectives = "%n%s%255$n%*d%99999c";

class HostileBmc : public MachineTest {
protected:
    HostileBmc() {
        facts.machineType = "SIM-1";
        nodes[0].selEntries = {SystemEvent(1, 0x01, 0x30), SystemEvent(2, 0x01, 0x30),
                               SystemEvent(3, 0x01, 0x30)};
    }
    /// A pass over inventory and log that ends, and not by wearing itself out.
    void CollectAll() {
        written.instances.clear();
        requests.clear();
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        EXPECT_EQ(Collect({"QORSG_IPMIFRU", "QORSG_IPMILogRecord", "QORSG_ZMCAuxDebugRecord"}), 0);
        EXPECT_THAT(requests, SizeIs(Lt(200U)));
    }
    std::vector<std::string> Sensors() const {
        std::vector<std::string> names;
        for (const auto& instance : written.instances) {
            if (const auto name = TextOf(instance, "SensorInformation")) names.push_back(*name);
        }
        return names;
    }
};

TEST_F(HostileBmc, TextsAreNoInstructions) {
    facts.machineType = kDirectives;
    facts.smbios.push_back(OemStrings({kDirectives, "CPLD %n"}));
    nodes[0].sdrRecords = {FullSensor(1, 0x30, 7, 1, "Temp%n%s"), FruLocator(2, 3, kDirectives)};
    nodes[0].fru = {{0, FixedLayout("Maker%n", "Board%s%n", "S-0%n")},
                    {3, Runs({kDirectives, "%n", "%s%n"})}};
    SelRecord comment = OtherRecord(2, 0xDD);
    std::copy_n("%n%s", 4, comment.begin() + 11);
    comment[10] = 0;
    nodes[0].selEntries[1] = comment;
    CollectAll();
    EXPECT_THAT(log.Lines(3), Contains(kDirectives));
    EXPECT_THAT(Sensors(), ElementsAre("Temp", "Temp"));
    EXPECT_THAT(Written("Message"), Contains(HasSubstr("%n%s")));
    EXPECT_THAT(Written("Name"), Contains("Board"));
}

TEST_F(HostileBmc, RecordLengthsThatLie) {
    const Bytes honest = FullSensor(1, 0x30, 7, 1, "Ambient");
    const auto with = [&](std::size_t at, std::uint8_t value) {
        Bytes record = honest;
        record[at] = value;
        return record;
    };
    const auto cut = [&](std::size_t length) {
        return Bytes(honest.begin(), honest.begin() + static_cast<std::ptrdiff_t>(length));
    };
    const struct {
        const char* what;
        Bytes record;
        std::string name;
    } cases[] = {
        {"31 characters", FullSensor(1, 0x30, 7, 1, std::string(31, 'A')), std::string(16, 'A')},
        {"length below the header's", with(4, 0), "Ambient"},
        {"length beyond the record", with(4, 0xFF), "Ambient"},
        {"a name longer than the record", with(47, 0xDF), "Ambient"},
        {"the header alone", cut(5), ""},
        {"nothing after the sensor's number", cut(10), ""},
        {"half the factors", cut(25), ""},
        {"no name", cut(47), ""},
    };
    for (const auto& c : cases) {
        nodes[0].sdrRecords = {c.record};
        CollectAll();
        EXPECT_THAT(Sensors(), ElementsAre(c.name, c.name, c.name)) << c.what;
    }
    for (std::size_t length = 0; length <= honest.size(); ++length) {
        Bytes locator = FruLocator(1, 3, "PSU");
        locator.resize(std::min(locator.size(), length));
        nodes[0].sdrRecords = {locator, cut(length)};
        CollectAll();
    }
}

TEST_F(HostileBmc, CountsThatNeverAddUp) {
    const auto info = [](std::uint8_t low, std::uint8_t high) {
        return Bytes{0x51, low, high, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0};
    };
    const Bytes record(nodes[0].selEntries[0].begin(), nodes[0].selEntries[0].end());
    Bytes toItself{1, 0}, toNowhere{0, 0};
    toItself.insert(toItself.end(), record.begin(), record.end());
    const struct {
        const char* what;
        ipmisim::Fault fault;
        std::size_t exported;
        bool whole;
    } cases[] = {
        {"no records, and then some", Answer(ipmi::kGetSelInfo, 0, info(0, 0)), 0, true},
        {"fewer than there are", Answer(ipmi::kGetSelInfo, 0, info(2, 0)), 2, true},
        {"65,535 of three", Answer(ipmi::kGetSelInfo, 0, info(0xFF, 0xFF)), 3, false},
        {"no sensors, and then one", Answer(ipmi::kGetSdrRepositoryInfo, 0, info(0, 0)), 3, true},
        {"65,535 sensors of one", Answer(ipmi::kGetSdrRepositoryInfo, 0, info(0xFF, 0xFF)), 3,
         false},
        {"inventory of nothing for ever", Answer(ipmi::kReadFruData, 0, {0}), 3, true},
        {"inventory of more than came", Answer(ipmi::kReadFruData, 0, {0xFF, 'A', 'B'}), 3, true},
        {"one record for ever", Answer(ipmi::kGetSelEntry, 0, toItself), 1, false},
        {"records of nothing", Answer(ipmi::kGetSelEntry, 0, toNowhere), 0, false},
        {"sensors of nothing", Answer(ipmi::kGetSdr, 0, toNowhere), 3, false},
    };
    nodes[0].sdrRecords = {FullSensor(1, 0x30, 7, 1, "Ambient")};
    nodes[0].fru = {{0, FixedLayout("Maker", "Board", "S-0")}};
    for (const auto& c : cases) {
        nodes[0].faults = {c.fault};
        CollectAll();
        EXPECT_THAT(Sensors(), SizeIs(c.exported)) << c.what;
        EXPECT_EQ(NQORTQR20::GetCompleteness()[0].Whole(), c.whole) << c.what;
    }
}

}  // namespace
}  // namespace ipmiseltest
