#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "program/commands/collect.h"
#include "program/fleet/host_list.h"

namespace ipmisel {

/// What a collection from each controller of a list takes: the common options, and over them its
/// own, which are those of the command line without their dashes, `name` and `password`.
class HostOptions {
public:
    /// `all` are the controllers of the whole list, of which a run may take a part. Throws Failure
    /// when two of them have one name.
    HostOptions(CollectOptions common, const std::vector<HostEntry>& all);

    /// One source with its name, and everything read that stands in files: password and key. Throws
    /// Failure.
    CollectOptions Of(const HostEntry& host);

private:
    std::string NameOf(const HostEntry& host) const;

    CollectOptions common_;
    std::map<std::string, std::size_t> timesNamed_;  ///< by host
    std::map<std::string, std::string> passwords_;   ///< by file
    std::optional<std::string> password_;            ///< of those without one of their own
};

}  // namespace ipmisel
