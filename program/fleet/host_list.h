#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

// Lists of controllers, as docs/fleet.md has them:
//
//   node[001-128]-bmc,rack7     hosts with an optional :PORT, and ranges of numbers
//   @FILE                       a file with a host or a range per line, then options of its own:
//                               node[001-128]-bmc  user=admin  password-file=/etc/ipmisel/rack1
//   %GROUP                      a list that the configuration has under this name

namespace ipmisel {

/// A controller of a list.
struct HostEntry {
    std::string source;                                          ///< "lan:HOST[:PORT]"
    std::vector<std::pair<std::string, std::string>> options{};  ///< its own, name and value
    std::string origin{};  ///< "FILE, line 3"; empty for one that stands on the command line

    bool operator==(const HostEntry&) const = default;
};

/// A list with a name, and what its hosts have in common.
struct HostGroup {
    std::string hosts;
    std::vector<std::pair<std::string, std::string>> options{};
};
/// A group; empty when there is none of this name.
using FindGroup = std::function<std::optional<HostGroup>(const std::string& name)>;

/// The controllers of some lists, in their order, each once. One that comes again with options of
/// its own gets these; with two different sets it is refused. Throws Failure.
std::vector<HostEntry> ParseHostLists(const std::vector<std::string>& lists,
                                      const FindGroup& findGroup);

/// The index-th (from 1) of `count` parts of any list.
struct Shard {
    std::size_t index = 1;
    std::size_t count = 1;

    /// A host belongs to one part alone, the same in every run, whatever else is in the list.
    bool Has(std::string_view source) const;
};
/// "3/8"; empty when it is none.
std::optional<Shard> ParseShard(std::string_view text);

}  // namespace ipmisel
