#pragma once

/// One SEL entry as text: the Get SEL Entry response from the completion code on, 19 bytes as
/// "%02X " groups, and the terminating NUL.
struct s_SEL_row {
    char data[58];
};
static_assert(sizeof(s_SEL_row) == 58);

/// One sensor data record as three texts of "%02X " groups. Zero-filled before use; a text that
/// fills its field is not terminated.
struct s_SDR_entry {
    char SDRHeaderData[64];  ///< completion code, next record ID (low, high), record bytes 0-9
    char SDRUnitsData[96];   ///< completion code, next record ID, record bytes 20-29
    char SDRStringData[64];  ///< completion code, next record ID, type/length byte, ID string
};
static_assert(sizeof(s_SDR_entry) == 224);

/// Most characters of the Get SDR Repository Info text, as it is handed from the request to the
/// cache; a text that fills them is not terminated.
constexpr unsigned kSdrInfoTextLength = 64;

/// One raw auxiliary log entry: bytes 0-2 signature 4D 4F 00, 3-4 record size (from byte 10 on),
/// 5-6 SEL record ID (low, high), 10 type, 13 severity, 14-15 operation, 16 subclass, 17 class,
/// 18-21 FRU instance, 22-31 GUID, 32-255 extended data.
struct s_AuxLog_entry {
    unsigned char bytes[256];
};
static_assert(sizeof(s_AuxLog_entry) == 256);
