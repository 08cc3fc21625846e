#include "simulator/strict_json.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstddef>
#include <cstring>
#include <fstream>
#include <iterator>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <sstream>
#include <string_view>
#include <utility>

#include "base/hex.h"

namespace ipmisel {
namespace {

/// A refusal before it is known where in the file it stands.
struct Refusal {
    std::string place;  ///< path of the nearest value that is there
    std::string key;
    std::string reason;
};

std::string Join(const std::string& path, std::string_view key) {
    return path.empty() ? std::string(key) : path + "." + std::string(key);
}

/// Keys and texts of a file go into messages of one line.
std::string OneLine(std::string text) {
    std::replace_if(
        text.begin(), text.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; }, '?');
    return text;
}

/// What a file calls something may be as long as the file.
std::string Shortened(const std::string& key) {
    constexpr std::size_t kLongest = 100;
    return key.size() <= kLongest ? key : key.substr(0, kLongest) + "...";
}

[[noreturn]] void Throw(const std::string& file, std::optional<std::size_t> line,
                        const std::string& key, const std::string& reason) {
    std::string message = file;
    if (line) message += ":" + std::to_string(*line);
    if (!key.empty()) message += ": " + Shortened(key);
    throw JsonFileError(OneLine(message + ": " + reason));
}

/// Walks over a text and tells how far the parser has read.
class TrackingIterator {
public:
    using iterator_category = std::input_iterator_tag;
    using value_type = char;
    using difference_type = std::ptrdiff_t;
    using pointer = const char*;
    using reference = const char&;

    TrackingIterator(const char* at, const char** lastRead) : at_(at), lastRead_(lastRead) {}
    reference operator*() const { return *at_; }
    TrackingIterator& operator++() {
        *lastRead_ = at_++;
        return *this;
    }
    TrackingIterator operator++(int) {
        const TrackingIterator before = *this;
        ++*this;
        return before;
    }
    bool operator==(const TrackingIterator& other) const { return at_ == other.at_; }

private:
    const char* at_;
    const char** lastRead_;
};

/// Parser events up to the value at a path.
class PathFinder : public nlohmann::json_sax<nlohmann::json> {
public:
    explicit PathFinder(std::string wanted) : wanted_(std::move(wanted)) {}
    bool found() const { return found_; }

    bool null() override { return Scalar(); }
    bool boolean(bool) override { return Scalar(); }
    bool number_integer(number_integer_t) override { return Scalar(); }
    bool number_unsigned(number_unsigned_t) override { return Scalar(); }
    bool number_float(number_float_t, const string_t&) override { return Scalar(); }
    bool string(string_t&) override { return Scalar(); }
    bool binary(binary_t&) override { return Scalar(); }
    bool start_object(std::size_t) override { return Begin(false); }
    bool start_array(std::size_t) override { return Begin(true); }
    bool end_object() override { return End(); }
    bool end_array() override { return End(); }
    bool key(string_t& name) override {
        open_.back().key = name;
        return true;
    }
    bool parse_error(std::size_t, const std::string&, const nlohmann::json::exception&) override {
        return false;
    }

private:
    struct Level {
        std::string path;
        bool isList;
        std::size_t index = 0;
        std::string key = {};
    };

    std::string PathHere() const {
        if (open_.empty()) return "";
        const Level& level = open_.back();
        return level.isList ? level.path + "[" + std::to_string(level.index) + "]"
                            : Join(level.path, level.key);
    }
    /// False, which stops the parser, when this is the place.
    bool GoOn() {
        found_ = PathHere() == wanted_;
        return !found_;
    }
    bool Scalar() {
        if (!GoOn()) return false;
        return Next();
    }
    bool Begin(bool isList) {
        if (!GoOn()) return false;
        open_.push_back({PathHere(), isList});
        return true;
    }
    bool End() {
        open_.pop_back();
        return Next();
    }
    bool Next() {
        if (!open_.empty() && open_.back().isList) ++open_.back().index;
        return true;
    }

    std::string wanted_;
    std::vector<Level> open_;
    bool found_ = false;
};

/// The line (from 0) where the value at a path ends or, for objects and lists, begins.
std::optional<std::size_t> LineOf(const std::string& text, const std::string& path) {
    const char* lastRead = text.data();
    PathFinder finder(path);
    nlohmann::json::sax_parse(TrackingIterator(text.data(), &lastRead),
                              TrackingIterator(text.data() + text.size(), &lastRead), &finder,
                              nlohmann::json::input_format_t::json, true, true);
    if (!finder.found()) return std::nullopt;
    const auto lines = std::count(text.data(), lastRead, '\n');
    return static_cast<std::size_t>(lines);
}

}  // namespace

bool JsonValue::IsNull() const { return value_.is_null(); }

std::string JsonValue::Text() const {
    if (!value_.is_string()) RefuseKind("a text");
    return value_.get<std::string>();
}

std::string JsonValue::TimeText() const {
    constexpr std::string_view kForm = "dddddddddddddd.ddddddsddd";
    std::string text = Text();
    const bool fits =
        std::equal(text.begin(), text.end(), kForm.begin(), kForm.end(), [](char c, char form) {
            if (form == 'd') return c >= '0' && c <= '9';
            return form == 's' ? c == '+' || c == '-' : c == form;
        });
    if (!fits) Refuse("must be a time as in 20240305120000.000000+060");
    return text;
}

bool JsonValue::Flag() const {
    if (!value_.is_boolean()) RefuseKind("true or false");
    return value_.get<bool>();
}

std::uint32_t JsonValue::Number(std::uint32_t least, std::uint32_t most) const {
    const auto range = std::to_string(least) + " to " + std::to_string(most);
    if (!value_.is_number_integer()) RefuseKind(("a whole number, " + range).c_str());
    if (!value_.is_number_unsigned() || value_.get<std::uint64_t>() < least ||
        value_.get<std::uint64_t>() > most) {
        Refuse("must be " + range + ", not " + value_.dump());
    }
    return value_.get<std::uint32_t>();
}

double JsonValue::Real() const {
    if (!value_.is_number()) RefuseKind("a number");
    const double number = value_.get<double>();
    if (!std::isfinite(number) || number < 0) Refuse("must be finite and not below 0");
    return number;
}

std::int32_t JsonValue::Integer(std::int32_t least, std::int32_t most) const {
    const auto range = std::to_string(least) + " to " + std::to_string(most);
    if (!value_.is_number_integer()) RefuseKind(("a whole number, " + range).c_str());
    const bool tooLarge = value_.is_number_unsigned() && value_.get<std::uint64_t>() > INT32_MAX;
    if (tooLarge || value_.get<std::int64_t>() < least || value_.get<std::int64_t>() > most) {
        Refuse("must be " + range + ", not " + value_.dump());
    }
    return value_.get<std::int32_t>();
}

std::vector<std::uint8_t> JsonValue::Hex() const {
    if (!value_.is_string()) RefuseKind("a text of hexadecimal digits");
    const auto& text = value_.get_ref<const std::string&>();
    std::vector<std::uint8_t> bytes;
    bytes.reserve(text.size() / 2);
    std::optional<unsigned> high;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const char c = text[i];
        if (c == ' ' || c == '\t') continue;
        const auto digit = HexDigit(c);
        if (!digit) Refuse("character " + std::to_string(i + 1) + " is no hexadecimal digit");
        if (high) {
            bytes.push_back(static_cast<std::uint8_t>(*high << 4 | *digit));
            high.reset();
        } else {
            high = *digit;
        }
    }
    if (high) Refuse("a byte is two hexadecimal digits; their number here is odd");
    return bytes;
}

std::uint8_t JsonValue::HexByte() const {
    const auto bytes = Hex();
    if (bytes.size() != 1) {
        Refuse("must be one byte in hexadecimal digits, not " + std::to_string(bytes.size()));
    }
    return bytes.front();
}

void JsonValue::List(const std::function<void(const JsonValue&)>& read) const {
    if (!value_.is_array()) RefuseKind("a list");
    for (std::size_t i = 0; i < value_.size(); ++i) read(JsonValue(value_[i], *this, i));
}

void JsonValue::Members(
    const std::function<void(const std::string& key, const JsonValue&)>& read) const {
    if (!value_.is_object()) RefuseKind("an object");
    for (auto member = value_.begin(); member != value_.end(); ++member) {
        read(member.key(), JsonValue(member.value(), *this, member.key()));
    }
}

void JsonValue::Object(std::initializer_list<Field> fields) const {
    Members([&](const std::string& key, const JsonValue& member) {
        const auto isKey = [&](const Field& field) { return field.key == key; };
        if (std::none_of(fields.begin(), fields.end(), isKey)) member.Refuse("no such key here");
    });
    for (const Field& field : fields) {
        const auto member = value_.find(field.key);
        if (member != value_.end()) {
            field.read(JsonValue(*member, *this, field.key));
        } else if (field.required) {
            throw Refusal{Path(), Join(Path(), field.key), "is missing"};
        }
    }
}

void JsonValue::Refuse(const std::string& reason) const { throw Refusal{Path(), Path(), reason}; }

void JsonValue::RefuseKind(const char* wanted) const {
    Refuse(std::string("must be ") + wanted + ", not " + value_.type_name());
}

std::string JsonValue::Path() const {
    if (parent_ == nullptr) return "";
    const std::string parent = parent_->Path();
    return key_.data() == nullptr ? parent + "[" + std::to_string(index_) + "]"
                                  : Join(parent, key_);
}

void ReadStrictJson(const std::string& text, const std::string& file,
                    const std::function<void(const JsonValue&)>& read, std::size_t firstLine) {
    try {
        const char* lastRead = text.data();
        std::vector<std::set<std::string>> open;  // the keys of the objects that are open
        const auto refuseTwice = [&](int, nlohmann::json::parse_event_t event,
                                     nlohmann::json& parsed) {
            using Event = nlohmann::json::parse_event_t;
            if (event == Event::object_start) open.emplace_back();
            if (event == Event::object_end) open.pop_back();
            if (event == Event::key && !open.back().insert(parsed.get<std::string>()).second) {
                const auto line = std::count(text.data(), lastRead, '\n');
                Throw(file, firstLine + static_cast<std::size_t>(line), parsed.get<std::string>(),
                      "stands twice in one object");
            }
            return true;
        };
        const auto value = nlohmann::json::parse(
            TrackingIterator(text.data(), &lastRead),
            TrackingIterator(text.data() + text.size(), &lastRead), refuseTwice, true, true);
        read(JsonValue(value));
    } catch (const nlohmann::json::parse_error& error) {
        const auto end = text.begin() + static_cast<std::ptrdiff_t>(std::min(
                                            error.byte > 0 ? error.byte - 1 : 0, text.size()));
        const auto line = static_cast<std::size_t>(std::count(text.begin(), end, '\n'));
        // The library's text begins with its own name and place.
        std::string reason = error.what();
        if (const auto at = reason.find("syntax error"); at != std::string::npos) {
            reason.erase(0, at);
        }
        Throw(file, firstLine + line, "", "not JSON: " + reason);
    } catch (const nlohmann::json::out_of_range&) {
        Throw(file, firstLine, "", "not JSON: a number is too large");
    } catch (const Refusal& refusal) {
        auto line = LineOf(text, refusal.place);
        if (line) *line += firstLine;
        Throw(file, line, refusal.key, refusal.reason);
    }
}

std::string ReadTextFile(const std::string& file) {
    errno = 0;
    std::ifstream in(file, std::ios::binary);
    std::ostringstream text;
    // An empty file sets the fail bit of `text`, a folder the bad bit of `in`.
    if (!in || (in.peek() != std::ifstream::traits_type::eof() && !(text << in.rdbuf())) ||
        in.bad()) {
        Throw(file, std::nullopt, "",
              std::string("cannot be read: ") + std::strerror(errno != 0 ? errno : EIO));
    }
    return std::move(text).str();
}

}  // namespace ipmisel
