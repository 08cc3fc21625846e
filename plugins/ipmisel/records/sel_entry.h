#pragma once

#include <array>
#include <cstdint>
#include <cstdio>

#include "plugins/ipmisel/records/rows.h"
#include "plugins/ipmisel/texts/ipmi_mapping.h"
#include "tqr/datetime.h"
#include "tqr/plugin.h"

/// One System Event Log record: 16 bytes laid out as the IPMI 2.0 standard has them (table 32-1),
/// except that the record ID is held high byte first (Compatibility:
/// SelEntry.TakesTheRecordOutOfItsRow). Arrays of records are handed about as raw memory, hence no
/// virtual operation.
class IPMISELEntry {
public:
    /// Parses row `index`; 0, or kEndOfData when the row is empty.
    unsigned ScanSELDataFile(NQORTQR20::TCPluginCallbacks* context, const s_SEL_row* rows,
                             unsigned int index);
    /// Reads the SEL information line from a file and checks the SEL version; 0, 1 on a bad line,
    /// 2 at end of file. No step of the collection calls it.
    unsigned ScanSELInfoDataFile(NQORTQR20::TCPluginCallbacks* context, std::FILE* file,
                                 int* entryCount);

    // Every Copy operation writes a text into out[0..len): cut at len, and without a final NUL when
    // it fills the buffer. 0 is success. `mapping` is borrowed for the call.

    unsigned CopyRecordID(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                          IPMIMapping* mapping) const;
    /// The time stamp as a CIM date-time with the local UTC offset. The clock difference and the
    /// two flags are accepted and not used.
    unsigned CopyTimestamp(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                           IPMIMapping* mapping, NQORTQR20::TCIMDateTime difference,
                           bool bmcNotBehind, bool synchronise) const;
    unsigned CopyOSBootTimestamp(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                                 IPMIMapping* mapping, NQORTQR20::TCIMDateTime difference,
                                 bool bmcNotBehind, bool synchronise) const;
    unsigned CopyGeneratorID(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                             IPMIMapping* mapping) const;
    unsigned CopySensorType(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                            IPMIMapping* mapping) const;
    unsigned CopyEventType(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                           IPMIMapping* mapping) const;
    /// `units` may be null when the sensor's record is not known.
    unsigned CopyEventData(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                           const s_SDR_Mod_Units* units, IPMIMapping* mapping) const;
    /// The 16 bytes in wire order as lower-case hexadecimal text; needs len >= 64, else 1.
    unsigned CopyRawDataString(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                               IPMIMapping* mapping) const;
    /// The 16 bytes in wire order; needs len >= 16, else 1.
    unsigned CopyRawDataHex(NQORTQR20::TCPluginCallbacks* context, unsigned char* out,
                            unsigned int len) const;
    /// A shutdown comment record; `index` is that of the record and is used for nothing. `out`
    /// holds 512 bytes.
    unsigned GetShutDownEvent(NQORTQR20::TCPluginCallbacks* context, char* out, int index) const;

    // OEM records: zero `out`, hand the record's bytes to the mapping operation of the same name;
    // 1 when it fails.
    unsigned GetOEMxC0(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                       IPMIMapping* mapping) const;
    unsigned GetOEMxC1(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                       IPMIMapping* mapping) const;
    unsigned GetOEMxE0(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                       IPMIMapping* mapping) const;
    unsigned GetOEMxE1(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                       IPMIMapping* mapping) const;
    unsigned GetOEMxE2(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                       IPMIMapping* mapping) const;
    unsigned GetOEMxE3(NQORTQR20::TCPluginCallbacks* context, char* out, unsigned int len,
                       IPMIMapping* mapping) const;

    void Print_variables(NQORTQR20::TCPluginCallbacks* context) const;

    std::uint8_t RecordType() const { return bytes_[2]; }
    std::uint8_t SensorNumber() const { return bytes_[11]; }
    /// Byte 12: bit 7 set for a deassertion, event/reading type in bits 6..0.
    std::uint8_t EventDirectionAndType() const { return bytes_[12]; }
    std::uint8_t Byte(unsigned index) const { return bytes_[index]; }

private:
    std::array<std::uint8_t, 16> bytes_{};
};
static_assert(sizeof(IPMISELEntry) == 16);

/// Fills entries[0..count) from the rows; 1 at the first row that is empty.
unsigned FillSELArray(NQORTQR20::TCPluginCallbacks* context, const s_SEL_row* rows,
                      IPMISELEntry* entries, unsigned int count);
/// Logs every entry; always 0.
unsigned PrintSELArray(NQORTQR20::TCPluginCallbacks* context, const IPMISELEntry* entries,
                       unsigned int count);
