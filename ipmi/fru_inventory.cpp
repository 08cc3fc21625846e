#include "ipmi/fru_inventory.h"

#include <algorithm>
#include <array>
#include <numeric>
#include <string_view>
#include <utility>

#include "base/hex.h"
#include "base/text.h"
#include "ipmi/id_string.h"

namespace ipmi {
namespace {

using Bytes = std::span<const std::uint8_t>;
using ipmisel::Format;

constexpr std::size_t kHeaderLength = 8;
constexpr std::size_t kUnit = 8;  // of offsets and lengths
constexpr std::uint8_t kFormatVersion = 1;
constexpr std::uint8_t kFormatVersionBits = 0x0F;

bool AddsUpToZero(Bytes bytes) {
    return std::accumulate(bytes.begin(), bytes.end(), 0U) % 256 == 0;
}

/// Where an area lies, from its first byte to the one after its last.
struct Extent {
    const char* name;
    std::size_t begin;
    std::size_t end;
};

// ---- Fields (13) --------------------------------------------------------------------------------

constexpr std::uint8_t kEndOfFields = 0xC1;

/// Bits 7..6 of a field where a sensor record would have Unicode.
constexpr auto kBinary = TextEncoding::kUnicode;

bool IsEnglish(std::uint8_t language) { return language == 0 || language == 25; }

bool IsBcdPlus(Bytes bytes) {
    constexpr unsigned kLast = 0x0C;  // the others are reserved
    return std::all_of(bytes.begin(), bytes.end(), [](std::uint8_t byte) {
        return byte >> 4 <= kLast && (byte & 0x0F) <= kLast;
    });
}

std::string WithoutPadding(std::string text) { return text.erase(text.find_last_not_of(' ') + 1); }

std::string HexNumber(Bytes bytes) { return bytes.empty() ? "" : "0x" + ipmisel::HexText(bytes); }

/// Reads the fields of an area one after the other.
class FieldReader {
public:
    /// `fields` is what stands between the area's fixed part and its checksum.
    FieldReader(const char* area, Bytes fields, std::uint8_t language)
        : area_(area), rest_(fields), language_(language) {}

    /// The next field; `name` is what it is called where the fields end before it.
    std::string Next(const char* name) {
        std::string text;
        if (!Read(&text)) {
            if (!missing_ && marked_) Problem(Format("fields end before the %s", name));
            missing_ = true;
        }
        return text;
    }
    /// What stands up to the end of the fields, without what is empty.
    std::vector<std::string> Rest() {
        std::vector<std::string> fields;
        for (std::string text; Read(&text);) {
            if (!text.empty()) fields.push_back(std::move(text));
        }
        return fields;
    }
    /// Whether what was read cannot be a list of fields.
    bool broken() const { return broken_; }
    const std::vector<std::string>& problems() const { return problems_; }

private:
    bool Read(std::string* text) {
        if (ended_) return false;
        ++number_;
        if (rest_.empty()) {
            Problem("the mark at the end of the fields is missing");
            broken_ = ended_ = true;
            return false;
        }
        if (rest_[0] == kEndOfFields) {
            ended_ = marked_ = true;
            return false;
        }
        const std::uint8_t typeLength = rest_[0];
        const std::size_t length = typeLength & 0x3F;
        if (length >= rest_.size()) {
            Problem(Format("field %u runs past the area", number_));
            broken_ = ended_ = true;
            return false;
        }
        *text = Decode(static_cast<TextEncoding>(typeLength >> 6), rest_.subspan(1, length));
        rest_ = rest_.subspan(1 + length);
        return true;
    }

    std::string Decode(TextEncoding encoding, Bytes bytes) {
        const std::size_t all = bytes.size() * 2;  // no encoding has more characters
        switch (encoding) {
            case kBinary:
                return HexNumber(bytes);
            case TextEncoding::kBcdPlus:
                if (IsBcdPlus(bytes)) return WithoutPadding(DecodeBcdPlus(bytes, all));
                Problem(Format("field %u is no BCD plus", number_));
                broken_ = true;
                return HexNumber(bytes);
            case TextEncoding::kSixBit:
                return WithoutPadding(DecodeSixBit(bytes, all));
            case TextEncoding::kLatin1:
                break;
        }
        return WithoutPadding(IsEnglish(language_) ? DecodeLatin1(bytes) : DecodeUtf16(bytes));
    }

    void Problem(const std::string& text) { problems_.push_back(std::string(area_) + ": " + text); }

    const char* area_;
    Bytes rest_;
    std::uint8_t language_;
    std::vector<std::string> problems_;
    unsigned number_ = 0;
    bool ended_ = false;
    bool marked_ = false;  ///< by the end mark
    bool broken_ = false;
    bool missing_ = false;  ///< has reported the first field that is not there
};

// ---- Areas --------------------------------------------------------------------------------------

class InventoryReader {
public:
    InventoryReader(Bytes bytes, std::size_t size)
        : bytes_(bytes), size_(std::max(size, bytes.size())) {}

    FruInventory Read() {
        if (bytes_.size() < kHeaderLength) {
            Problem("header", Format("is cut after %zu of 8 bytes", bytes_.size()));
            return std::move(inventory_);
        }
        const Bytes header = bytes_.first(kHeaderLength);
        if ((header[0] & kFormatVersionBits) != kFormatVersion) {
            Problem("header", Blank() ? Format("every byte is %02xh", header[0])
                                      : Format("format version is %u, not 1",
                                               header[0] & kFormatVersionBits));
            return std::move(inventory_);
        }
        trusted_ = AddsUpToZero(header);
        inventory_.sound = trusted_;
        if (!trusted_) Problem("header", "checksum is wrong");
        if (const std::size_t at = header[1] * kUnit; at >= bytes_.size()) {
            Problem("internal use area", PastTheEnd(at));
        }
        ReadChassis(header[2] * kUnit);
        ReadBoard(header[3] * kUnit);
        ReadProduct(header[4] * kUnit);
        ReadMultiRecords(header[5] * kUnit);
        FindOverlaps();
        return std::move(inventory_);
    }

private:
    void Problem(const std::string& where, const std::string& text) {
        inventory_.problems.push_back(where + ": " + text);
    }
    std::string PastTheEnd(std::size_t at) const {
        return Format("begins at byte %zu, past the end (%zu bytes)", at, bytes_.size());
    }
    bool Blank() const {
        return std::all_of(bytes_.begin(), bytes_.end(),
                           [&](std::uint8_t byte) { return byte == bytes_[0]; });
    }

    /// Where an area was found.
    struct Area {
        const char* name;
        Bytes bytes;  ///< as far as they could be had
        bool whole;
        bool sound;  ///< whole, with the right checksum

        /// All between the fixed part and, where the area is whole, its checksum.
        FieldReader Fields(std::size_t fixed, std::uint8_t language) const {
            return {name, bytes.subspan(fixed, bytes.size() - fixed - (whole ? 1 : 0)), language};
        }
    };

    /// The area that begins at `begin`; empty when there is none that can be read. `fixed` is the
    /// length of what stands before its fields.
    std::optional<Area> FindArea(const char* name, std::size_t begin, std::size_t fixed) {
        if (begin == 0) return std::nullopt;
        if (begin >= bytes_.size()) {
            Problem(name, PastTheEnd(begin));
            return std::nullopt;
        }
        const Bytes rest = bytes_.subspan(begin);
        if ((rest[0] & kFormatVersionBits) != kFormatVersion) {
            Problem(name, Format("format version is %u, not 1", rest[0] & kFormatVersionBits));
            return std::nullopt;
        }
        const std::size_t length = rest.size() > 1 ? rest[1] * kUnit : 0;
        if (length == 0) {
            Problem(name, rest.size() > 1 ? "length is 0" : "is cut after its first byte");
            return std::nullopt;
        }
        const bool whole = length <= rest.size();
        if (!whole) Problem(name, Format("runs past the end (%zu bytes)", bytes_.size()));
        const Bytes bytes = rest.first(std::min(length, rest.size()));
        const bool sound = whole && AddsUpToZero(bytes);
        if (whole && !sound) Problem(name, "checksum is wrong");
        inventory_.sound = inventory_.sound && sound;
        // What a damaged header points at is only taken when it proves itself.
        if (!trusted_ && !sound) return std::nullopt;
        if (bytes.size() < fixed + 1) {
            Problem(name, "is too short");
            return std::nullopt;
        }
        extents_.push_back({name, begin, begin + length});
        return Area{name, bytes, whole, sound};
    }

    /// Whether the fields are those of an area. What could not be had of the device is not held
    /// against them.
    bool Accept(const Area& area, const FieldReader& fields) {
        const bool cut = !area.whole && bytes_.size() < size_;
        if (fields.broken() && !area.sound && !cut) {
            Problem(area.name, "its fields are not read, they are damaged too");
            return false;
        }
        auto& problems = inventory_.problems;
        problems.insert(problems.end(), fields.problems().begin(), fields.problems().end());
        return true;
    }

    void ReadChassis(std::size_t begin) {  // 10
        constexpr const char* kName = "chassis area";
        constexpr std::size_t kFixed = 3;
        const auto area = FindArea(kName, begin, kFixed);
        if (!area) return;
        constexpr std::uint8_t kEnglish = 0;  // the area names no language
        FieldReader fields = area->Fields(kFixed, kEnglish);
        FruChassis chassis;
        chassis.type = area->bytes[2];
        chassis.partNumber = fields.Next("part number");
        chassis.serialNumber = fields.Next("serial number");
        chassis.custom = fields.Rest();
        if (Accept(*area, fields)) inventory_.chassis = std::move(chassis);
    }

    void ReadBoard(std::size_t begin) {  // 11
        constexpr const char* kName = "board area";
        constexpr std::size_t kFixed = 6;
        constexpr std::int64_t kStart = 820454400;  // 1996-01-01
        const auto area = FindArea(kName, begin, kFixed);
        if (!area) return;
        FieldReader fields = area->Fields(kFixed, area->bytes[2]);
        FruBoard board;
        const std::int64_t minutes = area->bytes[3] | area->bytes[4] << 8 | area->bytes[5] << 16;
        if (minutes != 0) board.manufactured = kStart + minutes * 60;
        board.manufacturer = fields.Next("manufacturer");
        board.product = fields.Next("product name");
        board.serialNumber = fields.Next("serial number");
        board.partNumber = fields.Next("part number");
        board.fruFile = fields.Next("FRU file ID");
        board.custom = fields.Rest();
        if (Accept(*area, fields)) inventory_.board = std::move(board);
    }

    void ReadProduct(std::size_t begin) {  // 12
        constexpr const char* kName = "product area";
        constexpr std::size_t kFixed = 3;
        const auto area = FindArea(kName, begin, kFixed);
        if (!area) return;
        FieldReader fields = area->Fields(kFixed, area->bytes[2]);
        FruProduct product;
        product.manufacturer = fields.Next("manufacturer");
        product.name = fields.Next("product name");
        product.partNumber = fields.Next("part number");
        product.version = fields.Next("version");
        product.serialNumber = fields.Next("serial number");
        product.assetTag = fields.Next("asset tag");
        product.fruFile = fields.Next("FRU file ID");
        product.custom = fields.Rest();
        if (Accept(*area, fields)) inventory_.product = std::move(product);
    }

    void ReadMultiRecords(std::size_t begin) {  // 16
        constexpr const char* kName = "multi-record area";
        if (begin == 0) return;
        if (begin >= bytes_.size()) {
            Problem(kName, PastTheEnd(begin));
            return;
        }
        std::size_t at = begin;
        // Each record lies after the one before it, so that the walk ends with the device.
        for (unsigned number = 1; ReadMultiRecord(number, &at); ++number) {
        }
        extents_.push_back({kName, begin, at});
    }

    /// Reads the record at *at and steps behind it; false when it is the last that can be read.
    bool ReadMultiRecord(unsigned number, std::size_t* at) {
        constexpr std::size_t kRecordHeader = 5;
        constexpr std::uint8_t kLast = 0x80;
        constexpr std::uint8_t kRecordFormat = 2;
        const std::string name = Format("multi-record %u", number);
        if (bytes_.size() - *at < kRecordHeader) {
            Problem(name, "the device ends before the last record");
            return false;
        }
        const Bytes header = bytes_.subspan(*at, kRecordHeader);
        if (!AddsUpToZero(header)) {
            Problem(name, "checksum of the header is wrong; what follows is not read");
            return false;
        }
        // Zeros, too, have a right checksum.
        if (const unsigned format = header[1] & kFormatVersionBits; format != kRecordFormat) {
            Problem(name, Format("format version is %u, not 2; what follows is not read", format));
            return false;
        }
        Bytes data = bytes_.subspan(*at + kRecordHeader);
        const std::size_t length = header[2];
        if (length > data.size()) {
            Problem(name, Format("runs past the end (%zu bytes)", bytes_.size()));
            *at = bytes_.size();
            return false;
        }
        data = data.first(length);
        const auto sound = [&](std::size_t covered) {
            return (std::accumulate(data.begin(), data.begin() + static_cast<long>(covered), 0U) +
                    header[3]) %
                       256 ==
                   0;
        };
        const std::uint8_t type = header[0];
        const std::size_t fixed = FixedMultiRecordLength(type);
        if (length < fixed) {
            Problem(name, Format("has %zu of %zu bytes", length, fixed));
        }
        if (!sound(length)) {
            Problem(name, length > fixed && fixed != 0 && sound(fixed)
                              ? Format("checksum covers %zu of its %zu bytes", fixed, length)
                              : "checksum is wrong");
        }
        inventory_.multiRecords.push_back(ipmi::ReadMultiRecord(type, data));
        *at += kRecordHeader + length;
        return (header[1] & kLast) == 0;
    }

    void FindOverlaps() {
        extents_.push_back({"header", 0, kHeaderLength});
        std::sort(extents_.begin(), extents_.end(),
                  [](const Extent& a, const Extent& b) { return a.begin < b.begin; });
        for (std::size_t i = 1; i < extents_.size(); ++i) {
            for (std::size_t j = 0; j < i; ++j) {
                if (extents_[i].begin < extents_[j].end) {
                    Problem(extents_[i].name, std::string("overlaps the ") + extents_[j].name);
                }
            }
        }
    }

    Bytes bytes_;
    std::size_t size_;      ///< of the device
    bool trusted_ = false;  ///< the header's checksum is right
    FruInventory inventory_;
    std::vector<Extent> extents_;
};

}  // namespace

FruInventory ReadFruInventory(Bytes bytes, std::size_t size) {
    return InventoryReader(bytes, size).Read();
}

std::string ChassisTypeName(std::uint8_t type) {
    constexpr std::array<const char*, 0x25> kNames{"",
                                                   "Other",
                                                   "",
                                                   "Desktop",
                                                   "Low Profile Desktop",
                                                   "Pizza Box",
                                                   "Mini Tower",
                                                   "Tower",
                                                   "Portable",
                                                   "Laptop",
                                                   "Notebook",
                                                   "Hand Held",
                                                   "Docking Station",
                                                   "All in One",
                                                   "Sub Notebook",
                                                   "Space-saving",
                                                   "Lunch Box",
                                                   "Main Server Chassis",
                                                   "Expansion Chassis",
                                                   "SubChassis",
                                                   "Bus Expansion Chassis",
                                                   "Peripheral Chassis",
                                                   "RAID Chassis",
                                                   "Rack Mount Chassis",
                                                   "Sealed-case PC",
                                                   "Multi-system chassis",
                                                   "Compact PCI",
                                                   "Advanced TCA",
                                                   "Blade",
                                                   "Blade Enclosure",
                                                   "Tablet",
                                                   "Convertible",
                                                   "Detachable",
                                                   "IoT Gateway",
                                                   "Embedded PC",
                                                   "Mini PC",
                                                   "Stick PC"};
    return type < kNames.size() ? kNames[type] : "";
}

}  // namespace ipmi
