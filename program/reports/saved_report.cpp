#include "program/reports/saved_report.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <limits>
#include <utility>

#include "program/commands/failure.h"
#include "program/reports/completeness_json.h"
#include "program/reports/json_text.h"
#include "program/reports/view.h"

// docs/formats.md, json. What is of another type than it should be is passed over, but for the
// shape of the whole: a report may be of a later program, which has keys that this one does not
// know.

namespace ipmisel {
namespace {

using NQORTQR20::Instance;
using NQORTQR20::PropertyValue;

[[noreturn]] void Fail(const std::string& file, const std::string& problem) {
    throw Failure(kExitUsage, file + ": " + problem +
                                  "; name a report that was written with --format json, or a "
                                  "capture");
}

std::string TextAt(const Json& json, const char* key) {
    const auto found = json.find(key);
    return found != json.end() && found->is_string() ? found->get<std::string>() : "";
}

unsigned NumberAt(const Json& json, const char* key) {
    const auto found = json.find(key);
    return found != json.end() && found->is_number_unsigned() &&
                   found->get<std::uint64_t>() <= std::numeric_limits<unsigned>::max()
               ? found->get<unsigned>()
               : 0;
}

const Json& ObjectAt(const Json& json, const char* key) {
    static const Json kEmpty = Json::object();
    const auto found = json.find(key);
    return found != json.end() && found->is_object() ? *found : kEmpty;
}

const Json& ListAt(const Json& json, const char* key) {
    static const Json kEmpty = Json::array();
    const auto found = json.find(key);
    return found != json.end() && found->is_array() ? *found : kEmpty;
}

std::optional<PropertyValue> ListOf(const Json& json) {
    const bool bytes = !json.empty() && std::all_of(json.begin(), json.end(), [](const Json& each) {
        return each.is_number_unsigned() && each.get<std::uint64_t>() <= 0xFF;
    });
    if (bytes) return json.get<std::vector<std::uint8_t>>();
    const bool texts =
        std::all_of(json.begin(), json.end(), [](const Json& each) { return each.is_string(); });
    if (texts) return json.get<std::vector<std::string>>();
    return std::nullopt;
}

std::optional<PropertyValue> ValueOf(const Json& json) {
    switch (json.type()) {
        case Json::value_t::string:
            return json.get<std::string>();
        case Json::value_t::boolean:
            return json.get<bool>();
        case Json::value_t::number_integer:
            return json.get<std::int64_t>();
        case Json::value_t::number_unsigned:
            if (json.get<std::uint64_t>() > std::numeric_limits<std::int64_t>::max()) return {};
            return json.get<std::int64_t>();
        case Json::value_t::number_float:
            return json.get<double>();
        case Json::value_t::array:
            return ListOf(json);
        case Json::value_t::object: {
            NQORTQR20::ObjectPath path{TextAt(json, "class"), {}};
            for (const auto& [key, value] : ObjectAt(json, "keys").items()) {
                if (value.is_string()) path.keys.emplace_back(key, value.get<std::string>());
            }
            return path;
        }
        default:
            return std::nullopt;
    }
}

Instance InstanceOf(std::string className, const Json& properties) {
    Instance instance{std::move(className), {}};
    for (const auto& [name, value] : properties.items()) {
        if (auto known = ValueOf(value)) {
            instance.properties.emplace_back(name, std::move(*known));
        }
    }
    return instance;
}

std::unique_ptr<std::istream> OpenFile(const std::string& file) {
    auto in = std::make_unique<std::ifstream>(file, std::ios::binary);
    if (!*in) Fail(file, std::string("cannot be read: ") + std::strerror(errno));
    return in;
}

/// Parses a report; the elements of `instances` are handed over one by one and kept nowhere.
Json Parse(const std::string& file, std::istream& in,
           const std::function<void(const Json&)>& take) {
    bool inInstances = false;
    Json json = Json::parse(
        in,
        [&](int depth, Json::parse_event_t event, Json& value) {
            if (depth == 1 && event == Json::parse_event_t::key) {
                inInstances = value == "instances";
            }
            if (!inInstances || depth != 2 || event != Json::parse_event_t::object_end) return true;
            take(value);
            return false;
        },
        false);
    if (json.is_discarded()) Fail(file, "is no JSON");
    if (!json.is_object() || !json.contains("instances") || !json["instances"].is_array() ||
        !json.contains("completeness")) {
        Fail(file, "is no report");
    }
    const std::string format = TextAt(json, "format");
    if (!format.empty() && format != kFormatVersion) {
        Fail(file, "is a report of another format version, " + format);
    }
    return json;
}

NQORTQR20::PluginInfo PluginOf(const Json& json) {
    return {TextAt(json, "name"), TextAt(json, "version"), TextAt(json, "interface")};
}

NQORTQR20::TTQRStatusCode StatusOf(const Json& json) {
    return {static_cast<std::int32_t>(NumberAt(ObjectAt(json, "status"), "code"))};
}

NQORTQR20::SourceAccount AccountOf(const Json& json) {
    NQORTQR20::SourceAccount account;
    if (json.contains("announced") && json["announced"].is_number_unsigned()) {
        account.announced = NumberAt(json, "announced");
    }
    account.read = NumberAt(json, "read");
    return account;
}

NQORTQR20::NodeCompleteness CompletenessOf(const Json& json) {
    NQORTQR20::NodeCompleteness node;
    node.source = TextAt(json, "source");
    node.log = AccountOf(ObjectAt(json, "log"));
    node.sensors = AccountOf(ObjectAt(json, "sensors"));
    for (const auto& [key, asked] : kAskedAccounts) {
        if (json.contains(key)) node.*asked = AccountOf(ObjectAt(json, key));
    }
    for (const Json& fault : ListAt(json, "faults")) {
        const std::string what = TextAt(fault, "what");
        node.faults.push_back({what, TextAt(fault, "record"), TextAt(fault, "problem"), false});
    }
    return node;
}

}  // namespace

SavedReport::SavedReport(const std::string& file)
    : SavedReport(file, [file] { return OpenFile(file); }) {}

SavedReport::SavedReport(std::string name, std::function<std::unique_ptr<std::istream>()> open)
    : name_(std::move(name)), open_(std::move(open)) {
    const Json json = Parse(name_, *open_(), [](const Json&) {});
    head_.source = TextAt(json, "source");
    head_.machineType = TextAt(json, "machine_type");
    head_.plugin = PluginOf(ObjectAt(json, "plugin"));
    for (const Json& plugin : ListAt(json, "plugins")) {
        end_.plugins.push_back({PluginOf(plugin), StatusOf(plugin)});
    }
    head_.collected = ParseTime(TextAt(json, "collected")).value_or(NQORTQR20::Time{});
    for (const Json& system : ListAt(json, "systems")) {
        head_.systems.push_back({TextAt(system, "name"), "", TextAt(system, "guid"),
                                 TextAt(system, "manufacturer"), TextAt(system, "product"),
                                 TextAt(system, "serial")});
    }
    end_.status = StatusOf(json);
    for (const Json& notice : ListAt(json, "notices")) {
        if (notice.is_string()) end_.notices.push_back(notice.get<std::string>());
    }
    for (const Json& node : ListAt(json, "completeness")) {
        if (!node.contains("node")) {  // could not be opened
            const Json& faults = ListAt(node, "faults");
            end_.unreachable.push_back(
                {TextAt(node, "source"), faults.empty() ? "" : TextAt(faults.front(), "problem")});
            continue;
        }
        end_.completeness.push_back(CompletenessOf(node));
        const Json& log = ObjectAt(node, "log");
        if (log.contains("exported")) end_.exported.push_back(NumberAt(log, "exported"));
    }
    head_.nodes = std::max(head_.systems.size(), end_.completeness.size());
    const auto complete = json.find("complete");
    end_.recorded = Outcome{kExitCollected, "", ""};
    if (complete != json.end() && complete->is_boolean() && !complete->get<bool>()) {
        const std::string problem = TextAt(json, "problem");
        end_.recorded =
            Outcome{kExitPart, problem.empty() ? "collected in part" : problem, "collect again"};
    }
}

void SavedReport::ForEach(const std::function<void(const Instance&)>& take) const {
    Parse(name_, *open_(), [&take](const Json& json) {
        take(InstanceOf(TextAt(json, "class"), ObjectAt(json, "properties")));
    });
}

Instance ParseInstance(std::string className, const std::string& properties) {
    const Json json = Json::parse(properties, nullptr, false);
    return InstanceOf(std::move(className), json.is_object() ? json : Json::object());
}

NQORTQR20::NodeCompleteness ParseCompleteness(const std::string& object) {
    const Json json = Json::parse(object, nullptr, false);
    return CompletenessOf(json.is_object() ? json : Json::object());
}

bool IsCapture(const std::string& file) {
    std::ifstream in(file, std::ios::binary);
    std::string line(1 << 16, '\0');
    in.read(line.data(), static_cast<std::streamsize>(line.size()));
    line.resize(static_cast<std::size_t>(in.gcount()));
    // A report names its format first and has no such key.
    return line.substr(0, line.find('\n')).find("\"ipmisel_capture\"") != std::string::npos;
}

}  // namespace ipmisel
