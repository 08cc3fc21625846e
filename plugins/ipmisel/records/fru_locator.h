#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

/// One FRU device locator record of the Sensor Data Repository (IPMI 2.0, table 43-7) with the
/// first bytes of that device's inventory data, and the readable strings found in them. The data is
/// not walked by its common header and areas: a marker tells a fixed layout, anything else is
/// searched for runs of printable characters.
class IPMIFRULocator {
public:
    static constexpr unsigned kFruDataLength = 312;

    std::uint8_t GetRecordID_LSB() const { return recordIdLs_; }
    std::uint8_t GetRecordID_MSB() const { return recordIdMs_; }
    std::uint8_t GetSDRVersion() const { return sdrVersion_; }
    std::uint8_t GetRecordType() const { return recordType_; }
    std::uint8_t GetRecordLength() const { return recordLength_; }
    std::uint8_t GetDeviceAccessAddr() const { return deviceAccessAddr_; }
    std::uint8_t GetFRUDevIDSlaveAddr() const { return fruDevIdSlaveAddr_; }
    std::uint8_t GetLogPhysLUNBusID() const { return logPhysLunBusId_; }
    std::uint8_t GetChannelNumber() const { return channelNumber_; }
    std::uint8_t GetDeviceType() const { return deviceType_; }
    std::uint8_t GetDeviceTypeModifier() const { return deviceTypeModifier_; }
    std::uint8_t GetFRUEntityID() const { return fruEntityId_; }
    std::uint8_t GetFRUEntityInstance() const { return fruEntityInstance_; }
    std::uint8_t GetOEM() const { return oem_; }
    std::uint8_t GetIDStringTypeLength() const { return idStringTypeLength_; }
    std::string GetIDString() const { return idString_; }
    /// The first of kFruDataLength bytes.
    const unsigned char* GetFRUData() const { return fruData_.data(); }

    void SetRecordID_LSB(std::uint8_t value) { recordIdLs_ = value; }
    void SetRecordID_MSB(std::uint8_t value) { recordIdMs_ = value; }
    void SetSDRVersion(std::uint8_t value) { sdrVersion_ = value; }
    void SetRecordType(std::uint8_t value) { recordType_ = value; }
    void SetRecordLength(std::uint8_t value) { recordLength_ = value; }
    void SetDeviceAccessAddr(std::uint8_t value) { deviceAccessAddr_ = value; }
    void SetFRUDevIDSlaveAddr(std::uint8_t value) { fruDevIdSlaveAddr_ = value; }
    void SetLogPhysLUNBusID(std::uint8_t value) { logPhysLunBusId_ = value; }
    void SetChannelNumber(std::uint8_t value) { channelNumber_ = value; }
    void SetDeviceType(std::uint8_t value) { deviceType_ = value; }
    void SetDeviceTypeModifier(std::uint8_t value) { deviceTypeModifier_ = value; }
    void SetFRUEntityID(std::uint8_t value) { fruEntityId_ = value; }
    void SetFRUEntityInstance(std::uint8_t value) { fruEntityInstance_ = value; }
    void SetOEM(std::uint8_t value) { oem_ = value; }
    void SetIDStringTypeLength(std::uint8_t value) { idStringTypeLength_ = value; }
    void SetIDString(std::string text) { idString_ = std::move(text); }
    /// Copies `count` bytes to `offset` of the data; what would lie outside it is left out.
    void SetFRUData(int offset, const unsigned char* bytes, unsigned int count);

    /// Replaces the vector by the strings found in the data. With the marker 01 25 00: exactly six,
    /// in the order of the fixed layout; without it: the runs of allowed characters, in order.
    void GetFRUDataString(std::vector<std::string>& strings) const;
    /// The text at data index base + offset: up to a zero byte, an invalid byte, 30 characters or
    /// the end of the data.
    std::string GetBoardInfo(int base, int offset) const;
    /// Whether an extracted string is plausible: two characters at least, and no closing bracket
    /// without its opening one before it.
    static bool IsValidFRUData(const std::string& text);
    static bool IsValidFRUByte(char byte);
    /// The 72 bytes that may stand in an extracted string.
    static void InitValidFRUByteList(std::vector<char>& list);

private:
    std::uint8_t recordIdLs_ = 0;
    std::uint8_t recordIdMs_ = 0;
    std::uint8_t sdrVersion_ = 0;
    std::uint8_t recordType_ = 0;
    std::uint8_t recordLength_ = 0;
    std::uint8_t deviceAccessAddr_ = 0;
    std::uint8_t fruDevIdSlaveAddr_ = 0;
    std::uint8_t logPhysLunBusId_ = 0;
    std::uint8_t channelNumber_ = 0;
    std::uint8_t deviceType_ = 0;
    std::uint8_t deviceTypeModifier_ = 0;
    std::uint8_t fruEntityId_ = 0;
    std::uint8_t fruEntityInstance_ = 0;
    std::uint8_t oem_ = 0;
    std::uint8_t idStringTypeLength_ = 0;
    std::string idString_;
    std::array<std::uint8_t, kFruDataLength> fruData_{};
};
