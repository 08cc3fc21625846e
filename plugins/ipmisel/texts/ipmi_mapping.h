#pragma once

#include <cstdint>

#include "plugins/ipmisel/texts/sensor_mod_units.h"
#include "tqr/plugin.h"

/// Translator from IPMI codes to English text. Holds no state; one object serves every record.
///
/// Every operation takes the host's context first (for the plug-in's path), the codes, and a
/// caller's (buffer, length) pair that it never overruns, and returns 0 on success. Unless said
/// otherwise the text replaces what the buffer held; the offset operations append.
class IPMIMapping {
public:
    /// The text of a number in "ipmisel.INI" beside the plug-in; the file is read anew on every
    /// call. Non-zero, and an empty text, when there is none.
    int GetString(NQORTQR20::TCPluginCallbacks* context, int number, char* out, unsigned int len);

    /// Sensor type name; always 0.
    int GetSensorType(NQORTQR20::TCPluginCallbacks* context, int sensorType, char* out,
                      unsigned int len, unsigned int sensorNumber);

    /// A one's complement byte as a decimal number, -0 included; always 0.
    int GetOnesComplement(NQORTQR20::TCPluginCallbacks* context, char value, char* out,
                          unsigned int len);

    /// Appends the text of a sensor-specific event (reading type 0x6F).
    int GetSensorOffset(NQORTQR20::TCPluginCallbacks* context, int sensorType, int data1, int data2,
                        int data3, int readingType, char* out, unsigned int len);
    /// Appends the text of a generic event (reading types 0x02 to 0x0C).
    int GetGenericOffset(NQORTQR20::TCPluginCallbacks* context, int data1, int data2, int data3,
                         int readingType, int sensorType, int sensorNumber, char* out,
                         unsigned int len);
    /// Appends the text of a threshold event. `units` is null when the sensor's record is not
    /// known.
    int GetThresholdOffset(NQORTQR20::TCPluginCallbacks* context, int data1, int data2, int data3,
                           char* out, unsigned int len, const s_SDR_Mod_Units* units);

    /// A raw reading as value and unit.
    int GetSensorUnits(NQORTQR20::TCPluginCallbacks* context, const s_SDR_Mod_Units* units,
                       int reading, char* out, unsigned int outLen);

    // OEM records, one readable line each. `bytes`: 5 for 0xC0 (record bytes 7-11), 7 for 0xC1
    // (7-13), 10 for 0xE0 (3-11 and 15), 13 for 0xE1 to 0xE3 (3-15). Non-zero on failure.
    int GetOEMxC0(NQORTQR20::TCPluginCallbacks* context, const std::uint8_t* bytes, char* out,
                  unsigned int len);
    int GetOEMxC1(NQORTQR20::TCPluginCallbacks* context, const std::uint8_t* bytes, char* out,
                  unsigned int len);
    int GetOEMxE0(NQORTQR20::TCPluginCallbacks* context, const std::uint8_t* bytes, char* out,
                  unsigned int len);
    int GetOEMxE1(NQORTQR20::TCPluginCallbacks* context, const std::uint8_t* bytes, char* out,
                  unsigned int len);
    int GetOEMxE2(NQORTQR20::TCPluginCallbacks* context, const std::uint8_t* bytes, char* out,
                  unsigned int len);
    int GetOEMxE3(NQORTQR20::TCPluginCallbacks* context, const std::uint8_t* bytes, char* out,
                  unsigned int len);
};
