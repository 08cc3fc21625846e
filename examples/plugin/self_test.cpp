// A plug-in with one class of its own: what each controller answers to Get Self Test Results
// (IPMI 2.0, 20.4).

#include <iterator>

#include "tqr/classes.h"
#include "tqr/plugin.h"
#include "tqr/splibrary.h"

namespace {

using namespace NQORTQR20;

constexpr const char* kClass = "EXAMPLE_SelfTest";

/// Sends Get Self Test Results to a node; false when no result came.
bool ReadSelfTest(SPLibrary& node, unsigned char* result, unsigned char* detail) {
    constexpr unsigned char kNetFnApplication = 0x06;
    constexpr unsigned char kGetSelfTestResults = 0x04;
    unsigned char buffer[64] = {};
    frame::LayOutRequest(buffer, kNetFnApplication, 0, kGetSelfTestResults);
    int length = 0;
    if (!node.sendIPMICommand(buffer, &length, sizeof buffer, true)) return false;
    if (buffer[frame::kCompletionCodeAt] != 0 || length < 2) return false;
    *result = buffer[frame::kResponseDataAt];
    *detail = buffer[frame::kResponseDataAt + 1];
    return true;
}

TTQRStatusCode Initialise(TCPluginCallbacks*) { return {kStatusOk}; }
TTQRStatusCode DeInitialise(TCPluginCallbacks*) { return {kStatusOk}; }

/// One collection. The names are those of our table: the host asks for no other class.
TTQRStatusCode GetData(TCPluginCallbacks*, fdriIOHandle* output, const char**, int) {
    for (int i = 0; i < SPLibrary::GetNumberBMCNode(); ++i) {
        unsigned char result = 0;
        unsigned char detail = 0;
        if (!ReadSelfTest(*SPLibrary::GetSplibraryInstance(i), &result, &detail)) continue;
        fdrGetInstance(output, kClass);
        fdrAddIntegerProperty(output, "Node", i + 1);
        fdrAddBooleanProperty(output, "Passed", result == 0x55);
        fdrAddIntegerProperty(output, "Result", result);
        fdrAddIntegerProperty(output, "Detail", detail);
        if (fdrAddInstance(output).code != kStatusOk) return {kStatusFailed};
    }
    return {kStatusOk};
}

fdrPluginInfo GetInfo(TCPluginCallbacks*) {
    // 1.1 is the oldest version of the interface with typed properties.
    return {.name = "EXAMPLE",
            .version = "1.0",
            .interfaceVersion = "1.1",
            .reserved1 = 0,
            .reserved2 = 0};
}

/// Registers the plug-in while the host loads it.
struct Registration {
    Registration() {
        fdrPluginCallbacks record{.size = sizeof record,
                                  .initialise = Initialise,
                                  .deinitialise = DeInitialise,
                                  .getData = GetData,
                                  .getInfo = GetInfo,
                                  .reserved = nullptr};
        TCPluginCallbacks* context = nullptr;
        fdrRegisterPlugin(&record, &context);
    }
} const gRegistration;

constexpr fdrPropertyInfo kProperties[] = {
    {"Node", fdrPropertyType::kInteger, "node, from 1"},
    {"Passed", fdrPropertyType::kBoolean, "whether all tests passed"},
    {"Result", fdrPropertyType::kInteger, "first byte of the result; 55h is no error"},
    {"Detail", fdrPropertyType::kInteger, "second byte of the result"},
};
constexpr fdrClassInfo kClasses[] = {{.name = kClass,
                                      .description = "self test of the management controller",
                                      .marks = kByDefault,
                                      .nodeProperty = "Node",
                                      .exporter = nullptr,
                                      .properties = kProperties,
                                      .propertyCount = std::size(kProperties)}};

}  // namespace

const fdrClassTable fdrPluginClasses{.size = sizeof(fdrClassTable),
                                     .classInfoSize = sizeof(fdrClassInfo),
                                     .classes = kClasses,
                                     .classCount = std::size(kClasses),
                                     .neededFiles = nullptr,
                                     .neededFileCount = 0};
