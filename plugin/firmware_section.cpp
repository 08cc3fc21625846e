#include "base/log.h"
#include "plugin/sections.h"

// Firmware versions are read in-band only.

namespace ipmisel {

void CollectBmcFirmware(Node& /*node*/) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting BMC firmware data.");
}

void CollectCpldFirmware(Node& /*node*/) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting CPLD firmware data.");
}

void CollectFpgaFirmware(Node& /*node*/) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting FPGA firmware data.");
}

void CollectBackplaneFirmware(Node& /*node*/) {
    if (ReachedOverLan()) return;
    WriteLog(kInfo, "Getting AMI backplane firmware data.");
}

}  // namespace ipmisel
