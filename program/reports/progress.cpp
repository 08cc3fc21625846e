#include "program/reports/progress.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstdlib>
#include <utility>

#include "program/reports/terminal_text.h"

namespace ipmisel {
namespace {

using namespace std::chrono_literals;

constexpr auto kDelay = 1s;
constexpr auto kInterval = 200ms;
constexpr std::size_t kUsualWidth = 80;
// ECMA-48: to the first column, erase to the end of the line.
constexpr std::string_view kErase = "\r\x1b[K";

/// Standard error belongs to the whole process, and so does the line on it.
std::atomic<bool> gShown{false};
static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler reads it");

bool IsTerminal() {
    const char* const type = std::getenv("TERM");
    return isatty(STDERR_FILENO) == 1 && type != nullptr && *type != '\0' &&
           std::string_view(type) != "dumb";
}

std::size_t Width() {
    winsize size{};
    return ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col
                                                                           : kUsualWidth;
}

std::string TimeLeft(double seconds) {
    constexpr long kMinute = 60;
    constexpr long kHour = 60 * kMinute;
    constexpr double kTooLong = 100.0 * kHour;
    if (!(seconds < kTooLong)) return {};
    const long rest = std::max(1L, std::lround(seconds));
    std::string text;
    if (rest >= kHour) {
        text =
            std::to_string(rest / kHour) + " h " + std::to_string(rest % kHour / kMinute) + " min";
    } else if (rest >= kMinute) {
        text = std::to_string(rest / kMinute) + " min " + std::to_string(rest % kMinute) + " s";
    } else {
        text = std::to_string(rest) + " s";
    }
    return ", about " + text + " left";
}

}  // namespace

std::string ProgressText(const ProgressCount& count, std::optional<double> secondsLeft) {
    std::string text = std::string(count.what) + ": " + std::to_string(count.done);
    if (count.total) text += " of " + std::to_string(*count.total);
    text.append(" ").append(count.unit);
    if (!count.note.empty()) text.append(", ").append(count.note);
    if (secondsLeft) text += TimeLeft(*secondsLeft);
    return TerminalText(text);
}

ProgressLine::ProgressLine(std::function<Clock::time_point()> now)
    : now_(std::move(now)), enabled_(IsTerminal()), drawAt_(now_() + kDelay) {}

ProgressLine::~ProgressLine() { HideProgress(); }

std::optional<double> ProgressLine::SecondsLeft(const ProgressCount& count,
                                                Clock::time_point now) const {
    const std::chrono::duration<double> passed = now - began_;
    // What has come in a moment tells nothing of the rest.
    if (!count.total || count.done <= doneBefore_ || *count.total <= count.done || passed < 500ms) {
        return std::nullopt;
    }
    return passed.count() * static_cast<double>(*count.total - count.done) /
           static_cast<double>(count.done - doneBefore_);
}

void ProgressLine::Show(const ProgressCount& count) {
    if (!enabled_ || count.total == std::size_t{0}) return;
    const Clock::time_point now = now_();
    if (count.what != what_ || count.done < doneBefore_) {
        what_ = count.what;
        began_ = now;
        doneBefore_ = count.done;
    }
    if (now < drawAt_) return;
    drawAt_ = now + kInterval;
    // A job in the background leaves the terminal to whoever has it.
    if (tcgetpgrp(STDERR_FILENO) != getpgrp()) return;
    const std::string text = ProgressText(count, SecondsLeft(count, now));
    std::string line(kErase);
    // The last column stays free: a full line would go on in the next one.
    const std::size_t width = Width() - 1;
    line += Columns(text) > width ? Fit(text, width) : text;
    gShown = true;
    if (write(STDERR_FILENO, line.data(), line.size()) < 0) enabled_ = false;
}

void HideProgress() {
    if (!gShown.exchange(false)) return;
    // Nobody is there to be told when it fails.
    [[maybe_unused]] const auto written = write(STDERR_FILENO, kErase.data(), kErase.size());
}

}  // namespace ipmisel
