#pragma once

#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <utility>
#include <vector>

#include "host/spdriver/lan/command_timing.h"
#include "host/spdriver/lan/received_numbers.h"
#include "host/spdriver/lan/rmcpplus_codec.h"
#include "host/spdriver/lan/rqseq_table.h"
#include "host/spdriver/lan/send_window.h"
#include "host/spdriver/transport.h"
#include "ipmi/command.h"

namespace tqrhost {

/// Session sequence numbers of what is sent. A controller takes a packet that is at most 15 ahead
/// of the newest that it has taken (IPMI 2.0, 6.12.13).
class SentNumbers {
public:
    /// Whether one more is at most `ahead`.
    bool HasRoom(unsigned ahead) const { return last_ - acknowledged_ < ahead; }
    std::uint32_t Next() {
        if (++last_ == 0) ++last_;  // 0 stands for no session
        return last_;
    }
    void Acknowledge(std::uint32_t number) {
        constexpr std::uint32_t kHalf = 0x80000000;
        if (number - acknowledged_ < kHalf) acknowledged_ = number;
    }
    void Restart(std::uint32_t last) { last_ = acknowledged_ = last; }

private:
    std::uint32_t last_ = 0;
    std::uint32_t acknowledged_ = 0;  ///< the newest that the controller is known to have
};

/// The requests of one session: which wait, which are outstanding, which are to be sent again.
///
/// Packets are handed out and answers handed in, with the time of it. Each try of a request is a
/// packet of its own. A try is lost when a later one of its kind was answered, or when its time is
/// up; while nothing at all is answered, only the oldest requests are tried again: one, two, four,
/// eight.
class SessionRequests {
public:
    using Handler = std::function<void(std::optional<Response>)>;

    struct Options {
        std::optional<unsigned> window{};  ///< fixed; adaptive when left out
        std::chrono::milliseconds timeout{20000};
        bool anySessionNumber = false;  ///< workaround: answers whose session numbers mean nothing
    };
    explicit SessionRequests(Options options) : options_(options), window_(options_.window) {}

    void Submit(ipmi::Command command, Handler handler);
    std::size_t Pending() const { return waiting_.size() + active_.size(); }
    std::size_t Room() const;

    /// A session is open: the codec is borrowed from now on. What was outstanding is sent anew.
    /// `sequence` is the newest session sequence number that the controller has taken, `received`
    /// are those that came from it.
    void Start(rmcpplus::Codec* codec, std::uint32_t sequence, const ReceivedNumbers& received,
               std::optional<CommandTiming::Duration> roundTrip, Clock::time_point now);
    std::uint32_t NextSequence() { return numbers_.Next(); }

    /// Takes an answer in and calls the handler of its request.
    void Handle(const rmcpplus::Answer& answer, Clock::time_point now);
    /// Fails what has waited too long, and appends the packets that are due.
    void Send(Clock::time_point now, std::vector<rmcpplus::Packet>* packets);
    /// When Send has something to do without any answer; time_point::max() for never.
    Clock::time_point NextTimer(Clock::time_point now) const;
    /// Hands nothing to every handler.
    void FailAll();

    /// Since when the controller has answered nothing, and how often it was asked since; empty
    /// while nothing is outstanding.
    struct Silence {
        Clock::time_point since;
        unsigned tries = 0;
        CommandTiming::Duration expected{0};  ///< within which an answer comes
    };
    std::optional<Silence> SilentSince() const;
    Clock::time_point LastHeard() const { return lastHeard_; }
    /// Answers that were waited for and dropped for their session sequence number alone.
    unsigned Repeated() const { return repeated_; }
    /// A request has failed since whose first try nothing at all was answered.
    bool HeardNothing() const { return heardNothing_; }

private:
    struct Request {
        std::uint64_t id = 0;
        ipmi::Command command;
        Handler handler;
        std::optional<Clock::time_point> firstSent;
        Clock::time_point lastSent{};
        Clock::time_point retryAt{};
        std::uint64_t lastSerial = 0;
        std::uint32_t firstSequence = 0;
        std::uint8_t lastRqSeq = 0;
        unsigned tries = 0;        ///< in this session
        unsigned busy = 0;         ///< answers that the controller was busy
        bool outstanding = false;  ///< else it is to be sent again as soon as there is room
    };

    std::size_t Outstanding() const;
    const Request* OldestOutstanding() const;
    Request* Find(std::uint64_t id);
    void FailOverdue(Clock::time_point now);
    void Fail(const std::vector<Request>& requests);
    CommandTiming::Duration RestOf(const Request& request) const;
    void FindLost(Clock::time_point now);
    void MarkLost(Request* request);
    bool IsSilent(const Request& request) const { return lastHeard_ <= request.lastSent; }
    unsigned Ahead(bool first) const;
    bool SendTry(Request* request, Clock::time_point now, std::vector<rmcpplus::Packet>* packets);
    bool AskAgainAlone(Request* request, bool alone);

    Options options_;
    SendWindow window_;
    mutable CommandTimings timings_;
    RqSeqTable tries_;
    std::deque<Request> waiting_;
    std::vector<Request> active_;  ///< sent at least once, in that order
    rmcpplus::Codec* codec_ = nullptr;
    SentNumbers numbers_;
    ReceivedNumbers received_;
    std::uint64_t serial_ = 0;  ///< of the newest send
    std::uint64_t lastId_ = 0;
    unsigned probes_ = 0;        ///< to be sent at a time while nothing is answered
    bool outOfNumbers_ = false;  ///< nothing could be sent for want of one
    Clock::time_point lastHeard_{};
    unsigned repeated_ = 0;
    bool heardNothing_ = false;
};

}  // namespace tqrhost
