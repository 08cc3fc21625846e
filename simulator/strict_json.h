#pragma once

#include <cstdint>
#include <functional>
#include <initializer_list>
#include <nlohmann/json_fwd.hpp>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace ipmisel {

/// What is wrong with a file of ours; what() is one line: file, line where known, key, reason.
struct JsonFileError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// A value of a JSON text that is read strictly: every reading operation refuses a value of another
/// kind. Lives as long as the call it is handed to.
class JsonValue {
public:
    struct Field {
        std::string_view key;
        std::function<void(const JsonValue&)> read;
        bool required = false;
    };

    /// The whole text.
    explicit JsonValue(const nlohmann::json& value) : value_(value) {}
    JsonValue(const nlohmann::json& value, const JsonValue& parent, std::string_view key)
        : value_(value), parent_(&parent), key_(key) {}
    JsonValue(const nlohmann::json& value, const JsonValue& parent, std::size_t index)
        : value_(value), parent_(&parent), index_(index) {}

    bool IsNull() const;
    std::string Text() const;
    /// A text in the form of a CIM date-time (DSP0004): "yyyymmddhhmmss.mmmmmm+utc".
    std::string TimeText() const;
    bool Flag() const;
    /// Not below 0, and finite.
    double Real() const;
    std::uint32_t Number(std::uint32_t least, std::uint32_t most) const;
    /// A whole number that may be negative.
    std::int32_t Integer(std::int32_t least, std::int32_t most) const;
    /// Bytes as hexadecimal digits, blanks free.
    std::vector<std::uint8_t> Hex() const;
    /// One such byte.
    std::uint8_t HexByte() const;
    /// Hands out the elements of a list in order.
    void List(const std::function<void(const JsonValue&)>& read) const;
    /// Hands out the members of an object whose keys are not known beforehand.
    void Members(const std::function<void(const std::string& key, const JsonValue&)>& read) const;
    /// Hands each member of an object to the field of its key, in the order of the fields. Refuses
    /// keys without a field and required fields without a key.
    void Object(std::initializer_list<Field> fields) const;

    [[noreturn]] void Refuse(const std::string& reason) const;

    /// As in "bmcs[0].sel.entries[3]"; empty for the whole text.
    std::string Path() const;

private:
    [[noreturn]] void RefuseKind(const char* wanted) const;

    const nlohmann::json& value_;
    const JsonValue* parent_ = nullptr;
    std::string_view key_;
    std::size_t index_ = 0;
};

/// Parses a text (comments are allowed) and hands it to `read`. `file` stands for the text in
/// messages, `firstLine` is the number of its first line there. Throws JsonFileError.
void ReadStrictJson(const std::string& text, const std::string& file,
                    const std::function<void(const JsonValue&)>& read, std::size_t firstLine = 1);

/// The text of a file. Throws JsonFileError.
std::string ReadTextFile(const std::string& file);

}  // namespace ipmisel
