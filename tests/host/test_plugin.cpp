#include <cstdlib>
#include <stdexcept>
#include <string>

#include "tqr/classes.h"
#include "tqr/log.h"
#include "tqr/plugin.h"

// A plug-in for the tests of the host. What it is asked to do wrong stands in the environment; its
// table of classes, which is constant, in two macros.

#ifndef TEST_CLASS
#define TEST_CLASS "TEST_Record"
#endif
#ifndef TEST_CLASS_INFO_SIZE
#define TEST_CLASS_INFO_SIZE sizeof(fdrClassInfo)
#endif

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
    const char* version = "1.0";
    for (const char* other : {"1.1", "1.2", "2.0", "0.9", "1", "1.0x"}) {
        if (Fault(other)) version = other;
    }
    return {"TEST", "1.2", Fault("no version") ? nullptr : version, 0, 0};
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

constexpr fdrPropertyInfo kProperties[] = {{"Node", fdrPropertyType::kInteger, "node, from 1"},
                                           {"Text", fdrPropertyType::kText, "a text"}};
constexpr fdrClassInfo kClasses[] = {
    {"TEST_Last", "written at the end", kByDefault | kWrittenAtEnd, nullptr, nullptr, nullptr, 0},
    {TEST_CLASS, "one per record", kByDefault | kPerLogRecord | kReadsLog, "Node", nullptr,
     kProperties, 2},
    {"TEST_Exported", "by a function", 0, nullptr, "TestExporter", nullptr, 0},
};
constexpr fdrNeededFile kNeededFiles[] = {{"test_plugin.needs", 10}};

}  // namespace

const NQORTQR20::fdrClassTable fdrPluginClasses{
    sizeof(fdrClassTable), TEST_CLASS_INFO_SIZE, kClasses, 3, kNeededFiles, 1};

extern "C" __attribute__((visibility("default"))) int TestExporter(
    NQORTQR20::TCPluginCallbacks* context, NQORTQR20::fdriIOHandle* output) {
    const char* path = nullptr;
    NQORTQR20::fdrGetPluginPath(context, &path);
    NQORTQR20::fdrGetInstance(output, path);
    NQORTQR20::fdrAddInstance(output);
    return 7;
}
