#include "plugins/ipmisel/requests/ipmi_message.h"

#include <filesystem>
#include <functional>
#include <map>

#include "plugins/ipmisel/requests/diff_time.h"
#include "plugins/ipmisel/requests/request_aux_log.h"
#include "plugins/ipmisel/requests/request_sdr.h"
#include "plugins/ipmisel/requests/request_sel.h"
#include "tests/support/bmc_fixture.h"

namespace {

using namespace ipmisel;
using ::testing::ElementsAre;
using ::testing::Pair;

TEST(CompletionCodes, HaveTheirTexts) {
    const std::tuple<int, bool, const char*> cases[] = {
        {0x80, true, "Unknown error\n"},
        {0x81, true, "Cannot execute command, SEL erase in progress.\n"},
        {0x81, false, "Unknown error\n"},
        {0xBF, true, "Unknown error\n"},
        {0xC0, true, "Node Busy."},
        {0xC7, true, "Request data length"},
        {0xD4, true, "Cannot execute command. Insufficient privilege level."},
        {0xD6, true, "Unknown error\n"},
        {0xFF, true, "Unknown error\n"},
    };
    for (const auto& [code, eraseTextToo, text] : cases) {
        EXPECT_EQ(CompletionCodeText(static_cast<std::uint8_t>(code), eraseTextToo), text) << code;
    }
    EXPECT_EQ(IPMIMessage::GetNetFnLun(0x0A, 0x07), 0x2B);
}

class Exchange : public ipmiseltest::BmcTest {
protected:
    unsigned count = 77;
    s_SEL_row row = {};
    unsigned char info[kSdrInfoTextLength] = {};
    s_SDR_entry entry = {};
    NQORTQR20::TCIMDateTime difference;
    bool notBehind = false;

    unsigned SelInfo() { return IPMIRequestSEL(Library()).IPMIGetSELInfo(nullptr, &count); }
    unsigned AuxStatus() { return IPMIRequestAuxLog(Library()).IPMIGetAuxLogStatus(&count); }
};

/// A request of any length.
class AnyRequest : public IPMIMessage {
public:
    using IPMIMessage::IPMIMessage;
    unsigned Send(const std::vector<std::uint8_t>& data) {
        return Exchange({.netFn = 0x2E, .command = 0x10, .sendFailure = "not sent"}, data);
    }
};

TEST_F(Exchange, LongDataIsSentWholeOrNotAtAll) {
    AnyRequest request(Library());
    request.Send({1, 2, 3, 4, 5, 6, 7, 8});
    EXPECT_THAT(Frames(), ElementsAre("01 20 2E 00 10 08 00 00 00 01 02 03 04 05 06 07 08 "));
    EXPECT_EQ(requests[0].size(), 17U);
    request.Send(std::vector<std::uint8_t>(247, 0xEE));
    EXPECT_EQ(requests[1].size(), 256U);
    log.Clear();
    EXPECT_EQ(request.Send(std::vector<std::uint8_t>(248, 0xEE)), kFailed);
    EXPECT_EQ(requests.size(), 2U);
    EXPECT_THAT(log.All(), ElementsAre(Pair(0, "not sent")));
}

TEST_F(Exchange, SelInfoInFull) {
    bmc.faults = {ipmiseltest::Answer(ipmi::kGetSelInfo, 1, {0x51, 0x34, 0x12, 0xEE})};
    EXPECT_EQ(SelInfo(), kOk);
    EXPECT_EQ(count, 4660U);
    EXPECT_THAT(Frames(), ElementsAre("01 20 0A 00 40 00 00 00 00 00 00 00 00 00 00 "));
    EXPECT_THAT(log.All(), ElementsAre(Pair(4, "IPMIRequestSEL::IPMIGetSELInfo() entered."),
                                       Pair(4,
                                            "Contents of buffer to send (rspBuf):\n\t1 32 10 0 64 "
                                            "\n\t0 0 0 0 0 \n\t0 0 0 0 0 "),
                                       Pair(4, "IPMIGetSELInfo::tempbuf = 00 51 34 12 EE \n"),
                                       Pair(4, "IPMIGetSELInfo::num_SELentries = 4660"),
                                       Pair(4, "IPMIRequestSEL::IPMIGetSELInfo() completed.")));
}

TEST_F(Exchange, AuxLogStatusInFull) {
    bmc.auxLogCount = 0x1234;
    EXPECT_EQ(AuxStatus(), kOk);
    EXPECT_EQ(count, 4660U);
    const std::string name = "IPMIRequestAuxLog::IPMI";
    EXPECT_THAT(log.All(), ElementsAre(Pair(3, name + "RequestAuxLog() Constructor entered.\n"),
                                       Pair(3, name + "RequestAuxLog() Constructor exited.\n"),
                                       Pair(3, name + "GetAuxLogStatus() entered.\n"),
                                       Pair(4,
                                            "Contents of buffer to send (rspBuf):\n\t1 32 10 0 90 "
                                            "\n\t1 0 0 0 1 \n\t0 0 0 0 0 "),
                                       Pair(3,
                                            "IPMIRequestAuxLog::Response Length = 9\n"
                                            "rspBuf = 00 00 00 00 00 00 00 00 34 12 "),
                                       Pair(3, name + "GetAuxLogStatus() exited.\n")));
}

TEST_F(Exchange, WrongSelVersionFails) {
    bmc.selVersion = 0x02;
    EXPECT_EQ(SelInfo(), kFailed);
    EXPECT_EQ(count, 77U);
    EXPECT_THAT(log.Lines(kError),
                ElementsAre("The SEL Version does not match the Current IPMI Version\n"));
}

// No operation has a completed line when its command fails.
TEST_F(Exchange, EveryCommandReportsNoAnswerAndCompletionCodes) {
    const struct {
        ipmi::CommandCode command;
        std::function<unsigned()> run;
        std::string notSent;  // after "Failure in sending command to "
        std::string prefix;   // after "IPMI error in "
        bool erase;
    } cases[] = {
        {ipmi::kGetSelInfo, [&] { return SelInfo(); }, "obtain SEL info.",
         "obtaining system event log info: ", true},
        {ipmi::kGetSelEntry,
         [&] { return IPMIRequestSEL(Library()).IPMIGetSELEntry(nullptr, &row, 1); },
         "obtain SEL Entry.", "obtaining system event log entry: ", true},
        {ipmi::kGetSdrRepositoryInfo,
         [&] { return IPMIRequestSDR(Library()).IPMIGetSDRInfo(nullptr, info); },
         "obtain SDR info.", "obtaining sensor data record info: ", false},
        {ipmi::kReserveSdrRepository,
         [&] { return IPMIRequestSDR(Library()).IPMIReserveSDR(nullptr); }, "reserve SDR.",
         "reserving sensor data record: ", false},
        {ipmi::kGetSdr, [&] { return IPMIRequestSDR(Library()).IPMIGetSDRHeader(nullptr, &entry); },
         "obtain SDR Header.", "obtaining sensor data record header: ", false},
        {ipmi::kGetSdr, [&] { return IPMIRequestSDR(Library()).IPMIGetSDRUnits(nullptr, &entry); },
         "obtain SDR Units.", "obtaining sensor data record units: ", false},
        {ipmi::kGetSdr, [&] { return IPMIRequestSDR(Library()).IPMIGetSDRString(nullptr, &entry); },
         "obtain SDR String.", "obtaining sensor data record string: ", false},
        {ipmi::kGetAuxiliaryLogStatus, [&] { return AuxStatus(); }, "obtain AUX Log Status.",
         "obtaining system event log info: ", false},
        {ipmi::kGetSelTime,
         [&] { return GetDiffTime(nullptr, &difference, &notBehind, Library()); },
         "obtain system event log device time.", "obtaining system event log device time: ", false},
    };
    std::map<ipmi::CommandCode, unsigned> uses;
    for (const auto& c : cases) {
        unsigned& use = uses[c.command];
        Silence(c.command, ++use);
        FailWith(c.command, ++use, ipmi::kSelEraseInProgress);
        FailWith(c.command, ++use, ipmi::kReservationCanceled);
    }
    for (const auto& c : cases) {
        log.Clear();
        for (int i = 0; i < 3; ++i) EXPECT_EQ(c.run(), kFailed) << c.notSent;
        EXPECT_THAT(log.Lines(kError), ElementsAre("Failure in sending command to " + c.notSent));
        EXPECT_THAT(log.Lines(kWarning),
                    ElementsAre("IPMI error in " + c.prefix +
                                    (c.erase ? "Cannot execute command, SEL erase in progress.\n"
                                             : "Unknown error\n"),
                                "IPMI error in " + c.prefix +
                                    "Reservation Canceled or Invalid Reservation ID."));
        EXPECT_EQ(log.Lines(kTrace).back().find("Contents of buffer"), 0U) << c.notSent;
    }
    EXPECT_EQ(count, 0U) << "of the auxiliary log, whose operation clears it first";
    EXPECT_EQ(difference.ToString(), NQORTQR20::TCIMDateTime().ToString());
}

TEST_F(Exchange, DiffTimeComparesTheClocks) {
    const ipmiseltest::Machine now("", "20240305120304.000000+060");
    const struct {
        std::uint32_t raw;
        const char *bmcTime, *difference;
        bool notBehind;
    } cases[] = {{1709640184, "20240305120304.000000+060", "00000000000000.000000:000", true},
                 {1709640185, "20240305120305.000000+060", "00000000000001.000000:000", true},
                 {1709640123, "20240305120203.000000+060", "00000000000101.000000:000", false},
                 {0xFFFFFFFF, "19691231235959.000000+060", "00019787120305.000000:000", false}};
    for (const auto& c : cases) {
        bmc.selTime = c.raw;
        notBehind = !c.notBehind;
        log.Clear();
        EXPECT_EQ(GetDiffTime(nullptr, &difference, &notBehind, FreshLibrary()), kOk);
        EXPECT_EQ(difference.ToString(), c.difference);
        EXPECT_EQ(notBehind, c.notBehind);
        EXPECT_THAT(
            log.Lines(kTrace),
            ElementsAre("GetDiffTime entered.",
                        "Contents of buffer to send (rspBuf):\n\t1 32 10 0 72 "
                        "\n\t0 0 0 0 0 \n\t0 0 0 0 0 ",
                        "OSTime  = 20240305120304.000000+060",
                        "BMCTime raw = " + std::to_string(static_cast<int>(c.raw)),
                        std::string("BMCTime = ") + c.bmcTime,
                        std::string("DiffTime = ") + c.difference, "GetDiffTime completed."));
    }
    EXPECT_EQ(GetDiffTime(nullptr, nullptr, nullptr, nullptr), kFailed);
    EXPECT_THAT(log.Lines(kError),
                ElementsAre("Could not allocate memory for SPLibrary in DiffTime."));
}

TEST(DebugFiles, OpenAndClose) {
    const auto before = std::filesystem::current_path();
    std::filesystem::current_path(testing::TempDir());
    IPMIRequestSDR sdr(nullptr);
    EXPECT_EQ(sdr.IPMIOpenFile(nullptr), kOk);
    EXPECT_EQ(sdr.IPMICloseFile(nullptr), kOk);
    EXPECT_TRUE(std::filesystem::remove("sdr.out"));
    std::filesystem::current_path(before);
    ipmiseltest::LogRecorder log;
    EXPECT_EQ(sdr.IPMICloseFile(nullptr), kFailed);
    EXPECT_THAT(log.All(), ElementsAre(Pair(4, "IPMIRequestSDR::IPMICloseFile() entered."),
                                       Pair(0, "Could not close file SDR_FILE"),
                                       Pair(4, "Could not close file SDR_FILE")));
}

}  // namespace
