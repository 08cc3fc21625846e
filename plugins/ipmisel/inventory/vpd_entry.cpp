#include "plugins/ipmisel/inventory/vpd_entry.h"

#include "ipmi/jep106.h"
#include "plugins/ipmisel/log.h"

using NQORTQR20::fdriIOHandle;
using NQORTQR20::kStatusFailed;

namespace {

bool Write(fdriIOHandle* output, const char* className, const ipmisel::PropertyMap& instance) {
    if (NQORTQR20::fdrGetInstance(output, className).code == kStatusFailed) return false;
    for (const auto& [name, value] : instance) {
        if (NQORTQR20::fdrAddProperty(output, name.c_str(), value.c_str()).code == kStatusFailed) {
            return false;
        }
    }
    return NQORTQR20::fdrAddInstance(output).code != kStatusFailed;
}

}  // namespace

void IPMIVPDEntry::AddProperty(const std::string& name, const std::string& value) {
    open_.emplace_back(name, value.empty() ? " " : value);
}

void IPMIVPDEntry::AddInstance() {
    if (!open_.empty()) instances_.push_back(std::move(open_));
    open_.clear();
}

unsigned IPMIVPDEntry::GenerateCIMInstance(fdriIOHandle* output, const char* className) const {
    unsigned result = ipmisel::kOk;
    for (const ipmisel::PropertyMap& instance : instances_) {
        if (Write(output, className, instance)) continue;
        ipmisel::WriteLog(ipmisel::kWarning, std::string("Error adding ") + className + ".");
        result = ipmisel::kFailed;
    }
    return result;
}

std::string IPMIVPDEntry::getMDManufacturer(const unsigned char* code, bool twoBytes) {
    if (code == nullptr) return {};
    return std::string(twoBytes ? ipmi::ManufacturerOfBank(code[0], code[1])
                                : ipmi::ManufacturerAfterContinuations({code, ipmi::kJep106Banks}));
}

bool IPMIVPDEntry::IsASCIIStr(const unsigned char* text) {
    if (text == nullptr || *text == 0) return false;
    for (; *text != 0; ++text) {
        if (*text < 0x20 || *text > 0x7E) return false;
    }
    return true;
}
