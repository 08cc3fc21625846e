#include <cstdlib>
#include <stdexcept>
#include <string>

#include "tqr/log.h"
#include "tqr/plugin.h"

// A plug-in for the tests of the host. What it is asked to do wrong stands in the environment.

namespace {

using namespace NQORTQR20;

bool Fault(const char* name) {
    const char* const fault = std::getenv("TEST_PLUGIN_FAULT");
    return fault != nullptr && std::string(fault) == name;
}

void MayThrow(const char* fault) {
    if (Fault(fault)) throw std::runtime_error("thrown by the plug-in");
}

TTQRStatusCode Initialise(TCPluginCallbacks*) {
    MayThrow("throw at start");
    return {Fault("initialise") ? kStatusNoMemory : kStatusOk};
}

TTQRStatusCode DeInitialise(TCPluginCallbacks*) {
    MayThrow("throw");
    fdrWriteLog(ILogger::kInfo, "de-initialised");
    return {kStatusOk};
}

TTQRStatusCode GetData(TCPluginCallbacks*, fdriIOHandle* output, const char** names, int count) {
    MayThrow("throw");
    for (int i = 0; i < count; ++i) {
        fdrGetInstance(output, names[i]);
        fdrAddInstance(output);
    }
    return {kStatusBadTime};
}

fdrPluginInfo GetInfo(TCPluginCallbacks*) {
    MayThrow("throw");
    return {"TEST", "1.2", nullptr, 0, 0};
}

struct AtLoad {
    AtLoad() {
        if (Fault("silent")) return;
        fdrPluginCallbacks record{.size = sizeof record,
                                  .initialise = Initialise,
                                  .deinitialise = DeInitialise,
                                  .getData = GetData,
                                  .getInfo = GetInfo,
                                  .reserved = nullptr};
        if (Fault("size")) record.size = sizeof record - 4;
        if (Fault("callback")) record.getData = nullptr;
        TCPluginCallbacks* context = nullptr;
        const TTQRStatusCode first = fdrRegisterPlugin(&record, &context);
        record.getData = nullptr;  // the host has its copy
        record.initialise = nullptr;
        const TTQRStatusCode second = fdrRegisterPlugin(&record, &context);
        fdrWriteLog(ILogger::kInfo, ("registered " + std::to_string(first.code) + ", again " +
                                     std::to_string(second.code))
                                        .c_str());
    }
} atLoad;

}  // namespace

extern "C" __attribute__((visibility("default"))) int TestExporter(
    NQORTQR20::TCPluginCallbacks* context, NQORTQR20::fdriIOHandle* output) {
    const char* path = nullptr;
    NQORTQR20::fdrGetPluginPath(context, &path);
    NQORTQR20::fdrGetInstance(output, path);
    NQORTQR20::fdrAddInstance(output);
    return 7;
}
