#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

namespace ipmisel {

/// Tells a service manager how the service is: the datagrams of sd_notify(3) to the socket that
/// NOTIFY_SOCKET names. Without it nothing happens.
class ServiceNotifier {
public:
    using Clock = std::chrono::steady_clock;

    ServiceNotifier();

    void Ready(std::string_view status) const;
    void Status(std::string_view status) const;
    void Reloading() const;
    void Stopping() const;
    /// The service is alive: to be called at least as often as NextAlive says, where it says a
    /// time.
    void Alive(Clock::time_point now);
    std::optional<Clock::time_point> NextAlive() const { return nextAlive_; }

private:
    void Send(const std::string& text) const;

    std::string socket_;  ///< empty for none
    std::optional<Clock::duration> interval_;
    std::optional<Clock::time_point> nextAlive_;
};

/// Sends one datagram to a local socket, whose name begins with @ where it is abstract; false when
/// it could not be sent.
bool SendDatagram(const std::string& socket, std::string_view text);

}  // namespace ipmisel
