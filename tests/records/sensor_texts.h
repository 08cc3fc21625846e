#pragma once

#include <string>

#include "base/text.h"
#include "records/sdr_entry.h"
#include "tests/records/text_field.h"

namespace ipmiseltest {

/// A full sensor record "CPU 1 Temp" as its three texts; neighbouring values differ.
inline s_SDR_entry SensorTexts(int sensorNumber = 0x30) {
    s_SDR_entry texts;
    Fill(texts.SDRHeaderData,
         ipmisel::Format("00 F1 F2 04 03 51 01 35 20 10 %02X 07 61 ", sensorNumber));
    Fill(texts.SDRUnitsData, "00 F1 F2 81 12 13 0A 05 C0 06 41 99 D3 ");
    Fill(texts.SDRStringData, "00 F1 F2 CA 43 50 55 20 31 20 54 65 6D 70 ");
    return texts;
}

inline const unsigned char* Bytes(const char* text) {
    return reinterpret_cast<const unsigned char*>(text);
}

inline int Scan(const s_SDR_entry& texts, IPMISDREntry* entry) {
    return entry->ScanSDRDataFile(nullptr, nullptr, Bytes(texts.SDRHeaderData),
                                  Bytes(texts.SDRUnitsData), Bytes(texts.SDRStringData));
}

}  // namespace ipmiseltest
