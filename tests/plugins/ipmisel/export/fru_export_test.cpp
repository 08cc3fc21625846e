#include "plugins/ipmisel/export/fru_export.h"

#include "tests/support/bmc_fixture.h"
#include "tests/support/fru_inventory.h"
#include "tests/support/spd_image.h"

namespace ipmiseltest {
namespace {

using ipmisel::FruNode;
using ipmisel::PropertyMap;
using namespace ::testing;

class FruExport : public BmcTest {
protected:
    using Instances = std::vector<PropertyMap>;

    FruNode node{nullptr, 0, 1};

    /// Runs an export with a request and a collector of its own.
    template <typename Export>
    Instances Run(Export run) {
        log.Clear();
        IPMIRequestFRULocator request(FreshLibrary());
        IPMIVPDEntry collector;
        run(&request, &collector);
        return collector.GetFruInstances();
    }
    Instances Zero(ipmisim::Bytes data) {
        bmc.fru[0] = std::move(data);
        return Run([&](auto* request, auto* collector) {
            ipmisel::ExportFruDeviceZero(nullptr, request, collector);
        });
    }
    Instances Located(const std::string& idString, ipmisim::Bytes data) {
        bmc.fru[3] = std::move(data);
        return Run([&](auto* request, auto* collector) {
            std::vector<IPMIFRULocator> locators(1);
            locators[0].SetFRUDevIDSlaveAddr(3);
            locators[0].SetIDString(idString);
            const bool any = ipmisel::ExportLocatedFrus(node, request, &locators, collector);
            EXPECT_EQ(any, !collector->GetFruInstances().empty());
        });
    }
    Instances Listed(const std::vector<ipmisel::VpdDevice>& devices) {
        NQORTQR20::SPLibrary library(std::make_unique<SimulatedTransport>(bmc, &requests));
        IPMIRequestVPD request(&library);
        IPMIVPDEntry collector;
        ipmisel::ExportListedFrus(node, &request, devices, &collector);
        return collector.GetFruInstances();
    }
};

TEST_F(FruExport, StringsBecomePropertiesByTheirPosition) {
    EXPECT_THAT(Zero(FixedLayout("Maker", "Board", "S-1")),
                ElementsAre(PropertyMap{{"Vendor", "Maker"},
                                        {"Name", "Board"},
                                        {"SerialNumber", "S-1"},
                                        {"FRUNumber", " "},
                                        {"IdentifyingNumber", " "}}));
    EXPECT_THAT(Located("PSU 1", Runs({"s0", "s1", "s2", "s3", "s4", "s5", "s6", "s7"})),
                ElementsAre(PropertyMap{{"ElementName", "PSU 1"},
                                        {"Vendor", "s3"},
                                        {"Name", "s4"},
                                        {"SerialNumber", "s5"},
                                        {"PartNumber", "s6"},
                                        {"FRUNumber", " "},
                                        {"IdentifyingNumber", " "}}));
}

TEST_F(FruExport, FourthStringDecides) {
    const std::pair<ipmisim::Bytes, std::size_t> cases[] = {
        {Runs({"s0", "s1", "s2", "s3"}), 1},  {Runs({"s0", "s1", "s2"}), 0},
        {FixedLayout("", "Board", "S-1"), 0}, {FixedLayout("  ", "Board", "S-1"), 0},
        {FixedLayout("Maker", "", ""), 1},    {{}, 0}};
    for (const auto& [data, instances] : cases) {
        EXPECT_EQ(Zero(data).size(), instances);
        EXPECT_EQ(Located("PSU", data).size(), instances);
    }
    EXPECT_THAT(Zero(FixedLayout("Maker", "", ""))[0], Contains(Pair("Name", " ")));
}

TEST_F(FruExport, WhatWasReadOfAFailingDeviceCounts) {
    auto data = FixedLayout("Maker", "Board", "Serial behind the end");
    data.resize(112);
    EXPECT_THAT(Located("PSU 1", data)[0], testing::AllOf(Contains(Pair("Name", "Board")),
                                                          Contains(Pair("SerialNumber", " "))));
}

TEST_F(FruExport, SomeLocatedDevicesAreNotRead) {
    const auto data = FixedLayout("Maker", "Board", "S");
    for (const char* skipped : {"BPE3", "BSE3", "HSDC", "DC1", "The Processor 2 FRU"}) {
        EXPECT_THAT(Located(skipped, data), IsEmpty());
        EXPECT_THAT(log.Lines(3),
                    ElementsAre(std::string("FRULocatorInstance.GetIDString() = ") + skipped,
                                "Skipping this VPD.\n"));
    }
    EXPECT_THAT(requests, IsEmpty());
    for (const char* kept : {"DC10", "xHSDC", "processor", ""}) {
        EXPECT_EQ(Located(kept, data).size(), 1U) << kept;
    }
    const auto lines = log.Lines(3);
    ASSERT_EQ(lines.size(), 35U) << "two lines a chunk";
    EXPECT_EQ(lines[32].substr(0, 54), "Current FRU Data: 00 00 00 00 00 00 00 00 00 00 01 25 ");
    EXPECT_EQ(lines[33], "FRULocatorInstance.GetIDString() = ");
    EXPECT_EQ(lines[34], "Adding this VPD.\n");
}

TEST_F(FruExport, MemoryModulesAreToldByTheirPresenceDetectData) {
    node = {nullptr, 1, 2};
    EXPECT_THAT(Located("DIMM 1", Ddr3Image()),
                ElementsAre(PropertyMap{{"ElementName", "Node 1 : DIMM 1"},
                                        {"Vendor", "Micron Technology"},
                                        {"SerialNumber", "A1B2C3D4"},
                                        {"PartNumber", "18JSF1G72PZ-1G6"},
                                        {"FRUNumber", " "},
                                        {"IdentifyingNumber", " "}}));
    EXPECT_THAT(Located("DIMM 2", Ddr4Image()), IsEmpty()) << "no strings of chance";
}

// Processors and their card are told when they have data, other devices when it has strings.
TEST_F(FruExport, ListedDevices) {
    auto processor = ipmisim::Bytes(256);
    processor[17] = 0x42;
    bmc.fru = {{0, FixedLayout("Maker", "Board", "S-0")}, {2, processor}, {4, processor}};
    const auto instances =
        Listed({{"CPU", 2, true}, {"System Board", 0}, {"Absent", 3}, {"Supply", 4}, {"CPU", 5}});
    EXPECT_THAT(instances, ElementsAre(PropertyMap{{"ElementName", "CPU"},
                                                   {"Status", "NORMAL"},
                                                   {"FRUNumber", " "},
                                                   {"IdentifyingNumber", " "}},
                                       PropertyMap{{"ElementName", "System Board"},
                                                   {"Vendor", "Maker"},
                                                   {"Name", "Board"},
                                                   {"SerialNumber", "S-0"},
                                                   {"Status", "NORMAL"},
                                                   {"FRUNumber", " "},
                                                   {"IdentifyingNumber", " "}}));
    node = {nullptr, 1, 2};
    EXPECT_EQ(Listed({{"CPU Card", 2, true}})[0][0].second, "Node:1 CPU Card");
}

}  // namespace
}  // namespace ipmiseltest
