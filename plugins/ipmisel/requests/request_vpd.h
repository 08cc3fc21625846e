#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "plugins/ipmisel/records/fru_locator.h"
#include "plugins/ipmisel/requests/ipmi_message.h"
#include "plugins/ipmisel/requests/request_fru_locator.h"
#include "plugins/ipmisel/texts/machine_families.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

namespace ipmisel {

/// What a BMC says of itself (Get Device ID, IPMI 2.0, 20.1). A field that the answer ends before
/// is left out.
struct DeviceID {
    std::uint8_t deviceId = 0;
    std::uint8_t majorVersion = 0;  ///< of the firmware
    std::uint8_t minorVersion = 0;  ///< in BCD
    std::optional<std::uint32_t> manufacturer;
    std::optional<std::uint16_t> product;
    std::optional<std::uint32_t> auxiliaryRevision;  ///< the first byte is the highest
};

/// Reads the answer after the completion code; empty when it ends before the firmware version.
std::optional<DeviceID> ReadDeviceID(std::span<const std::uint8_t> answer);

/// The version that an answer, after its completion code, has where the query says; empty when it
/// has none there.
std::string VersionText(const FirmwareQuery& query, std::span<const std::uint8_t> answer);

}  // namespace ipmisel

/// Asks one BMC node for the versions of its firmware, and reads vital product data directly.
class IPMIRequestVPD : public IPMIMessage {
public:
    explicit IPMIRequestVPD(NQORTQR20::SPLibrary* transport);

    /// Get Device ID. 1 on failure, also when the answer has no firmware version.
    unsigned IPMIGetDeviceID(NQORTQR20::TCPluginCallbacks* context, ipmisel::DeviceID* device);
    /// One version by the machine family's command: 1 when there was no answer or a completion
    /// code, 2 when the answer has no version where it should stand.
    unsigned IPMIGetFirmwareVersion(NQORTQR20::TCPluginCallbacks* context,
                                    const ipmisel::FirmwareQuery& query, std::string* version);
    /// The inventory of a device that the machine's family is known to have; what was read before
    /// a failure stays in `data`.
    unsigned IPMIGetVPDEntryData(NQORTQR20::TCPluginCallbacks* context,
                                 const ipmisel::VpdDevice& device, IPMIFRULocator* data);

private:
    std::span<const std::uint8_t> Answer() const;  ///< after the completion code

    IPMIRequestFRULocator fruRequest_;  ///< inventory is read as that of located devices is
};
