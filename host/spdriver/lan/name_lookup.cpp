#include "host/spdriver/lan/name_lookup.h"

#include <netdb.h>

#include <cerrno>
#include <condition_variable>
#include <cstring>
#include <mutex>
#include <system_error>
#include <thread>

namespace tqrhost {
namespace {

OpeningError ErrorOf(int result, int systemError) {
    if (result == EAI_AGAIN) return OpeningError::kNameServerSilent;
    if (result == EAI_SYSTEM && (systemError == EMFILE || systemError == ENFILE)) {
        return OpeningError::kOutOfDescriptors;
    }
    return result == EAI_SYSTEM || result == EAI_MEMORY ? OpeningError::kNetwork
                                                        : OpeningError::kNameUnknown;
}

LookupResult Resolve(const std::string& host, const std::string& port, int flags) {
    addrinfo hints{};
    hints.ai_family = AF_UNSPEC;
    hints.ai_socktype = SOCK_DGRAM;
    hints.ai_flags = flags;
    addrinfo* found = nullptr;
    LookupResult result;
    const int error = getaddrinfo(host.c_str(), port.c_str(), &hints, &found);
    if (error != 0) {
        result.error = ErrorOf(error, errno);
        return result;
    }
    for (const addrinfo* at = found; at != nullptr; at = at->ai_next) {
        Endpoint endpoint;
        std::memcpy(&endpoint.address, at->ai_addr, at->ai_addrlen);
        endpoint.length = at->ai_addrlen;
        result.endpoints.push_back(endpoint);
    }
    freeaddrinfo(found);
    return result;
}

}  // namespace

struct NameLookup::Shared {
    std::mutex mutex;
    std::condition_variable arrived;
    std::optional<LookupResult> result;
};

NameLookup::Resolver NameLookup::SystemResolver() {
    return [](const std::string& host, const std::string& port) { return Resolve(host, port, 0); };
}

NameLookup::NameLookup(const std::string& host, const std::string& port, Resolver resolve)
    : shared_(std::make_shared<Shared>()) {
    LookupResult inNumbers = Resolve(host, port, AI_NUMERICHOST | AI_NUMERICSERV);
    if (!inNumbers.error) {
        shared_->result = std::move(inNumbers);
        return;
    }
    try {
        std::thread([shared = shared_, host, port, resolve = std::move(resolve)] {
            LookupResult result = resolve(host, port);
            const std::lock_guard lock(shared->mutex);
            shared->result = std::move(result);
            shared->arrived.notify_all();
        }).detach();
    } catch (const std::system_error&) {  // no thread to be had
        shared_->result = LookupResult{{}, OpeningError::kNetwork};
    }
}

std::optional<LookupResult> NameLookup::Wait(std::chrono::steady_clock::time_point until) const {
    std::unique_lock lock(shared_->mutex);
    shared_->arrived.wait_until(lock, until, [this] { return shared_->result.has_value(); });
    return shared_->result;
}

}  // namespace tqrhost
