#include "plugins/ipmisel/pass/sections.h"
#include "tests/support/machine_fixture.h"

namespace ipmiseltest {
namespace {

using namespace ::testing;
using Bytes = ipmisim::Bytes;
using Lines = std::vector<std::string>;

constexpr const char* kBmc = ipmisel::kBmcFirmwareClass;
constexpr const char* kCpld = ipmisel::kCpldFirmwareClass;
constexpr const char* kFpga = ipmisel::kFpgaFirmwareClass;
constexpr const char* kBackplane = ipmisel::kBackplaneFirmwareClass;

class FirmwareSection : public MachineTest {
protected:
    FirmwareSection() {
        facts.machineType = "SIM-1";
        facts.integratedBmc = true;
        nodes[0].deviceId = {0x20, 0x01, 0x02, 0x05, 0x02, 0xBF, 0xD9, 0x7E,
                             0x00, 0x34, 0x12, 0x00, 0x00, 0x0A, 0xBC};
        nodes[0].replies = {{0x3A, 0x91, {0x00}, {0, 1, 7}},
                            {0x3A, 0x92, {0x00}, {0, 0x2C}},
                            {0x3A, 0x93, {0x00}, {0, 1, 4, 2}},
                            {0x3A, 0x93, {0x01}, {0, 1, 4, 3}}};
    }
    /// What one section does in a process of its own: its lines at severities 1 and 3, each after
    /// its severity, then the versions that it writes.
    Lines Story(const char* className) {
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        written.instances.clear();
        EXPECT_EQ(Collect({className}), 0);
        Lines story;
        for (const auto& [severity, text] : log.All()) {
            if (text.starts_with("Getting ")) story.clear();
            if (severity != 1 && severity != 3) continue;
            story.push_back(std::to_string(severity));
            story.back() += " " + text;
        }
        EXPECT_EQ(story.back(), "3 Finished getting IPMI SEL data.");
        story.pop_back();
        story.erase(story.begin());
        for (const std::string& version : Written("VersionString")) story.push_back(version);
        return story;
    }
    /// An instance as "name=value; " for every property.
    std::string Told(std::size_t number) const {
        std::string told;
        for (const auto& [name, value] : written.instances[number].properties) {
            told += name;
            told += "=" + std::get<std::string>(value) + "; ";
        }
        return told;
    }
};

TEST_F(FirmwareSection, InstancesTellWhatWasRead) {
    EXPECT_EQ(Collect({kBmc, kCpld, kFpga, kBackplane}), 0);
    ASSERT_EQ(written.instances.size(), 5U);
    EXPECT_EQ(Told(0),
              "CreationClassName=QORSG_IPMIFirmwareElement; Name=BMC; Manufacturer=32473; "
              "VersionString=2.05; MajorVersion=2; MinorVersion=05; Revision=00000ABC; "
              "IdentifyingNumber=Device ID 0x20, Product ID 0x1234; ");
    EXPECT_EQ(Told(1),
              "CreationClassName=QORSG_CPLDFirmwareElement; Name=CPLD; "
              "VersionString=CPLD version - 1.7; ");
    EXPECT_EQ(Told(4),
              "CreationClassName=QORSG_AMIFirmwareElement; Name=AMI backplane; "
              "VersionString=1.4.3; IdentifyingNumber=BusID 1; ");
    EXPECT_EQ(written.instances[3].className, kBackplane);

    nodes.push_back(nodes[0]);
    nodes[0].deviceId.reset();
    ipmisel::Module().gPass = 0;  // counts the nodes anew
    written.instances.clear();
    EXPECT_EQ(Collect({kBmc, kCpld}), 0);
    EXPECT_THAT(Written("Name"), ElementsAre("Node 0 : CPLD", "Node 1 : BMC", "Node 1 : CPLD"));
}

TEST_F(FirmwareSection, BuildOfTheBmcMayComeFromSmbios) {
    const std::string noBuild =
        "1 IPMIGetBMCBuildInfo:error Could not obtain BMC build information.\n";
    const std::string noFirmware = "1 Could not obtain BMC firmware information.\n";
    const auto firmware = [](std::uint8_t major, std::uint8_t minor) {
        return SmbiosStructure(
            0, {1, 2, 0, 0xF0, 3, 0xFF, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1, 8, major, minor}, {"x"});
    };
    Bytes shorter = firmware(3, 12);
    shorter[1] -= 1;  // the minor release is no part of the formatted area
    const struct {
        std::size_t answered;
        Bytes smbios;
        Lines revision, story;
    } cases[] = {
        {15, firmware(3, 12), {"00000ABC"}, {"2.05"}},
        {14, firmware(3, 12), {"3.12"}, {"2.05"}},
        {14, firmware(0xFF, 12), {"(none)"}, {noBuild, "2.05"}},
        {14, firmware(3, 0xFF), {"(none)"}, {noBuild, "2.05"}},
        {14, shorter, {"(none)"}, {noBuild, "2.05"}},
        {5, firmware(3, 12), {"3.12"}, {"1 The device ID ends after 5 of 11 bytes.", "2.05"}},
        {3, firmware(3, 12), {}, {"1 The device ID ends after 3 of 11 bytes.", noFirmware}},
        {0, {}, {}, {"1 The device ID ends after 0 of 11 bytes.", noBuild, noFirmware}},
    };
    const Bytes whole = *nodes[0].deviceId;
    for (const auto& c : cases) {
        nodes[0].deviceId->assign(whole.begin(), whole.begin() + static_cast<int>(c.answered));
        facts.smbios = {IpmiDeviceStructure(), c.smbios};
        EXPECT_EQ(Story(kBmc), c.story) << c.answered;
        EXPECT_EQ(Written("Revision"), c.revision) << c.answered;
    }
    for (const std::uint8_t id : {0x00, 0xFF}) {  // unspecified, and reserved
        nodes[0].deviceId = Bytes{0x20, 0, 0x02, 0x05, 0, 0, id, id, id, id, id};
        Story(kBmc);
        EXPECT_THAT(Written("Manufacturer"), ElementsAre("(none)"));
        EXPECT_THAT(Written("IdentifyingNumber"), ElementsAre("Device ID 0x20"));
    }
}

TEST_F(FirmwareSection, VersionsThatCannotBeHadAreNotMadeUp) {
    const std::string could = "Could not obtain ";
    const std::string here = " for this instance.\n";
    const std::string unknown = "CPLD version - Unknown CPLD";
    const std::string page =
        "3 This is Zorvanek, call netfn 0x3A, cmd 0x90, and read property page.\n";
    const Lines noCpld{"3 " + could + "CPLD information" + here, unknown};
    const Lines noOffsets{"1 " + could + "CPLD offsets" + here, unknown};
    const Lines noBuild{page, "3 " + could + "FPGA build_id" + here};
    const Lines oneBackplane{
        "3 Could not create the instance for BusID[0] information for AMI backplane.\n",
        "3 Got BusID[1] information for AMI backplane.\n", "1.4.3"};
    const struct {
        const char *className, *machineType;
        ipmisim::FixedReply reply;
        Lines story;
    } cases[] = {
        {kCpld, "other", {}, noCpld},
        {kCpld, "SIM-1", {}, noCpld},
        {kCpld, "SIM-1", {0x3A, 0x91, {0}, {0, 1}}, noOffsets},
        {kFpga, "other", {}, {"3 " + could + "FPGA information" + here}},
        {kFpga, "SIM-1", {0x3A, 0x92, {0}, {0}}, {"1 " + could + "FPGA offsets" + here}},
        {kFpga, "Zorvanek", {0x3A, 0x90, {}, {'B', '7', 0}}, {page, "FPGA Revision - B7"}},
        {kFpga, "Zorvanek", {0x3A, 0x90, {}, {0, 'x'}}, noBuild},
        {kFpga, "Zorvanek", {}, noBuild},
        {kBackplane, "SIM-1", {0x3A, 0x93, {1}, {0, 1, 4, 3}}, oneBackplane},
        {kBackplane, "other", {}, {}},
    };
    for (const auto& c : cases) {
        facts.machineType = c.machineType;
        nodes[0].replies = {c.reply};
        EXPECT_EQ(Story(c.className), c.story) << c.machineType << " " << c.className;
    }
    facts.integratedBmc = false;  // knows no backplane
    facts.machineType = "SIM-1";
    requests.clear();
    EXPECT_THAT(Story(kBackplane), IsEmpty());
    EXPECT_THAT(requests, IsEmpty());
}

}  // namespace
}  // namespace ipmiseltest
