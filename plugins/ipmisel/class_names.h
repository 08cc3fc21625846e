#pragma once

// The classes that the plug-in writes.

namespace ipmisel {

inline constexpr const char* kBmcFirmwareClass = "QORSG_IPMIFirmwareElement";
inline constexpr const char* kCpldFirmwareClass = "QORSG_CPLDFirmwareElement";
inline constexpr const char* kFpgaFirmwareClass = "QORSG_FPGAFirmwareElement";
inline constexpr const char* kBackplaneFirmwareClass = "QORSG_AMIFirmwareElement";
inline constexpr const char* kFruClass = "QORSG_IPMIFRU";
inline constexpr const char* kLogRecordClass = "QORSG_IPMILogRecord";
inline constexpr const char* kAuxDebugClass = "QORSG_ZMCAuxDebugRecord";
inline constexpr const char* kMessageLogClass = "QORSG_IPMIMessageLog";
inline constexpr const char* kRecordInLogClass = "QORSG_IPMIRecordInLog";

}  // namespace ipmisel
