#pragma once

#include <cstdint>
#include <cstdio>
#include <list>
#include <memory>
#include <vector>

#include "plugins/ipmisel/records/rows.h"
#include "plugins/ipmisel/texts/ipmi_mapping.h"
#include "tqr/plugin.h"

/// One sensor record of the Sensor Data Repository: identity, entity, units, conversion factors and
/// ID string (full and compact sensor records, IPMI 2.0, tables 43-1 and 43-2).
class IPMISDREntry {
public:
    IPMISDREntry();
    ~IPMISDREntry();
    IPMISDREntry(const IPMISDREntry&) = delete;
    IPMISDREntry& operator=(const IPMISDREntry&) = delete;

    /// Checks the repository information text; 0 when its SDR version is 0x51, else 1. The stream
    /// is not used.
    int ScanSDRInfoDataFile(NQORTQR20::TCPluginCallbacks* context, std::FILE* unused,
                            const unsigned char* infoText);
    /// Fills the entry from the three texts of an s_SDR_entry (64, 96 and 64 characters, not
    /// necessarily terminated); 0, 1 when a text is empty, 3 on a wrong SDR version.
    int ScanSDRDataFile(NQORTQR20::TCPluginCallbacks* context, std::FILE* unused,
                        const unsigned char* headerText, const unsigned char* unitsText,
                        const unsigned char* stringText);
    /// A variant that scans a header line of a file only; 0, or 1 when there is none. No step of
    /// the collection calls it.
    int ScanSDRDataFile_Test(NQORTQR20::TCPluginCallbacks* context, std::FILE* file);

    /// Texts of a sensor: ID string, entity name, entity instance; empty ones for a null entry.
    /// Always 0. No step of the collection calls it.
    static int GetSensorSDREntities(const IPMISDREntry* entry,
                                    NQORTQR20::TCPluginCallbacks* context, IPMIMapping* mapping,
                                    char* idString, char* entityName, char* entityInstance,
                                    unsigned idLen, unsigned entityLen, unsigned instanceLen);
    /// Cuts IDString at its first character that is not a blank, a point, a digit or a letter.
    char* RemoveInvalidChars();

    std::uint8_t recordIdMs = 0;
    std::uint8_t recordIdLs = 0;
    std::uint8_t sdrVersion = 0;
    std::uint8_t recordType = 0;  ///< 0x01 full sensor, 0x02 compact sensor
    std::uint8_t recordLength = 0;
    std::uint8_t sensorNumber = 0;  ///< the cache key
    std::uint8_t entityId = 0;
    std::uint8_t entityInstance = 0;
    std::uint8_t reserved[2] = {};
    std::uint8_t sensorUnits1 = 0;
    std::uint8_t baseUnit = 0;
    std::uint8_t modifierUnit = 0;
    std::uint8_t linearization = 0;
    std::uint16_t m = 0;  ///< 10 bits, sign not applied
    std::uint16_t b = 0;
    signed char rExponent = 0;  ///< 0 to 15, sign not applied
    signed char bExponent = 0;
    std::uint8_t idStringTypeLength = 0;
    std::uint32_t unused = 0;
    std::unique_ptr<char[]> IDString;  ///< 17 characters
};

/// The sensor cache: owned entries, last record of the repository first.
using SDRCache = std::list<IPMISDREntry*>;

/// Fills the cache from the texts, up to the first one that is empty. 1 when the repository
/// information is bad, else 0.
///
/// `first` takes the first record and is the cache's own from then on; it stays the caller's when
/// the cache does not hold it afterwards (bad information, no record, an empty first text). The
/// entries of the other records are made here and belong to the cache.
int CreateSDRCache(NQORTQR20::TCPluginCallbacks* context, IPMISDREntry* first, SDRCache* cache,
                   const std::vector<s_SDR_entry>* entries, const unsigned char* infoText);
/// Frees every entry; the list keeps its nodes, with null pointers. Always 0.
int DeleteSDRCache(NQORTQR20::TCPluginCallbacks* context, SDRCache* cache);
/// The last record of the repository with this sensor number; null when there is none, as in an
/// empty cache.
IPMISDREntry* GetSensorSDR(unsigned char sensorNumber, const SDRCache* cache);
/// Prints the first entry on standard output. No step of the collection calls it.
int PrintSDRCache(const SDRCache* cache);
