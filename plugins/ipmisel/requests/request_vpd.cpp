#include "plugins/ipmisel/requests/request_vpd.h"

#include <algorithm>
#include <utility>

#include "base/hex.h"
#include "base/text.h"
#include "ipmi/command.h"

using namespace ipmisel;

namespace ipmisel {
namespace {

// Where the fields of the answer end.
constexpr std::size_t kVersionEnd = 4;
constexpr std::size_t kManufacturerEnd = 9;
constexpr std::size_t kProductEnd = 11;
constexpr std::size_t kAuxiliaryEnd = 15;

constexpr std::uint8_t kMajorVersion = 0x7F;       // bit 7 tells of an update in progress
constexpr std::uint32_t kManufacturer = 0x0FFFFF;  // 20 bits

constexpr IPMICommand kGetDeviceID{
    .netFn = ipmi::kGetDeviceId.netFn,
    .command = ipmi::kGetDeviceId.number,
    .sendFailure = "Failure in sending command to obtain BMC firmware information.",
    .errorPrefix = "IPMI error in obtaining BMC firmware information: ",
    .errorSeverity = kNotice};

/// How the log speaks of a family's commands.
IPMICommand CommandOf(const FirmwareQuery& query) {
    IPMICommand command{.netFn = query.netFn, .command = query.command, .errorSeverity = kNotice};
    switch (query.kind) {
        case FirmwareKind::kCpld:
            command.sendFailure = "Failure in sending command to obtain CPLD information.";
            command.errorPrefix = "IPMI error in obtaining CPLD information: ";
            break;
        case FirmwareKind::kFpga:
            command.sendFailure = "Failure in sending command to obtain FPGA information.";
            command.errorPrefix = "IPMI error in obtaining FPGA information: ";
            break;
        case FirmwareKind::kBackplane:
            command.sendFailure = "Failure in sending command to obtain AMI backplane information.";
            command.errorPrefix = "IPMI error in obtaining AMI backplane information: ";
            break;
    }
    return command;
}

/// The numbers with dots between.
std::string Dotted(std::span<const std::uint8_t> bytes) {
    std::string text;
    for (const std::uint8_t byte : bytes) text += Format(text.empty() ? "%u" : ".%u", byte);
    return text;
}

/// The characters up to a NUL that can be shown; empty when none can be seen.
std::string ShownText(std::span<const std::uint8_t> bytes) {
    const std::string text(bytes.begin(), std::find(bytes.begin(), bytes.end(), 0));
    return isPrintable(text) ? GetPrintableString(text) : std::string();
}

}  // namespace

std::optional<DeviceID> ReadDeviceID(std::span<const std::uint8_t> answer) {
    if (answer.size() < kVersionEnd) return std::nullopt;
    ByteReader in(answer);
    DeviceID device;
    device.deviceId = in.U8();
    in.Skip(1);  // device revision
    device.majorVersion = in.U8() & kMajorVersion;
    device.minorVersion = in.U8();
    in.Skip(2);  // IPMI version, device support
    const std::uint32_t manufacturer = in.U24();
    const std::uint16_t product = in.U16();
    if (answer.size() >= kManufacturerEnd) device.manufacturer = manufacturer & kManufacturer;
    if (answer.size() >= kProductEnd) device.product = product;
    if (answer.size() >= kAuxiliaryEnd) {
        std::uint32_t revision = 0;
        for (std::size_t i = kProductEnd; i < kAuxiliaryEnd; ++i)
            revision = revision << 8 | answer[i];
        device.auxiliaryRevision = revision;
    }
    return device;
}

std::string VersionText(const FirmwareQuery& query, std::span<const std::uint8_t> answer) {
    if (answer.size() < std::size_t{query.versionAt} + query.versionLength) return {};
    const auto rest = answer.subspan(query.versionAt);
    const auto version = query.versionLength == 0 ? rest : rest.first(query.versionLength);
    switch (query.form) {
        case VersionForm::kMajorMinor:
            return Dotted(version);
        case VersionForm::kHex:
            return HexText(version, HexCase::kUpper);
        case VersionForm::kText:
            return ShownText(version);
    }
    return {};
}

}  // namespace ipmisel

IPMIRequestVPD::IPMIRequestVPD(NQORTQR20::SPLibrary* transport)
    : IPMIMessage(transport), fruRequest_(transport) {}

std::span<const std::uint8_t> IPMIRequestVPD::Answer() const {
    const auto response = Response();
    return response.empty() ? response : response.subspan(1);
}

unsigned IPMIRequestVPD::IPMIGetDeviceID(NQORTQR20::TCPluginCallbacks* /*context*/,
                                         DeviceID* device) {
    TraceScope trace("IPMIRequestVPD::IPMIGetDeviceID()");
    if (Exchange(kGetDeviceID) != kOk) return trace.Fail();
    const auto answer = Answer();
    if (LogEnabled(kTrace)) {
        WriteLog(kTrace, "IPMIGetDeviceID::rspBuf = " + DumpBytes(answer, Digits::kUpperHex));
    }
    if (answer.size() < kProductEnd) {
        WriteLog(kWarning,
                 Format("The device ID ends after %zu of %zu bytes.", answer.size(), kProductEnd));
    }
    const auto read = ReadDeviceID(answer);
    if (!read) return trace.Fail();
    *device = *read;
    return kOk;
}

unsigned IPMIRequestVPD::IPMIGetFirmwareVersion(NQORTQR20::TCPluginCallbacks* /*context*/,
                                                const FirmwareQuery& query, std::string* version) {
    TraceScope trace("IPMIRequestVPD::IPMIGetFirmwareVersion()");
    if (Exchange(CommandOf(query), query.request) != kOk) return trace.Fail();
    const auto answer = Answer();
    if (LogEnabled(kTrace)) {
        WriteLog(kTrace,
                 "IPMIGetFirmwareVersion::rspBuf = " + DumpBytes(answer, Digits::kUpperHex));
    }
    std::string text = VersionText(query, answer);
    if (text.empty()) {
        trace.Fail();
        return kEndOfData;
    }
    *version = std::move(text);
    return kOk;
}

unsigned IPMIRequestVPD::IPMIGetVPDEntryData(NQORTQR20::TCPluginCallbacks* context,
                                             const VpdDevice& device, IPMIFRULocator* data) {
    TraceScope trace("IPMIRequestVPD::IPMIGetVPDEntryData()");
    data->SetFRUDevIDSlaveAddr(device.fruDevice);
    if (fruRequest_.IPMIGetFRUData(context, data, device.fruDevice == 0) != kOk) {
        return trace.Fail();
    }
    return kOk;
}
