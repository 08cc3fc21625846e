#include <algorithm>
#include <cstdio>
#include <memory>

#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/records/sdr_entry.h"
#include "plugins/ipmisel/records/sdr_text.h"

using namespace ipmisel;
using NQORTQR20::TCPluginCallbacks;

namespace {

const unsigned char* Text(const char* field) {
    return reinterpret_cast<const unsigned char*>(field);
}

}  // namespace

int CreateSDRCache(TCPluginCallbacks* context, IPMISDREntry* first, SDRCache* cache,
                   const std::vector<s_SDR_entry>* entries, const unsigned char* infoText) {
    TraceScope trace("CreateSDRCache()", TraceScope::kFunction);
    if (first->ScanSDRInfoDataFile(context, nullptr, infoText) != kOk) {
        return static_cast<int>(trace.Fail("Failed to obtain correct SDR info."));
    }
    IPMISDREntry* current = first;
    std::unique_ptr<IPMISDREntry> made;  // current, once `first` is taken
    for (const s_SDR_entry& texts : *entries) {
        if (current == nullptr) {
            made = std::make_unique<IPMISDREntry>();
            current = made.get();
        }
        const int result =
            current->ScanSDRDataFile(context, nullptr, Text(texts.SDRHeaderData),
                                     Text(texts.SDRUnitsData), Text(texts.SDRStringData));
        if (result == 1) {
            WriteLog(kWarning, "Failed to scan all SDRs from buffer.");
            return kOk;
        }
        // Compatibility: a record of another version is kept with its header alone
        // (SdrCache.KeepsARecordOfAnotherVersion).
        cache->push_front(current);
        static_cast<void>(made.release());
        current = nullptr;
    }
    return kOk;
}

int DeleteSDRCache(TCPluginCallbacks* /*context*/, SDRCache* cache) {
    const TraceScope trace("DeleteSDRCacheSDRCache()", TraceScope::kFunction);
    for (IPMISDREntry*& entry : *cache) {
        delete entry;
        entry = nullptr;
    }
    return kOk;
}

IPMISDREntry* GetSensorSDR(unsigned char sensorNumber, const SDRCache* cache) {
    // The number alone is the key: neither owner nor LUN tells sensors apart.
    const auto found = std::find_if(cache->begin(), cache->end(), [&](const IPMISDREntry* entry) {
        return entry != nullptr && entry->sensorNumber == sensorNumber;
    });
    return found == cache->end() ? nullptr : *found;
}

int PrintSDRCache(const SDRCache* cache) {
    if (!cache->empty() && cache->front() != nullptr) {
        std::fputs(SdrFieldsText(*cache->front()).c_str(), stdout);
    }
    return kOk;
}
