#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

#include "plugins/ipmisel/records/rows.h"

/// One decoded auxiliary log entry: firmware status codes (UEFI Platform Initialization status
/// codes) and the SEL record that they belong to.
class IPMIExtendedSELDataEntry {
public:
    void SetType(unsigned char type);
    void SetSeverity(unsigned char severity);
    void SetOperation(const unsigned char* operation);   ///< two bytes
    void SetSubclass(unsigned char subclass);            ///< stores the byte only
    void SetClass(unsigned char classCode);              ///< after SetSubclass: makes both texts
    void SetFRUInstance(const unsigned char* instance);  ///< four bytes
    void SetGUID(const unsigned char* guid);             ///< ten bytes
    void SetExtendedData(std::string text);
    void SetSELRecordId(unsigned char low, unsigned char high);

    std::string GetTypeString() const { return typeText_; }
    std::string GetSeverityString() const { return severityText_; }
    std::string GetOperationString() const { return operationText_; }
    std::string GetSubclassString() const { return subclassText_; }
    std::string GetClassString() const { return classText_; }
    std::string GetFRUInstanceString() const { return fruInstanceText_; }
    std::string GetGUIDString() const { return guidText_; }
    std::string GetExtendedDataString() const { return extendedData_; }
    int GetSELRecordId() const { return selRecordId_[1] * 256 + selRecordId_[0]; }

private:
    std::uint8_t type_ = 0;
    std::string typeText_ = "Not set";
    std::uint8_t severity_ = 0;
    std::string severityText_ = "Not set";
    std::array<std::uint8_t, 2> operation_{};
    std::string operationText_ = "Not set";
    std::uint8_t subclass_ = 0;
    std::string subclassText_ = "Not set";
    std::uint8_t class_ = 0;
    std::string classText_ = "Not set";
    std::array<std::uint8_t, 4> fruInstance_{};
    std::string fruInstanceText_ = "Not set";
    std::array<std::uint8_t, 10> guid_{};
    std::string guidText_ = "Not set";
    std::string extendedData_;
    std::array<std::uint8_t, 2> selRecordId_{};  ///< low byte, high byte
};

/// The entries with a valid signature, decoded, in the order of the input.
std::vector<IPMIExtendedSELDataEntry> ParseExtendedSELData(const s_AuxLog_entry* entries,
                                                           unsigned int count);
/// Moves the first entry of a SEL record out of the vector into *entry: 0, or 1 when there is none.
int GetExtendedSELEntry(int recordId, std::vector<IPMIExtendedSELDataEntry>* entries,
                        IPMIExtendedSELDataEntry* entry);
