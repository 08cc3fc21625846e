#include "plugins/ipmisel/requests/request_fru_locator.h"
#include "tests/support/fru_inventory.h"
#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;

constexpr const char* kFru = "QORSG_IPMIFRU";

class FruSection : public MachineTest {
protected:
    FruSection() {
        Now() = 1'700'000'000;
        ipmisel::Module().clock = [](std::time_t*) { return Now(); };
        nodes[0].sdrRecords = {FruLocator(1, 3, "PSU 1"), FruLocator(2, 4, "DC1"),
                               FruLocator(3, 5, "PSU 2")};
        nodes[0].fru = {{0, FixedLayout("Maker", "Board", "S-0")},
                        {3, FixedLayout("Maker", "Supply", "S-3")},
                        {4, FixedLayout("Maker", "Converter", "S-4")},
                        {5, Runs({"no", "fourth"})}};
    }
    static std::time_t& Now() {
        static std::time_t now;
        return now;
    }
    /// The names of the instances that a pass writes.
    std::vector<std::string> Names() {
        written.instances.clear();
        EXPECT_EQ(Collect({kFru}), 0);
        return Written("Name");
    }
};

TEST_F(FruSection, WritesDeviceZeroThenTheLocatedDevices) {
    EXPECT_THAT(Names(), ElementsAre("Board", "Supply"));
    EXPECT_THAT(Written("ElementName"), ElementsAre("(none)", "PSU 1"));
    EXPECT_THAT(log.Lines(3), Contains("Obtaining FRU Locator info."));
    EXPECT_FALSE(Logged(3, "Using hard-coded VPD info."));
    const auto trace = log.Lines(4);
    EXPECT_EQ(std::count(trace.begin(), trace.end(), "Number of FRU Locators is 3"), 2);
    EXPECT_THAT(trace, Contains("IPMISel: Exiting IPMISELGetDataZero"));
}

TEST_F(FruSection, InstancesAreKeptForTenMinutes) {
    EXPECT_THAT(Names(), ElementsAre("Board", "Supply"));
    nodes[0].fru[0] = FixedLayout("Maker", "Other board", "S-9");
    nodes[0].fru.erase(3);
    requests.clear();
    for (const int seconds : {0, 599, 1}) {
        Now() += seconds;
        EXPECT_THAT(Names(), ElementsAre("Board", "Supply")) << seconds;
    }
    EXPECT_THAT(requests, IsEmpty());
    Now() += 1;
    EXPECT_THAT(Names(), ElementsAre("Other board"));
    EXPECT_EQ(Collect({"QORSG_IPMIFirmwareElement"}), 0);
    EXPECT_THAT(Written("Name"), ElementsAre("Other board")) << "wanted by no one";
}

TEST_F(FruSection, NamesTellTheNodeWhereThereAreSeveral) {
    nodes.push_back(nodes[0]);
    nodes[1].fru[0] = FixedLayout("Maker", "Second board", "S-8");
    EXPECT_THAT(Names(), ElementsAre("Board", "Supply", "Second board", "Supply"));
    EXPECT_THAT(Written("ElementName"),
                ElementsAre("(none)", "Node 0 : PSU 1", "(none)", "Node 1 : PSU 1"));
    std::vector<std::string> told;
    for (const std::string& line : log.Lines(3)) {
        if (line.ends_with("ipmifruonce.") || line == "Getting VPD records.") told.push_back(line);
    }
    EXPECT_THAT(told, ElementsAre("Resetting ipmifruonce.", "Getting VPD records.",
                                  "Setting ipmifruonce.", "Getting VPD records."));
}

// A class that is named twice runs twice on every node but the last.
TEST_F(FruSection, ClassNamedTwiceIsWrittenOnce) {
    nodes.push_back(nodes[0]);
    EXPECT_EQ(Collect({kFru, kFru}), 0);
    EXPECT_EQ(written.instances.size(), 4U);
    EXPECT_EQ(ipmisel::Module().fIpmiVpdentryFru, nullptr);
}

// The time may run out between one node and the next.
TEST_F(FruSection, NodeThatIsNotCollectedAnewKeepsItsInstances) {
    nodes.push_back(nodes[0]);
    nodes[1].fru[0] = FixedLayout("Maker", "Second board", "S-8");
    Names();
    ipmisel::Module().clock = [](std::time_t*) { return Now() += 599; };
    nodes[1].fru[0] = FixedLayout("Maker", "Third board", "S-7");
    EXPECT_THAT(Names(), ElementsAre("Board", "Supply", "Third board", "Supply"));
}

TEST_F(FruSection, MachinesWithoutLocatedDevicesHaveAList) {
    facts.machineType = "SIM-1";
    nodes[0].sdrRecords = {FruLocator(2, 4, "DC1"), FruLocator(3, 5, "PSU 2")};
    nodes[0].fru[1] = FixedLayout("Maker", "Card", "S-1");
    Names();
    EXPECT_THAT(Written("ElementName"), ElementsAre("(none)", "CPU Card", "System Board",
                                                    "Memory Card 1", "Power Supply 1"));
    EXPECT_TRUE(Logged(3, "Using hard-coded VPD info."));
    EXPECT_THAT(Written("Status"), ElementsAre("(none)", "NORMAL", "NORMAL", "NORMAL", "NORMAL"));

    ipmisel::Module().ipmifruonce = false;
    nodes.push_back(nodes[0]);
    ipmisel::Module().gPass = 0;  // counts the nodes anew
    Names();
    EXPECT_THAT(Written("ElementName"), Contains("Node:1 CPU Card"));
}

TEST_F(FruSection, DeviceZeroNeedsAPass) {
    OpenMachine();
    const NQORTQR20::OutputHandle output(written);
    IPMIRequestFRULocator request(NQORTQR20::SPLibrary::GetSplibraryInstance(0));
    EXPECT_EQ(IPMISELGetDataZero(context.get(), output.get(), &request).code, 3);
    EXPECT_EQ(requests.size(), 16U) << "read first";
    ipmisel::Module().fIpmiVpdentryFru = std::make_unique<IPMIVPDEntry>();
    EXPECT_EQ(IPMISELGetDataZero(context.get(), output.get(), nullptr).code, 3);
    EXPECT_EQ(IPMISELGetDataZero(context.get(), output.get(), &request).code, 0);
    EXPECT_EQ(ipmisel::Module().fIpmiVpdentryFru->GetFruInstances().size(), 1U);
}

}  // namespace
}  // namespace ipmiseltest
