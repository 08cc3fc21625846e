#include <cmath>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "host/core/handle_registry.h"
#include "host/core/handles.h"
#include "host/core/host.h"
#include "tqr/plugin.h"

namespace NQORTQR20 {

// Values under construction belong to the plug-in until it deletes them; one that it forgets is
// leaked and not collected at the end, so that a leak checker shows it.
struct TCIMReference : tqrhost::HandleRegistry<TCIMReference> {
    ObjectPath path;
};

struct TCIMValueArray : tqrhost::HandleRegistry<TCIMValueArray> {
    std::vector<std::uint8_t> values;
};

namespace {

template <typename T>
bool IsLive(const T* handle) {
    return tqrhost::HandleRegistry<T>::Is(handle);
}

/// Does the work of an operation; whatever goes wrong inside stays inside.
template <typename Work>
TTQRStatusCode Guarded(Work work) {
    try {
        return {work() ? kStatusOk : kStatusFailed};
    } catch (...) {
        return {kStatusFailed};
    }
}

bool TakesProperty(const fdriIOHandle* output, const char* name) {
    return IsLive(output) && output->open && name != nullptr;
}

template <typename Value>
TTQRStatusCode AddValue(fdriIOHandle* output, const char* name, Value value) {
    return Guarded([&] {
        return TakesProperty(output, name) && output->sink.AddProperty(name, std::move(value));
    });
}

}  // namespace

TTQRStatusCode fdrGetInstance(fdriIOHandle* output, const char* className) {
    return Guarded([&] {
        if (!IsLive(output) || className == nullptr) return false;
        output->open = false;
        output->open = output->sink.OpenInstance(className);
        return output->open;
    });
}

TTQRStatusCode fdrAddProperty(fdriIOHandle* output, const char* name, const char* value) {
    return Guarded([&] {
        return TakesProperty(output, name) && value != nullptr &&
               output->sink.AddProperty(name, std::string(value));
    });
}

TTQRStatusCode fdrAddIntegerProperty(fdriIOHandle* output, const char* name, std::int64_t value) {
    return AddValue(output, name, value);
}

TTQRStatusCode fdrAddRealProperty(fdriIOHandle* output, const char* name, double value) {
    if (!std::isfinite(value)) return {kStatusFailed};
    return AddValue(output, name, value);
}

TTQRStatusCode fdrAddBooleanProperty(fdriIOHandle* output, const char* name, bool value) {
    return AddValue(output, name, value);
}

TTQRStatusCode fdrAddTimeProperty(fdriIOHandle* output, const char* name, std::int64_t seconds) {
    if (seconds < kFirstTime || seconds > kLastTime) return {kStatusFailed};
    return AddValue(output, name, Time{seconds});
}

TTQRStatusCode fdrAddTextListProperty(fdriIOHandle* output, const char* name,
                                      const char* const* texts, std::uint32_t count) {
    return Guarded([&] {
        if (!TakesProperty(output, name) || (texts == nullptr && count > 0)) return false;
        std::vector<std::string> list;
        for (std::uint32_t i = 0; i < count; ++i) {
            if (texts[i] == nullptr) return false;
            list.emplace_back(texts[i]);
        }
        return output->sink.AddProperty(name, list);
    });
}

TTQRStatusCode fdrAddInstance(fdriIOHandle* output) {
    return Guarded([&] {
        if (!IsLive(output) || !output->open) return false;
        output->open = false;
        return output->sink.CloseInstance();
    });
}

TTQRStatusCode fdrNewCIMValueArray(TCIMValueArray** array) {
    return Guarded([&] {
        if (array == nullptr) return false;
        *array = nullptr;
        *array = new TCIMValueArray;
        return true;
    });
}

TTQRStatusCode fdrArrayAddUint8(TCIMValueArray* array, unsigned char value) {
    return Guarded([&] {
        if (!IsLive(array)) return false;
        array->values.push_back(value);
        return true;
    });
}

TTQRStatusCode fdrAddArrayProperty(fdriIOHandle* output, const char* name, TCIMValueArray* array) {
    return Guarded([&] {
        return TakesProperty(output, name) && IsLive(array) &&
               output->sink.AddProperty(name, array->values);
    });
}

TTQRStatusCode fdrDeleteCIMValueArray(TCIMValueArray* array) {
    if (!IsLive(array)) return {kStatusFailed};
    delete array;
    return {kStatusOk};
}

TTQRStatusCode fdrNewCIMReference(TCIMReference** reference, fdriIOHandle* output) {
    return Guarded([&] {
        if (reference == nullptr) return false;
        *reference = nullptr;
        if (!IsLive(output)) return false;
        *reference = new TCIMReference;
        return true;
    });
}

TTQRStatusCode fdrSetReferenceClassName(TCIMReference* reference, const char* className) {
    return Guarded([&] {
        if (!IsLive(reference) || className == nullptr) return false;
        reference->path.className = className;
        return true;
    });
}

TTQRStatusCode fdrReferenceAddString(TCIMReference* reference, const char* key, const char* value) {
    return Guarded([&] {
        if (!IsLive(reference) || key == nullptr || value == nullptr) return false;
        reference->path.keys.emplace_back(key, value);
        return true;
    });
}

TTQRStatusCode fdrAddReferenceProperty(fdriIOHandle* output, const char* name,
                                       TCIMReference* reference) {
    return Guarded([&] {
        return TakesProperty(output, name) && IsLive(reference) &&
               output->sink.AddProperty(name, reference->path);
    });
}

TTQRStatusCode fdrDeleteCIMReference(TCIMReference* reference) {
    if (!IsLive(reference)) return {kStatusFailed};
    delete reference;
    return {kStatusOk};
}

OutputHandle::OutputHandle(InstanceSink& sink) : handle_(std::make_unique<fdriIOHandle>(sink)) {}
OutputHandle::~OutputHandle() = default;

}  // namespace NQORTQR20
