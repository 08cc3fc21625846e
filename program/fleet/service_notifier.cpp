#include "program/fleet/service_notifier.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <charconv>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "base/text.h"
#include "program/fleet/file_descriptor.h"

namespace ipmisel {
namespace {

std::string Environment(const char* name) {
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

std::optional<long long> Number(const std::string& text) {
    long long number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end != text.data() + text.size() || number <= 0) return {};
    return number;
}

}  // namespace

bool SendDatagram(const std::string& socket, std::string_view text) {
    sockaddr_un address{};
    if (socket.empty() || socket.size() >= sizeof address.sun_path) return false;
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, socket.data(), socket.size());
    if (socket.front() == '@') address.sun_path[0] = '\0';
    const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + socket.size());
    const FileDescriptor file(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    return file.IsOpen() && sendto(file.get(), text.data(), text.size(), MSG_NOSIGNAL,
                                   reinterpret_cast<const sockaddr*>(&address), length) >= 0;
}

ServiceNotifier::ServiceNotifier() : socket_(Environment("NOTIFY_SOCKET")) {
    const auto process = Environment("WATCHDOG_PID");
    if (!process.empty() && Number(process) != getpid()) return;
    const auto limit = Number(Environment("WATCHDOG_USEC"));
    // Half of it, as sd_watchdog_enabled(3) recommends.
    if (limit && !socket_.empty()) interval_ = std::chrono::microseconds(*limit / 2);
    if (interval_) nextAlive_ = Clock::now();
}

void ServiceNotifier::Send(const std::string& text) const { SendDatagram(socket_, text); }

void ServiceNotifier::Ready(std::string_view status) const {
    Send("READY=1\nSTATUS=" + std::string(status));
}
void ServiceNotifier::Status(std::string_view status) const {
    Send("STATUS=" + std::string(status));
}
void ServiceNotifier::Reloading() const {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    Send(Format("RELOADING=1\nMONOTONIC_USEC=%lld",
                static_cast<long long>(now.tv_sec) * 1'000'000 + now.tv_nsec / 1'000));
}
void ServiceNotifier::Stopping() const { Send("STOPPING=1"); }

void ServiceNotifier::Alive(Clock::time_point now) {
    if (!nextAlive_ || now < *nextAlive_) return;
    Send("WATCHDOG=1");
    nextAlive_ = now + *interval_;
}

}  // namespace ipmisel
