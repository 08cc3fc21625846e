#include "plugins/standard/severity_rules.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <set>

namespace standard {

namespace {

constexpr std::string_view kBlanks = " \t\r";

std::string_view Trimmed(std::string_view text) {
    const std::size_t first = text.find_first_not_of(kBlanks);
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

// Takes the next word off a line: up to the next blank that stands outside quotation marks.
std::string_view TakeWord(std::string_view* line) {
    bool quoted = false;
    std::size_t end = 0;
    for (; end < line->size(); ++end) {
        const char c = (*line)[end];
        if (c == '"') quoted = !quoted;
        if (!quoted && kBlanks.find(c) != std::string_view::npos) break;
    }
    const std::string_view word = line->substr(0, end);
    *line = Trimmed(line->substr(end));
    return word;
}

// Decimal, or hexadecimal behind 0x.
std::optional<std::uint8_t> Number(std::string_view text, unsigned largest) {
    const bool hexadecimal = text.starts_with("0x") || text.starts_with("0X");
    if (hexadecimal) text.remove_prefix(2);
    unsigned value = 0;
    const auto [end, error] =
        std::from_chars(text.data(), text.data() + text.size(), value, hexadecimal ? 16 : 10);
    if (error != std::errc() || end != text.data() + text.size() || value > largest) {
        return std::nullopt;
    }
    return static_cast<std::uint8_t>(value);
}

using Rule = SeverityRules::Rule;

struct NumberCondition {
    std::string_view name;
    std::optional<std::uint8_t> Rule::*field;
    unsigned largest;
};
constexpr std::array kNumberConditions = std::to_array<NumberCondition>({
    {"owner", &Rule::owner, 0xFF},
    {"number", &Rule::sensorNumber, 0xFF},
    {"sensor-type", &Rule::sensorType, 0xFF},
    {"event-type", &Rule::eventType, 0x7F},
    {"offset", &Rule::offset, 0x0F},
});

// One condition "name=value"; what is wrong with it, or nothing.
std::string AddCondition(std::string_view word, Rule* rule) {
    const std::size_t equals = word.find('=');
    if (equals == std::string_view::npos) {
        return "\"" + std::string(word) + "\" is no condition of the form name=value";
    }
    const std::string_view name = word.substr(0, equals);
    const std::string_view value = word.substr(equals + 1);
    if (name == "sensor") {
        if (value.size() < 3 || value.front() != '"' || value.back() != '"' ||
            value.find('"', 1) != value.size() - 1) {
            return "the name of a sensor stands in quotation marks, sensor=\"Fan 1\"";
        }
        rule->sensorName = value.substr(1, value.size() - 2);
        return {};
    }
    if (name == "direction") {
        if (value != "asserted" && value != "deasserted") {
            return "direction is asserted or deasserted";
        }
        rule->deasserted = value == "deasserted";
        return {};
    }
    const auto* const condition =
        std::ranges::find(kNumberConditions, name, &NumberCondition::name);
    if (condition == kNumberConditions.end()) {
        return "\"" + std::string(name) + "\" is no condition";
    }
    const std::optional<std::uint8_t> number = Number(value, condition->largest);
    if (!number) {
        return std::string(name) + " is a number from 0 to " + std::to_string(condition->largest);
    }
    rule->*condition->field = number;
    return {};
}

std::string ParseRule(std::string_view line, Rule* rule) {
    const std::string_view severity = TakeWord(&line);
    rule->severity = ipmi::ParseSeverity(severity);
    if (!rule->severity && severity != "none") {
        return "\"" + std::string(severity) +
               "\" is no severity: information, ok, warning, critical, fatal or none";
    }
    if (line.empty() || line.front() == '#') return "a rule needs a condition";
    std::set<std::string_view> names;
    while (!line.empty() && line.front() != '#') {
        const std::string_view word = TakeWord(&line);
        std::string problem = AddCondition(word, rule);
        if (!problem.empty()) return problem;
        const std::string_view name = word.substr(0, word.find('='));
        if (!names.insert(name).second) return std::string(name) + " stands twice";
    }
    return {};
}

template <typename T>
bool Holds(const std::optional<T>& condition, const T& value) {
    return !condition || *condition == value;
}

}  // namespace

std::optional<SeverityRules::Problem> SeverityRules::Parse(std::string_view text,
                                                           SeverityRules* rules) {
    rules->rules_.clear();
    for (std::size_t number = 1; !text.empty(); ++number) {
        const std::size_t end = std::min(text.find('\n'), text.size());
        const std::string_view line = Trimmed(text.substr(0, end));
        text.remove_prefix(std::min(end + 1, text.size()));
        if (line.empty() || line.front() == '#') continue;
        Rule rule;
        if (std::string problem = ParseRule(line, &rule); !problem.empty()) {
            return Problem{number, std::move(problem)};
        }
        rules->rules_.push_back(std::move(rule));
    }
    return std::nullopt;
}

const SeverityRules::Rule* SeverityRules::Match(const LoggedEvent& event) const {
    if (!event.isSensorEvent()) return nullptr;
    const ipmi::SelRecord& record = event.record;
    const auto found = std::ranges::find_if(rules_, [&](const Rule& rule) {
        return rule.deasserted == record.deassertion &&
               Holds(rule.owner, event.sensorKey().owner) &&
               Holds(rule.sensorNumber, record.sensorNumber) &&
               Holds(rule.sensorType, record.sensorType) &&
               Holds(rule.eventType, record.eventType) && Holds(rule.offset, record.offset()) &&
               (!rule.sensorName ||
                (event.sensor != nullptr && event.sensor->sensor.name == *rule.sensorName));
    });
    return found == rules_.end() ? nullptr : &*found;
}

}  // namespace standard
