#include "program/fleet/host_list.h"

#include <sys/stat.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <map>
#include <span>

#include "base/sha256.h"
#include "base/text.h"
#include "host/spdriver/access.h"
#include "program/commands/failure.h"
#include "program/commands/text_file.h"

namespace ipmisel {
namespace {

constexpr std::size_t kMaxHosts = 1'000'000;
constexpr std::size_t kMaxFile = 64U << 20;
constexpr int kMaxGroupDepth = 8;
constexpr std::size_t kMaxDigits = 9;
constexpr std::string_view kLan = "lan:";

[[noreturn]] void Refuse(const std::string& origin, const std::string& problem) {
    throw Failure(kExitUsage, (origin.empty() ? "--hosts" : origin) + ": " + problem);
}

std::string Quoted(std::string_view text) { return "\"" + std::string(text.substr(0, 80)) + "\""; }

/// The end of the text or the first of these characters that is not within brackets.
std::size_t FindOutside(std::string_view text, std::string_view characters) {
    bool inside = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (!inside && characters.find(text[i]) != std::string_view::npos) return i;
        if (text[i] == '[') inside = true;
        if (text[i] == ']') inside = false;
    }
    return text.size();
}

/// Takes the first item off a list; commas within brackets belong to it.
std::string_view TakeItem(std::string_view* list) {
    constexpr std::string_view kSeparators = ", \t\r\n";
    list->remove_prefix(std::min(list->find_first_not_of(kSeparators), list->size()));
    const std::string_view item = list->substr(0, FindOutside(*list, kSeparators));
    list->remove_prefix(item.size());
    return item;
}

/// Takes the first word off a line.
std::string_view TakeWord(std::string_view* line) {
    constexpr std::string_view kBlanks = " \t\r";
    line->remove_prefix(std::min(line->find_first_not_of(kBlanks), line->size()));
    const std::string_view word = line->substr(0, line->find_first_of(kBlanks));
    line->remove_prefix(word.size());
    return word;
}

std::optional<std::size_t> ParseNumber(std::string_view text) {
    std::size_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (text.empty() || text.size() > kMaxDigits || error != std::errc() ||
        end != text.data() + text.size()) {
        return std::nullopt;
    }
    return number;
}

using Options = std::vector<std::pair<std::string, std::string>>;

/// The common options but for those that the own ones have, then the own ones.
Options Over(const Options& common, const Options& own) {
    Options options;
    for (const auto& option : common) {
        const bool isOwn = std::any_of(
            own.begin(), own.end(), [&](const auto& other) { return other.first == option.first; });
        if (!isOwn) options.push_back(option);
    }
    options.insert(options.end(), own.begin(), own.end());
    return options;
}

/// Builds the controllers of one command line.
class Builder {
public:
    explicit Builder(const FindGroup& findGroup) : findGroup_(findGroup) {}

    /// `common` is what the hosts have as members of groups.
    void AddList(std::string_view list, const std::string& origin, int depth,
                 const Options& common = {}) {
        for (;;) {
            const std::string_view item = TakeItem(&list);
            if (item.empty()) return;
            if (item.front() == '@') {
                AddFile(std::string(item.substr(1)), origin, common);
            } else if (item.front() == '%') {
                AddGroup(std::string(item.substr(1)), origin, depth, common);
            } else {
                AddHosts({std::string(item), common, origin});
            }
        }
    }
    std::vector<HostEntry> Take() { return std::move(hosts_); }

private:
    void AddGroup(const std::string& name, const std::string& origin, int depth,
                  const Options& common) {
        if (depth == kMaxGroupDepth) Refuse(origin, "the group %" + name + " leads in a circle");
        const auto group = findGroup_ ? findGroup_(name) : std::nullopt;
        if (!group) {
            Refuse(origin, "there is no group %" + name +
                               "; give the configuration a section [group." + name + "]");
        }
        AddList(group->hosts, "group %" + name, depth + 1, Over(common, group->options));
    }

    void AddFile(const std::string& name, const std::string& origin, const Options& common) {
        if (name.empty()) Refuse(origin, "@ names no file; write it as @FILE");
        const std::string text = ReadTextFile(name, "--hosts @FILE", kMaxFile);
        std::string_view rest = text;
        for (std::size_t number = 1; !rest.empty(); ++number) {
            const auto end = std::min(rest.find('\n'), rest.size());
            AddLine(rest.substr(0, end), name, number, common);
            rest.remove_prefix(std::min(end + 1, rest.size()));
        }
    }

    void AddLine(std::string_view line, const std::string& file, std::size_t number,
                 const Options& common) {
        HostEntry entry{"", {}, file + ", line " + std::to_string(number)};
        for (std::string_view word = TakeWord(&line); !word.empty() && word[0] != '#';
             word = TakeWord(&line)) {
            if (entry.source.empty()) {
                entry.source = word;
                continue;
            }
            const auto equals = word.find('=');
            if (equals == std::string_view::npos || equals == 0) {
                Refuse(entry.origin, "what follows a host is NAME=VALUE, such as user=admin");
            }
            if (word.starts_with("password=") && !IsPrivate(file)) {
                Refuse(entry.origin, "a file with passwords is for nobody else; chmod 600 " + file);
            }
            entry.options.emplace_back(word.substr(0, equals), word.substr(equals + 1));
        }
        if (entry.source.empty()) return;
        entry.options = Over(common, entry.options);
        if (entry.source.front() == '@' || entry.source.front() == '%') {
            Refuse(entry.origin, "a line begins with a host, not with a further list");
        }
        AddHosts(entry);
    }

    static bool IsPrivate(const std::string& file) {
        struct stat status {};
        return stat(file.c_str(), &status) == 0 && (status.st_mode & (S_IRWXG | S_IRWXO)) == 0;
    }

    /// The entry's source is still the word that the user wrote.
    void AddHosts(const HostEntry& entry) {
        std::string_view word = entry.source;
        if (word.starts_with(kLan)) word.remove_prefix(kLan.size());
        const bool plain = std::all_of(word.begin(), word.end(), [](char c) {
            return c > ' ' && c < 0x7F &&
                   std::string_view("\"'\\/@%$*?&;|<>(){}").find(c) == std::string_view::npos;
        });
        if (word.empty() || !plain) Refuse(entry.origin, Quoted(word) + " is no host");
        // An IPv6 address stands in brackets too.
        if (word.front() == '[' && word.substr(0, word.find(']')).find(':') != word.npos) {
            if (word.find(']') == word.npos) Refuse(entry.origin, Quoted(word) + " lacks a ]");
            Add(entry, std::string(word));
            return;
        }
        Expand(entry, "", word);
    }

    void Expand(const HostEntry& entry, const std::string& done, std::string_view rest) {
        const auto open = rest.find('[');
        const auto close = rest.find(']');
        if (open == rest.npos && close == rest.npos) return Add(entry, done + std::string(rest));
        if (open == rest.npos || close == rest.npos || close < open) {
            Refuse(entry.origin, Quoted(entry.source) + " has a bracket without the other");
        }
        const std::string lead = done + std::string(rest.substr(0, open));
        std::string_view ranges = rest.substr(open + 1, close - open - 1);
        const std::string_view tail = rest.substr(close + 1);
        for (bool more = true; more;) {
            const auto comma = ranges.find(',');
            ExpandRange(entry, lead, ranges.substr(0, comma), tail);
            more = comma != ranges.npos;
            if (more) ranges.remove_prefix(comma + 1);
        }
    }

    void ExpandRange(const HostEntry& entry, const std::string& lead, std::string_view range,
                     std::string_view tail) {
        const auto dash = range.find('-');
        const std::string_view low = range.substr(0, dash);
        const auto first = ParseNumber(low);
        const auto last = dash == range.npos ? first : ParseNumber(range.substr(dash + 1));
        if (!first || !last || *last < *first) {
            Refuse(entry.origin, Quoted(range) + " in " + Quoted(entry.source) +
                                     " is no range; write it as [1-8] or [001-128,200]");
        }
        if (*last - *first >= kMaxHosts) RefuseNumber(entry);
        // A leading zero tells that all are as long as the first.
        const int width = low.front() == '0' ? static_cast<int>(low.size()) : 1;
        for (std::size_t i = *first; i <= *last; ++i) {
            Expand(entry, lead + Format("%0*zu", width, i), tail);
        }
    }

    [[noreturn]] static void RefuseNumber(const HostEntry& entry) {
        Refuse(entry.origin,
               "more than " + std::to_string(kMaxHosts) + " hosts; give each run a part of them");
    }

    void Add(const HostEntry& entry, const std::string& host) {
        if (hosts_.size() == kMaxHosts) RefuseNumber(entry);
        if (host.size() > NQORTQR20::kMaxPlace) {
            Refuse(entry.origin, Quoted(host) + " and so on is too long for a host");
        }
        const std::string source = std::string(kLan) + host;
        const auto [place, isNew] = index_.try_emplace(source, hosts_.size());
        if (isNew) {
            hosts_.push_back({source, entry.options, entry.origin});
            return;
        }
        HostEntry& before = hosts_[place->second];
        if (entry.options.empty() || entry.options == before.options) return;
        if (!before.options.empty()) {
            Refuse(entry.origin, host + " has other options here than in " + before.origin +
                                     "; give it one line");
        }
        before.options = entry.options;
        before.origin = entry.origin;
    }

    const FindGroup& findGroup_;
    std::vector<HostEntry> hosts_;
    std::map<std::string, std::size_t> index_;
};

}  // namespace

std::vector<HostEntry> ParseHostLists(const std::vector<std::string>& lists,
                                      const FindGroup& findGroup) {
    Builder builder(findGroup);
    for (const std::string& list : lists) builder.AddList(list, "", 0);
    std::vector<HostEntry> hosts = builder.Take();
    if (hosts.empty() && !lists.empty()) Refuse("", "the list names no host");
    return hosts;
}

bool Shard::Has(std::string_view source) const {
    const auto digest =
        Sha256({reinterpret_cast<const std::uint8_t*>(source.data()), source.size()});
    std::uint64_t number = 0;
    for (const std::uint8_t byte : std::span(digest).first(sizeof number)) {
        number = number << 8 | byte;
    }
    return number % count == index - 1;
}

std::optional<Shard> ParseShard(std::string_view text) {
    const auto slash = text.find('/');
    if (slash == text.npos) return std::nullopt;
    const auto index = ParseNumber(text.substr(0, slash));
    const auto count = ParseNumber(text.substr(slash + 1));
    if (!index || !count || *index < 1 || *index > *count) return std::nullopt;
    return Shard{*index, *count};
}

}  // namespace ipmisel
