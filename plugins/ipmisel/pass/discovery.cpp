#include "plugins/ipmisel/pass/discovery.h"

#include <dlfcn.h>

#include <array>
#include <memory>
#include <new>
#include <string_view>
#include <vector>

#include "base/text.h"
#include "ipmi/smbios.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/pass/state.h"
#include "plugins/ipmisel/texts/machine_families.h"
#include "tqr/datetime.h"
#include "tqr/log.h"
#include "tqr/smbios.h"

using NQORTQR20::TCPluginCallbacks;
using NQORTQR20::TTQRStatusCode;

namespace ipmisel {
namespace {

enum StructureType : int {
    kFirmware = 0,
    kOnBoardDevices = 10,
    kOemStrings = 11,
    kOnBoardDevicesExtended = 41,
};

/// The host's SMBIOS reader, closed with the object.
class SmbiosReader {
public:
    explicit SmbiosReader(TCPluginCallbacks* context) {
        const NQORTQR20::TPluginManagerProvider* provider = nullptr;
        NQORTQR20::fdrGetHandle(context, &provider);
        loaded_ = NQORTQR20::smBiosLoad(provider, &handle_) == 0;
    }
    ~SmbiosReader() {
        if (loaded_) NQORTQR20::smBiosClose(&handle_);
    }
    SmbiosReader(const SmbiosReader&) = delete;
    SmbiosReader& operator=(const SmbiosReader&) = delete;

    bool ok() const { return loaded_ && handle_ != nullptr; }
    void* handle() const { return handle_; }

private:
    void* handle_ = nullptr;
    bool loaded_ = false;
};

constexpr std::size_t kStructureRoom = 4096;
constexpr std::size_t kLengthAt = 1;  // of the formatted area, which the strings follow

/// Whether one string of a structure contains the marker.
bool HasMarker(const unsigned char* structure, int length, std::string_view marker) {
    if (length <= static_cast<int>(kLengthAt) || structure[kLengthAt] >= length) return false;
    const unsigned char* const strings = structure + structure[kLengthAt];
    const int stringsLength = length - structure[kLengthAt];
    for (int index = 1;; ++index) {
        std::array<char, kStructureRoom> buffer{};
        if (IPMIselGetString(strings, buffer.data(), stringsLength, index) == 0) return false;
        const std::string_view text = BoundedView(buffer.data(), buffer.size());
        if (text.empty()) return false;  // the end of the string set
        if (text.find_first_not_of(' ') == std::string_view::npos) continue;
        if (text.find(marker) != std::string_view::npos) return true;
    }
}

void CoreLog(Severity severity, const char* text) {
    NQORTQR20::TRootObject::GetCoreLogger()->Write(severity, text);
}

/// Whether a string of the machine's structures of one type contains the marker.
bool AnyStringHas(int type, std::string_view marker) {
    const SmbiosReader reader(Module().gPluginHandle);
    if (!reader.ok()) {
        CoreLog(kWarning,
                "SMBIOSInfo::getSMBIOSInfo - Invalid handle to extended BIOS data area. Unable to "
                "retrieve information from SMBIOS.");
        return false;
    }
    std::vector<unsigned char> structure(kStructureRoom);
    for (bool first = true;; first = false) {
        CoreLog(kInfo, first ? "SMBIOSInfo::getSMBIOSInfo - Retrieving first SMBIOS structure"
                             : "SMBIOSInfo::getSMBIOSInfo - Retrieving the next SMBIOS structure.");
        int length = static_cast<int>(structure.size());
        const int result =
            first ? NQORTQR20::smBiosGetFirst(reader.handle(), type, structure.data(), &length)
                  : NQORTQR20::smBiosGetNext(reader.handle(), structure.data(), &length);
        if (result != 0) {
            CoreLog(kWarning, "SMBIOSInfo::getSMBIOSInfo - smbios read operation failed! ");
            return false;
        }
        if (length <= 0) return false;
        if (HasMarker(structure.data(), length, marker)) return true;
    }
}

constexpr std::size_t kDeviceRecordRoom = 1024;

/// Whether the machine has a BMC record; `finding` is what the log says of it.
bool HasIpmiDevice(const SmbiosReader& reader, const char** finding) {
    if (!reader.ok()) {
        *finding = "Unable to read BMC type from SMBIOS. Invalid Handle was encountered.";
        return false;
    }
    const std::unique_ptr<unsigned char[]> structure(
        new (std::nothrow) unsigned char[kDeviceRecordRoom]);
    if (structure == nullptr) {
        *finding = "Unable to allocate memory to hold SMBIOS BMC record";
        return false;
    }
    int length = kDeviceRecordRoom;
    const bool found = NQORTQR20::smBiosGetFirst(reader.handle(), ipmi::kSmbiosIpmiDevice,
                                                 structure.get(), &length) == 0 &&
                       length > 0;
    *finding =
        found ? "Found a Type 38 SMBIOS BMC record" : "Did NOT find a Type 38 SMBIOS BMC record";
    return found;
}

// Of the firmware structure, from version 2.4 of DSP0134 on.
constexpr std::size_t kControllerMajorAt = 0x16;
constexpr std::size_t kControllerMinorAt = 0x17;
constexpr unsigned char kNoRelease = 0xFF;

/// Compatibility: all three drivers are looked for under one name
/// (Discovery.DriverProbesTellOfTheOneLibrary).
bool DriverIsMissing() {
    void* const library = dlopen("qorsp6w.dll", RTLD_LAZY);
    if (library == nullptr) return true;
    dlclose(library);
    return false;
}

}  // namespace
}  // namespace ipmisel

TTQRStatusCode getMachineType(TCPluginCallbacks* /*context*/, std::string* machineType) {
    ipmisel::TraceScope trace("getMachineType()", {" entered.", " completed.", ipmisel::kInfo});
    ipmisel::Module().fMTonce = true;
    *machineType = NQORTQR20::TOSSpecific::GetMachineTypeFromID();
    return {NQORTQR20::kStatusOk};
}

unsigned DiscoverBMC(TCPluginCallbacks* context) {
    const ipmisel::SmbiosReader reader(context);
    const char* finding = nullptr;
    const bool found = ipmisel::HasIpmiDevice(reader, &finding);
    ipmisel::WriteLog(ipmisel::kInfo, finding);
    return found ? ipmisel::kOk : ipmisel::kFailed;
}

bool DiscoverCPLD() { return ipmisel::AnyStringHas(ipmisel::kOemStrings, "CPLD"); }

bool DiscoverFPGA() { return ipmisel::AnyStringHas(ipmisel::kOemStrings, "FPGA"); }

std::string DiscoverFirmwareRelease(TCPluginCallbacks* context) {
    using namespace ipmisel;
    const SmbiosReader reader(context);
    std::vector<unsigned char> structure(kStructureRoom);
    int length = static_cast<int>(structure.size());
    if (!reader.ok() ||
        NQORTQR20::smBiosGetFirst(reader.handle(), kFirmware, structure.data(), &length) != 0) {
        return {};
    }
    const int end = static_cast<int>(kControllerMinorAt) + 1;
    if (length < end || structure[kLengthAt] < end) return {};
    const unsigned char major = structure[kControllerMajorAt];
    const unsigned char minor = structure[kControllerMinorAt];
    if (major == kNoRelease || minor == kNoRelease) return {};
    return Format("%d.%d", major, minor);
}

bool IPMIselHasTSB2onBoardsmBios() {
    return ipmisel::AnyStringHas(ipmisel::kOnBoardDevices, ipmisel::kSupervisorAdapter) ||
           ipmisel::AnyStringHas(ipmisel::kOnBoardDevicesExtended, ipmisel::kSupervisorAdapter) ||
           ipmisel::AnyStringHas(ipmisel::kOemStrings, ipmisel::kSupervisorAdapter);
}

bool DiscoverQORSP6WDriver() { return ipmisel::DriverIsMissing(); }
bool DiscoverOSADriver() { return ipmisel::DriverIsMissing(); }
bool DiscoverMSIDriver() { return ipmisel::DriverIsMissing(); }
