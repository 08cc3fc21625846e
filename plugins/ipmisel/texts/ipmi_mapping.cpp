#include "plugins/ipmisel/texts/ipmi_mapping.h"

#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "base/text.h"
#include "plugins/ipmisel/log.h"
#include "plugins/ipmisel/texts/event_offsets.h"
#include "plugins/ipmisel/texts/numbered_texts.h"
#include "plugins/ipmisel/texts/oem_records.h"
#include "plugins/ipmisel/texts/sensor_types.h"
#include "plugins/ipmisel/texts/sensor_units.h"

using NQORTQR20::TCPluginCallbacks;

namespace {

void Put(char* out, unsigned len, const std::string& text) {
    if (out != nullptr && len > 0) StringCchCopy(out, len, text.c_str());
}

void Append(char* out, unsigned len, const std::string& text) {
    if (out != nullptr && len > 0) StringCchCat(out, len, text.c_str());
}

std::uint8_t Byte(int value) { return static_cast<std::uint8_t>(value); }

ipmisel::EventData EventBytes(int data1, int data2, int data3) {
    return {Byte(data1), Byte(data2), Byte(data3)};
}

/// An OEM record of `Count` bytes as one line.
template <std::size_t Count>
int OemRecord(std::string (*describe)(std::span<const std::uint8_t>), const std::uint8_t* bytes,
              char* out, unsigned len) {
    if (bytes == nullptr || out == nullptr || len == 0) return ipmisel::kFailed;
    Put(out, len, describe(std::span<const std::uint8_t>(bytes, Count)));
    return ipmisel::kOk;
}

}  // namespace

int IPMIMapping::GetString(TCPluginCallbacks* context, int number, char* out, unsigned int len) {
    Put(out, len, "");
    const std::optional<std::string> text = ipmisel::NumberedText(context, number, len);
    if (!text || out == nullptr) return ipmisel::kFailed;
    Put(out, len, *text);
    return ipmisel::kOk;
}

int IPMIMapping::GetSensorType(TCPluginCallbacks* /*context*/, int sensorType, char* out,
                               unsigned int len, unsigned int sensorNumber) {
    ipmisel::TraceScope trace("IPMIMapping::GetSensorType()", ipmisel::TraceScope::kFunction);
    Put(out, len, std::string(ipmisel::SensorTypeName(sensorType, sensorNumber)));
    return ipmisel::kOk;
}

int IPMIMapping::GetOnesComplement(TCPluginCallbacks* /*context*/, char value, char* out,
                                   unsigned int len) {
    Put(out, len, ipmisel::OnesComplementText(value));
    return ipmisel::kOk;
}

int IPMIMapping::GetSensorOffset(TCPluginCallbacks* context, int sensorType, int data1, int data2,
                                 int data3, int readingType, char* out, unsigned int len) {
    Append(out, len,
           ipmisel::SensorOffsetText(context, Byte(sensorType), EventBytes(data1, data2, data3),
                                     readingType));
    return ipmisel::kOk;
}

int IPMIMapping::GetGenericOffset(TCPluginCallbacks* context, int data1, int data2, int data3,
                                  int readingType, int sensorType, int sensorNumber, char* out,
                                  unsigned int len) {
    Append(out, len,
           ipmisel::GenericOffsetText(context, EventBytes(data1, data2, data3), readingType,
                                      Byte(sensorType), Byte(sensorNumber)));
    return ipmisel::kOk;
}

int IPMIMapping::GetThresholdOffset(TCPluginCallbacks* context, int data1, int data2, int data3,
                                    char* out, unsigned int len, const s_SDR_Mod_Units* units) {
    Append(out, len,
           ipmisel::ThresholdOffsetText(context, EventBytes(data1, data2, data3),
                                        units == nullptr ? s_SDR_Mod_Units{} : *units));
    return ipmisel::kOk;
}

int IPMIMapping::GetSensorUnits(TCPluginCallbacks* context, const s_SDR_Mod_Units* units,
                                int reading, char* out, unsigned int outLen) {
    Put(out, outLen,
        ipmisel::SensorUnitsText(context, units == nullptr ? s_SDR_Mod_Units{} : *units, reading));
    return ipmisel::kOk;
}

int IPMIMapping::GetOEMxC0(TCPluginCallbacks* /*context*/, const std::uint8_t* bytes, char* out,
                           unsigned int len) {
    return OemRecord<5>(ipmisel::OemTimestampedText, bytes, out, len);
}

int IPMIMapping::GetOEMxC1(TCPluginCallbacks* /*context*/, const std::uint8_t* bytes, char* out,
                           unsigned int len) {
    return OemRecord<7>(ipmisel::OemTimestampedText, bytes, out, len);
}

int IPMIMapping::GetOEMxE0(TCPluginCallbacks* /*context*/, const std::uint8_t* bytes, char* out,
                           unsigned int len) {
    return OemRecord<10>(ipmisel::OemPlainText, bytes, out, len);
}

int IPMIMapping::GetOEMxE1(TCPluginCallbacks* /*context*/, const std::uint8_t* bytes, char* out,
                           unsigned int len) {
    return OemRecord<13>(ipmisel::OemPlainText, bytes, out, len);
}

int IPMIMapping::GetOEMxE2(TCPluginCallbacks* /*context*/, const std::uint8_t* bytes, char* out,
                           unsigned int len) {
    return OemRecord<13>(ipmisel::OemPlainText, bytes, out, len);
}

int IPMIMapping::GetOEMxE3(TCPluginCallbacks* /*context*/, const std::uint8_t* bytes, char* out,
                           unsigned int len) {
    return OemRecord<13>(ipmisel::OemPlainText, bytes, out, len);
}
