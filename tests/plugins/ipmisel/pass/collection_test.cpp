#include "plugins/ipmisel/pass/collection.h"

#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>

#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/records/sdr_entry.h"
#include "plugins/ipmisel/requests/request_aux_log.h"
#include "plugins/ipmisel/requests/request_sdr.h"
#include "plugins/ipmisel/requests/request_sel.h"
#include "plugins/ipmisel/requests/request_vpd.h"
#include "tests/support/machine_fixture.h"

namespace {
int gRefusals = 0;  // so many allocations fail that have gRefusedSize
std::size_t gRefusedSize = 0;
std::size_t gArmingSize = 0;  // none fails before one of this size, where it is not 0
std::size_t gLastSize = 0;    // of the allocation before
}  // namespace

// Not inlined: the compiler would take the two for a pair that does not match.
[[gnu::noinline]] void* operator new(std::size_t size) {
    gLastSize = size;
    if (size == gArmingSize) gArmingSize = 0;
    if (gRefusals > 0 && gArmingSize == 0 && size == gRefusedSize) {
        --gRefusals;
        throw std::bad_alloc();
    }
    if (void* const memory = std::malloc(size == 0 ? 1 : size)) return memory;
    throw std::bad_alloc();
}
[[gnu::noinline]] void operator delete(void* memory) noexcept { std::free(memory); }
[[gnu::noinline]] void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }

namespace ipmiseltest {
namespace {

using namespace ::testing;

constexpr const char* kLog = "QORSG_IPMILogRecord";
constexpr const char* kAux = "QORSG_ZMCAuxDebugRecord";
constexpr const char* kFru = "QORSG_IPMIFRU";

using ipmi::kGetSdr;
using ipmi::kGetSdrRepositoryInfo;
using ipmi::kGetSelEntry;
using ipmi::kGetSelInfo;

class Pass : public MachineTest {
protected:
    Pass() {
        nodes[0].selEntries = {SystemEvent(1, 0x01, 0x30), SystemEvent(2, 0x01, 0x31),
                               SystemEvent(3, 0x01, 0x30)};
        nodes[0].sdrRecords = {FullSensor(1, 0x30, 0x07, 1, "Ambient"),
                               FullSensor(2, 0x31, 0x03, 2, "CPU 2")};
    }
    ~Pass() override { gRefusals = 0; }

    /// Of the lines of this pass those that are in `wanted`, in the order in which they came.
    std::vector<std::string> Order(const std::vector<std::string>& wanted) const {
        std::vector<std::string> found;
        for (const auto& [severity, line] : log.All()) {
            if (std::find(wanted.begin(), wanted.end(), line) != wanted.end()) {
                found.push_back(line);
            }
        }
        return found;
    }
};

TEST_F(Pass, TellsOfItsStepsInOrder) {
    facts.machineType = "SIM-1";
    facts.integratedBmc = true;
    facts.smbios.push_back(OemStrings({"CPLD 2"}));
    const std::vector<std::string> expected{
        "Getting IPMI SEL data.",
        "getMachineType() entered.",
        "getMachineType() completed.",
        "Machine Type is:",
        "SIM-1",
        "Preparing to find type 38 for BMC.",
        "Found a Type 38 SMBIOS BMC record",
        "Successfully found type 38 for BMC. or support ipmi lan",
        "IPMISel:Discover BMC nodes number: 1",
        "This machine has CPLD.",
        "This machine doesn't have FPGA.",
        "This machine has AMI backplane.",
        "Found matching BMC machine type",
        "BMC machine type index=0",
        "Dev_Types Iter=CPU Card, CPU, System Board, Memory Card 1, Power Supply 1, Power Supply 2",
        "Getting log records.",
        "IPMIRequestSEL::IPMIGetSELInfo() completed.",
        "IPMIRequestSEL::IPMIGetSELEntry() completed.",
        "IPMIRequestSDR::IPMIGetSDREntry() completed.",
        "Printing out the SDR buffer...",
        "CreateSDRCache() function completed.",
        "FillSELArray() function completed.",
        "num_SELentries = 3",
        "num_AuxLogEntries = 0",
        "Leaving ParseExtendedSELData.",
        "ExportSEL() function complete.",
        "Completed all collecting and exporting of SEL/SDR.",
        "DeleteSDRCacheSDRCache() function completed.",
        "Finished getting IPMI SEL data.",
    };
    EXPECT_EQ(Collect({kLog}), 0);
    EXPECT_EQ(Order(expected), expected);
    EXPECT_THAT(Written("SensorInformation"), ElementsAre("Ambient", "CPU 2", "Ambient"));

    // What is settled once is not told of again.
    const std::vector<std::string> once{"Machine Type is:", "Preparing to find type 38 for BMC.",
                                        "Found a Type 38 SMBIOS BMC record"};
    EXPECT_EQ(Collect({kLog}), 0);
    EXPECT_THAT(Order(once), IsEmpty());
    EXPECT_EQ(written.instances.size(), 6U);
}

TEST_F(Pass, WithoutABmcCollectsNothingAndLooksAgainNextTime) {
    facts.smbios.clear();
    nodes.clear();
    for (int pass = 0; pass < 2; ++pass) {
        EXPECT_EQ(Collect({kLog, kFru}), 0);
        EXPECT_EQ(log.Lines(3).back(), "Did NOT find a Type 38 SMBIOS BMC record");
    }
    EXPECT_THAT(written.instances, IsEmpty());
    nodes.resize(1);
    facts.ipmiLan = true;  // over the network SMBIOS does not matter
    EXPECT_EQ(Collect({kLog}), 0);
    EXPECT_THAT(log.Lines(3), Not(Contains("Did NOT find a Type 38 SMBIOS BMC record")));
    EXPECT_TRUE(Logged(3, "Finished getting IPMI SEL data."));
}

TEST_F(Pass, PassesOverNamesThatItDoesNotKnow) {
    EXPECT_EQ(Collect({"QORSG_IPMILogRecords", "", nullptr, "qorsg_ipmilogrecord"}), 0);
    EXPECT_THAT(requests, IsEmpty());
    const NQORTQR20::OutputHandle output(written);
    EXPECT_EQ(IPMISELGetData(context.get(), output.get(), nullptr, 3).code, 0);
}

TEST_F(Pass, MachineWithoutDevicesSaysSo) {
    for (const std::string type : {"", "Merrowgate"}) {
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        facts.machineType = type;
        Collect({});
        EXPECT_TRUE(Logged(3,
                           "Could not find vital product data Device list for Baseboard "
                           "Management Controller machine" +
                               (type.empty() ? "." : " on " + type)));
        EXPECT_TRUE(Logged(4, "Dev_Types Iter="));
    }
}

TEST_F(Pass, SelInfoIsAskedForTwice) {
    nodes[0].faults = {NoResponse(kGetSelInfo, 1)};
    EXPECT_EQ(Collect({kLog}), 0);
    EXPECT_EQ(written.instances.size(), 3U);

    nodes[0].faults.push_back(CompletionCode(kGetSelInfo, 2, 0xC0));
    EXPECT_EQ(Collect({kLog}), 3);
    EXPECT_EQ(Sent(kGetSelInfo), 4);
    EXPECT_TRUE(Logged(1, "Failed to communicate with BMC. This machine could be non-BMC."));
    EXPECT_FALSE(Logged(3, "Finished getting IPMI SEL data."));
    EXPECT_EQ(written.instances.size(), 3U);
}

TEST_F(Pass, WhatIsReadBeforeAFailureIsUsed) {
    const std::string sensors = "Could not collect all sensor data records\n";
    const std::string records = "Failed to fill all the entries into SEL array.\n";
    const std::tuple<ipmisim::Fault, int, std::string, std::vector<std::string>> cases[] = {
        {NoResponse(kGetSdrRepositoryInfo, 1), 0, sensors, {"", "", ""}},
        // The header of the second, and its units.
        {CompletionCode(kGetSdr, 4, 0xC5), 0, sensors, {"Ambient", "", "Ambient"}},
        {CompletionCode(kGetSdr, 5, 0xC5), 0, sensors, {"Ambient", "", "Ambient"}},
        {NoResponse(kGetSelEntry, 1), 1, records, {}},
        {NoResponse(kGetSelEntry, 3), 1, records, {"Ambient", "CPU 2"}},
        {CompletionCode(kGetSelEntry, 2, 0xCB), 1, records, {"Ambient"}},
    };
    for (const auto& [fault, severity, line, names] : cases) {
        written.instances.clear();
        nodes[0].faults = {fault};
        EXPECT_EQ(Collect({kLog}), 0);
        EXPECT_TRUE(Logged(severity, line));
        EXPECT_EQ(Logged(1, "No SDR data obtained.\n"),
                  fault.command == kGetSdrRepositoryInfo.number);
        EXPECT_TRUE(Logged(4, "num_SELentries = 3"));
        EXPECT_EQ(Written("SensorInformation"), names);
    }
}

TEST_F(Pass, RunsEverySectionForEveryNode) {
    nodes.push_back(nodes[0]);
    nodes[1].selEntries.resize(1);
    EXPECT_EQ(Collect({kLog}), 0);
    EXPECT_THAT(Written("SourceNode"), ElementsAre("1", "1", "1", "2"));
    EXPECT_TRUE(Logged(3, "IPMISel:Discover BMC nodes number: 2"));
}

TEST_F(Pass, SecondLogClassReadsTheLogAnewAndKeepsTheSensors) {
    EXPECT_EQ(Collect({kAux, kLog}), 0);
    EXPECT_EQ(Sent(kGetSelEntry), 6);
    EXPECT_EQ(Sent(kGetSdr), 6);
    EXPECT_THAT(Written("SensorInformation"), ElementsAre("Ambient", "CPU 2", "Ambient"));

    // It goes on where the sensors broke off, here with the header of the second record.
    written.instances.clear();
    nodes[0].faults = {CompletionCode(kGetSdr, 4, 0xC3)};
    EXPECT_EQ(Collect({kAux, kLog}), 0);
    EXPECT_THAT(Written("SensorInformation"), ElementsAre("Ambient", "CPU 2", "Ambient"));
}

TEST_F(Pass, AuxiliaryLogStatusMayFail) {
    EXPECT_EQ(Collect({kAux}), 0);
    EXPECT_TRUE(Logged(3, "Getting Aux Log Records."));
    EXPECT_TRUE(Logged(1, "IPMIGetAuxLogStatus() returned Error."));
    EXPECT_THAT(written.instances, IsEmpty());

    nodes[0].auxLogCount = 7;
    EXPECT_EQ(Collect({kAux}), 0);
    EXPECT_TRUE(Logged(4, "num_AuxLogEntries = 7"));
    EXPECT_FALSE(Logged(1, "IPMIGetAuxLogStatus() returned Error."));
}

TEST_F(Pass, FruAndFirmwareAreReadInBandOnly) {
    const std::tuple<const char*, const char*> cases[] = {
        {kFru, "Getting VPD records."},
        {"QORSG_IPMIFirmwareElement", "Getting BMC firmware data."},
        {"QORSG_CPLDFirmwareElement", "Getting CPLD firmware data."},
        {"QORSG_FPGAFirmwareElement", "Getting FPGA firmware data."},
        {"QORSG_AMIFirmwareElement", "Getting AMI backplane firmware data."},
    };
    for (const auto& [className, line] : cases) {
        ipmisel::Module().ipmifruonce = false;
        facts.ipmiLan = true;
        EXPECT_EQ(Collect({className}), 0);
        EXPECT_FALSE(Logged(3, line));
        facts.ipmiLan = false;
        EXPECT_EQ(Collect({className}), 0);
        EXPECT_TRUE(Logged(3, line));
    }
}

/// What a shared pointer takes beside the object that it takes over.
std::size_t SizeOfSharing() {
    const std::shared_ptr<IPMIRequestAuxLog> shared = std::make_unique<IPMIRequestAuxLog>(nullptr);
    return gLastSize;
}

TEST_F(Pass, ObjectThatCannotBeCreatedEndsThePass) {
    const struct {
        std::size_t size;
        const char* name;
        int status = 4;
        int refusals = 100;
        std::size_t armingSize = 0;
    } cases[] = {
        {sizeof(IPMIVPDEntry), "fIpmiVpdentryFru", 3, 1},  // its line may have that size, too
        {sizeof(IPMIRequestSDR), "ipmi_sdrp"},
        {sizeof(IPMIRequestSEL), "ipmi_sdrp"},
        {sizeof(IPMIRequestVPD), "ipmi_vpdp"},
        {sizeof(IPMIRequestAuxLog), "ipmi_auxlogp"},
        {SizeOfSharing(), "ipmi_auxlogp", 4, 100, sizeof(IPMIRequestAuxLog)},
        {sizeof(IPMISDREntry), "ipmi_sdr_headp"},
    };
    Collect({});
    for (const auto& c : cases) {
        OpenMachine();
        log.Clear();
        const NQORTQR20::OutputHandle output(written);
        gRefusedSize = c.size;
        gArmingSize = c.armingSize;
        gRefusals = c.refusals;
        const int status = IPMISELGetData(context.get(), output.get(), nullptr, 0).code;
        gRefusals = 0;
        EXPECT_EQ(status, c.status);
        EXPECT_THAT(log.Lines(0),
                    ElementsAre(std::string("Could not allocate memory for ") + c.name + "."));
        EXPECT_EQ(ipmisel::Module().fIpmiVpdentryFru, nullptr);
    }
}

TEST_F(Pass, TraceLinesForWhichThereIsNoMemoryAreLost) {
    constexpr const char* kName = "IPMIRequestSEL::IPMIGetSELInfo()";
    gRefusedSize = std::strlen(kName) + 1;
    gRefusals = 2;
    { const ipmisel::TraceScope trace(kName); }
    EXPECT_EQ(gRefusals, 0);
    EXPECT_THAT(log.Lines(4), IsEmpty());
}

}  // namespace
}  // namespace ipmiseltest
