#include "plugins/ipmisel/pass/entry_points.h"

#include <cstddef>
#include <span>

#include "plugins/ipmisel/export/fru_export.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/pass/collection.h"
#include "plugins/ipmisel/pass/sections.h"
#include "plugins/ipmisel/pass/state.h"

using ipmisel::Module;
using NQORTQR20::fdriIOHandle;
using NQORTQR20::kStatusFailed;
using NQORTQR20::kStatusOk;
using NQORTQR20::TCPluginCallbacks;
using NQORTQR20::TTQRStatusCode;

void IPMISELInit() {
    NQORTQR20::fdrPluginCallbacks record{.size = sizeof record,
                                         .initialise = IPMISELPluginInit,
                                         .deinitialise = IPMISELPluginDeInit,
                                         .getData = IPMISELGetData,
                                         .getInfo = IPMISELGetInfo,
                                         .reserved = nullptr};
    if (NQORTQR20::fdrRegisterPlugin(&record, &Module().gPluginHandle).code != kStatusOk) {
        ipmisel::WriteLog(ipmisel::kError, "Couldn't register plugin!");
    }
}

TTQRStatusCode IPMISELPluginInit(TCPluginCallbacks* context) {
    Module().gStarted = 0;
    Module().gPluginHandle = context;
    return {kStatusOk};
}

TTQRStatusCode IPMISELPluginDeInit(TCPluginCallbacks* /*context*/) {
    Module().gStarted = 0;
    return {kStatusOk};
}

TTQRStatusCode IPMISELGetData(TCPluginCallbacks* context, fdriIOHandle* output,
                              const char** classNames, int classCount) {
    try {
        const bool none = classNames == nullptr || classCount <= 0;
        ipmisel::Collect(context, output,
                         std::span<const char* const>(
                             classNames, none ? 0 : static_cast<std::size_t>(classCount)));
        return {kStatusOk};
    } catch (const ipmisel::SectionFailure& failure) {
        return {failure.status};
    } catch (...) {
        return {kStatusFailed};
    }
}

NQORTQR20::fdrPluginInfo IPMISELGetInfo(TCPluginCallbacks* /*context*/) {
    return {.name = "IPMISEL",
            .version = "1.0",
            .interfaceVersion = "1.0",  // nothing of a later one is used
            .reserved1 = 0,
            .reserved2 = 0};
}

TTQRStatusCode IPMISELGetStatus() {
    // Compatibility: nothing ever sets the flag (EntryPoints.StatusIsAlwaysNotStarted).
    return {Module().gStarted != 0 ? kStatusOk : kStatusFailed};
}

TTQRStatusCode IPMISELGetDataZero(TCPluginCallbacks* context, fdriIOHandle* /*output*/,
                                  IPMIRequestFRULocator* request) {
    ipmisel::WriteLog(ipmisel::kTrace, "IPMISel: Entering IPMISELGetDataZero");
    try {
        if (request == nullptr ||
            !ipmisel::ExportFruDeviceZero(context, request, Module().fIpmiVpdentryFru.get())) {
            return {kStatusFailed};
        }
    } catch (...) {
        return {kStatusFailed};
    }
    ipmisel::WriteLog(ipmisel::kTrace, "IPMISel: Exiting IPMISELGetDataZero");
    return {kStatusOk};
}
