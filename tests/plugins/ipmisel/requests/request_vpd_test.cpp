#include "plugins/ipmisel/requests/request_vpd.h"

#include "tests/support/bmc_fixture.h"

namespace {

using namespace ipmisel;
using ::testing::ElementsAre;
using Bytes = ipmisim::Bytes;

constexpr std::uint8_t kNoAnswer = 0;

class RequestVpd : public ipmiseltest::BmcTest {
protected:
    const Bytes whole{0x20, 0x81, 0x82, 0x15, 0x02, 0xBF, 0xD9, 0x7E,
                      0xF0, 0x34, 0x12, 0xA1, 0xB2, 0xC3, 0xD4};
    DeviceID device;
    std::string version = "as before";

    unsigned Ask() {
        log.Clear();
        return IPMIRequestVPD(FreshLibrary()).IPMIGetDeviceID(nullptr, &device);
    }
    unsigned Ask(const FirmwareQuery& query) {
        log.Clear();
        return IPMIRequestVPD(FreshLibrary()).IPMIGetFirmwareVersion(nullptr, query, &version);
    }
    void Break(std::uint8_t netFn, std::uint8_t command, std::uint8_t completionCode) {
        ipmisim::Fault fault;
        fault.netFn = netFn;
        fault.command = command;
        fault.completionCode = completionCode;
        if (completionCode != kNoAnswer) fault.kind = ipmisim::Fault::Kind::kCompletionCode;
        bmc.faults = {fault};
    }
};

TEST_F(RequestVpd, DeviceIdTellsAsMuchAsItHolds) {
    for (std::size_t length = 0; length <= whole.size(); ++length) {
        bmc.deviceId = Bytes(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(length));
        device = {};
        EXPECT_EQ(Ask(), length < 4 ? kFailed : kOk) << length;
        EXPECT_EQ(log.Lines(kWarning).size(), length < 11 ? 1U : 0U) << length;
        EXPECT_EQ(device.minorVersion, length < 4 ? 0 : 0x15);
        EXPECT_EQ(device.manufacturer.value_or(0), length < 9 ? 0U : 32473U) << length;
        EXPECT_EQ(device.product.value_or(0), length < 11 ? 0 : 0x1234) << length;
        EXPECT_EQ(device.auxiliaryRevision.value_or(0), length < 15 ? 0U : 0xA1B2C3D4U) << length;
    }
    EXPECT_EQ(device.deviceId, 0x20);
    EXPECT_EQ(device.majorVersion, 2) << "without the bit of an update in progress";
    EXPECT_EQ(Frames()[0], "01 20 06 00 01 00 00 00 00 00 00 00 00 00 00 ");
    bmc.deviceId->resize(5);
    Ask();
    EXPECT_THAT(log.Lines(kWarning), ElementsAre("The device ID ends after 5 of 11 bytes."));
}

TEST_F(RequestVpd, VersionStandsWhereTheQuerySays) {
    const struct {
        std::uint8_t at, length;
        VersionForm form;
        Bytes answer;
        std::string text;
    } cases[] = {
        {1, 2, VersionForm::kMajorMinor, {9, 1, 7, 8}, "1.7"},
        {1, 2, VersionForm::kMajorMinor, {9, 255, 0}, "255.0"},
        {1, 2, VersionForm::kMajorMinor, {9, 1}, ""},
        {1, 2, VersionForm::kHex, {9, 0x0A, 0xC0}, "0AC0"},
        {2, 0, VersionForm::kHex, {9, 1, 0x2C, 0x00, 0xFF}, "2C00FF"},
        {0, 0, VersionForm::kText, {'R', ' ', '7', 0, 'x'}, "R 7"},
        {1, 3, VersionForm::kText, {'x', 'A', 0x07, 'B', 'C'}, "AB"},
        {0, 0, VersionForm::kText, {' ', 0x80, 0x01}, ""},
        {0, 0, VersionForm::kText, Bytes(300, 'a'), std::string(100, 'a')},
    };
    for (const auto& c : cases) {
        const FirmwareQuery query{
            FirmwareKind::kFpga, 0, 0x3A, 0x90, {}, c.at, c.length, c.form, false};
        EXPECT_EQ(VersionText(query, c.answer), c.text) << c.text;
    }
}

TEST_F(RequestVpd, FailuresAreToldApart) {
    const std::uint8_t request[] = {0x05, 0x06};
    const struct {
        FirmwareKind kind;
        std::string what;
    } cases[] = {{FirmwareKind::kCpld, "CPLD information"},
                 {FirmwareKind::kFpga, "FPGA information"},
                 {FirmwareKind::kBackplane, "AMI backplane information"}};
    for (const auto& [kind, what] : cases) {
        const FirmwareQuery query{kind, 0, 0x3A, 0x77, request, 1, 1, VersionForm::kHex, false};
        Break(0x3A, 0x77, kNoAnswer);
        EXPECT_EQ(Ask(query), kFailed);
        EXPECT_THAT(log.Lines(kError),
                    ElementsAre("Failure in sending command to obtain " + what + "."));
        Break(0x3A, 0x77, 0xC1);
        EXPECT_EQ(Ask(query), kFailed);
        EXPECT_THAT(log.Lines(kNotice),
                    ElementsAre("IPMI error in obtaining " + what + ": Invalid Command."));
        bmc.faults.clear();
        bmc.replies = {{0x3A, 0x77, {0x05, 0x06}, {0x01}}};
        EXPECT_EQ(Ask(query), kEndOfData);
        EXPECT_EQ(version, "as before");
    }
    EXPECT_EQ(Frames()[0], "01 20 3A 00 77 02 00 00 00 05 06 00 00 00 00 ");

    Break(0x06, 0x01, kNoAnswer);
    EXPECT_EQ(Ask(), kFailed);
    EXPECT_THAT(log.Lines(kError),
                ElementsAre("Failure in sending command to obtain BMC firmware information."));
    Break(0x06, 0x01, 0xD5);
    EXPECT_EQ(Ask(), kFailed);
    EXPECT_EQ(log.Lines(kNotice).size(), 1U);
}

}  // namespace
