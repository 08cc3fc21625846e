#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace ipmisel {

/// How far a long piece of work is.
struct ProgressCount {
    std::string_view what;  ///< "event log"; any text
    std::size_t done = 0;
    std::optional<std::size_t> total{};  ///< empty when it is not known
    std::string_view unit{};             ///< of both: "records"
    std::string_view note{};             ///< what else is to be said: "3 failed"
};
/// "event log: 120 of 512 records, 3 failed, about 8 s left", as far as it is known.
std::string ProgressText(const ProgressCount& count, std::optional<double> secondsLeft);

/// A line on standard error that says how far a long piece of work is and how long it will still
/// take. It is there on a terminal only, while the program is in its foreground, and once the work
/// has taken a second; it is gone when the object is.
class ProgressLine {
public:
    using Clock = std::chrono::steady_clock;
    explicit ProgressLine(std::function<Clock::time_point()> now = Clock::now);
    ~ProgressLine();
    ProgressLine(const ProgressLine&) = delete;
    ProgressLine& operator=(const ProgressLine&) = delete;

    /// False when nothing would ever be seen.
    bool Enabled() const { return enabled_; }
    /// May be called as often as anything changes: a few times a second it is drawn. The time that
    /// is left comes from the counts since `what` changed last.
    void Show(const ProgressCount& count);

private:
    std::optional<double> SecondsLeft(const ProgressCount& count, Clock::time_point now) const;

    std::function<Clock::time_point()> now_;
    bool enabled_;
    Clock::time_point drawAt_;
    std::string what_;
    Clock::time_point began_;     ///< when `what_` came up,
    std::size_t doneBefore_ = 0;  ///< with so much done
};

/// Takes the line from the terminal, where one is, before something else is written there. A signal
/// handler may call it.
void HideProgress();

}  // namespace ipmisel
