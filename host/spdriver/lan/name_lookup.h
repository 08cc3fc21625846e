#pragma once

#include <netinet/in.h>
#include <sys/socket.h>

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/spdriver/lan/opening_error.h"

namespace tqrhost {

/// An address and port, as the system takes them.
struct Endpoint {
    sockaddr_storage address{};
    socklen_t length = 0;
};

struct LookupResult {
    std::vector<Endpoint> endpoints;  ///< in the order in which they are to be tried
    std::optional<OpeningError> error;
};

/// Asks the system for the addresses of a host, in a thread that may be left behind: a silent name
/// server holds nobody up. An address in numbers is known at once.
class NameLookup {
public:
    using Resolver = std::function<LookupResult(const std::string& host, const std::string& port)>;

    NameLookup(const std::string& host, const std::string& port,
               Resolver resolve = SystemResolver());
    /// Empty when the time has passed before the answer came.
    std::optional<LookupResult> Wait(std::chrono::steady_clock::time_point until) const;

    static Resolver SystemResolver();

private:
    struct Shared;
    std::shared_ptr<Shared> shared_;
};

}  // namespace tqrhost
