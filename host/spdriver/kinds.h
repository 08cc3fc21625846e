#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "host/spdriver/transport.h"

// The kinds of source, one file each. `place` is what follows the name of the kind. All throw
// SourceError.

namespace tqrhost {

/// A simulated server that the file `place` describes.
Source OpenSimulated(const std::string& place, const SourceOptions& options);
/// The exchanges of the capture file `place`.
Source OpenReplay(const std::string& place, const SourceOptions& options);

#ifdef IPMISEL_FREEIPMI
/// This machine's BMC through the kernel's driver.
Source OpenInband(const std::string& place, const SourceOptions& options);
/// The same over given device files and SMBIOS structures. Without a device, but with an IPMI
/// device record (type 38), the source opens with a node that never answers, so that the missing
/// driver can be reported.
Source OpenInbandDevice(const std::vector<std::filesystem::path>& devices,
                        std::vector<std::vector<std::uint8_t>> smbios);
/// A BMC over the network: HOST, HOST:PORT, [ADDRESS] or [ADDRESS]:PORT.
Source OpenLan(const std::string& place, const SourceOptions& options);
#endif

}  // namespace tqrhost
