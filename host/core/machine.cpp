#include <sys/time.h>

#include <ctime>
#include <utility>

#include "host/core/host.h"
#include "tqr/datetime.h"
#include "tqr/log.h"

namespace NQORTQR20 {
namespace {

MachineFacts& Facts() {
    static MachineFacts facts;
    return facts;
}

class Lan : public IIPMILan {
public:
    bool getipmiLanStatus() const override { return Facts().ipmiLan; }
};

}  // namespace

void SetMachineFacts(MachineFacts facts) { Facts() = std::move(facts); }

void SetLocalTime(std::string localTime) { Facts().localTime = std::move(localTime); }

const MachineFacts& GetMachineFacts() { return Facts(); }

IIPMILan* TRootObject::GetipmiLanIns() {
    static Lan lan;
    return &lan;
}

std::string TOSSpecific::GetMachineTypeFromID() { return Facts().machineType; }

TCIMDateTime TOSSpecific::GetLocalTime() {
    if (Facts().localTime) return TCIMDateTime(Facts().localTime->c_str());
    return SystemTime();
}

TCIMDateTime SystemTime() {
    timeval now{};
    std::tm local{};
    TCIMDateTime time;
    if (gettimeofday(&now, nullptr) == 0 && localtime_r(&now.tv_sec, &local) != nullptr) {
        time.Set(
            static_cast<unsigned short>(local.tm_year + 1900),
            static_cast<unsigned short>(local.tm_mon + 1), static_cast<unsigned int>(local.tm_mday),
            static_cast<unsigned short>(local.tm_hour), static_cast<unsigned short>(local.tm_min),
            static_cast<unsigned short>(local.tm_sec), static_cast<unsigned int>(now.tv_usec),
            static_cast<short>(local.tm_gmtoff / 60));
    }
    return time;
}

}  // namespace NQORTQR20
