#pragma once

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "host/spdriver/source.h"

// The kinds of source, one file each. `places` is what follows the name of the kind: one, or for a
// kind that joins several. All throw SourceError.

namespace tqrhost {

/// A simulated server that a file describes.
Source OpenSimulated(const std::vector<std::string>& places, const Access& access);
/// The exchanges of a capture file.
Source OpenReplay(const std::vector<std::string>& places, const Access& access);

/// What is known of the SMBIOS of this machine.
struct SystemSmbios {
    std::vector<std::vector<std::uint8_t>> structures;
    int error = 0;  ///< why it may not be read although it is there: an error number of the system
};
/// This machine's BMC through the kernel's driver.
Source OpenInband(const std::vector<std::string>& places, const Access& access);
/// The same over given device files and SMBIOS structures. Without a device that has a driver, but
/// with an IPMI device record (type 38), the source opens with a node that never answers, so that
/// the missing driver can be reported. `timeout` is how long one request may go unanswered.
Source OpenInbandDevice(const std::vector<std::filesystem::path>& devices, SystemSmbios smbios,
                        std::chrono::milliseconds timeout);
#ifdef IPMISEL_LAN
/// BMCs over the network, each HOST, HOST:PORT, [ADDRESS] or [ADDRESS]:PORT. The sessions are
/// opened together.
Source OpenLan(const std::vector<std::string>& places, const Access& access);
/// Loads what every session needs.
void PrepareLan();
#endif

}  // namespace tqrhost
