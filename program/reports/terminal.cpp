#include "program/reports/terminal.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <string>

namespace ipmisel {
namespace {

constexpr std::size_t kNoTerminalWidth = 100;
constexpr std::size_t kMinWidth = 40;
constexpr std::size_t kMaxWidth = 1000;

std::string Environment(const char* name) {
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

bool IsDumb() {
    const std::string terminal = Environment("TERM");
    return terminal.empty() || terminal == "dumb";
}

std::size_t Width(bool terminal) {
    if (const unsigned long columns = std::strtoul(Environment("COLUMNS").c_str(), nullptr, 10)) {
        return columns;
    }
    winsize size{};
    if (terminal && ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0) {
        return size.ws_col;
    }
    return kNoTerminalWidth;
}

}  // namespace

ReportLook LookOfOutput(std::string_view colour, bool toFile) {
    const bool terminal = !toFile && isatty(STDOUT_FILENO) == 1;
    ReportLook look;
    look.width = std::clamp(Width(terminal), kMinWidth, kMaxWidth);
    const bool automatic = terminal && !IsDumb() && Environment("NO_COLOR").empty();
    look.colour = colour == "always" || (colour == "auto" && automatic);
    return look;
}

bool Pager::Start() {
    if (process_ >= 0 || isatty(STDOUT_FILENO) != 1 || IsDumb()) return process_ > 0;
    std::string pager = Environment("IPMISEL_PAGER");
    if (pager.empty()) pager = Environment("PAGER");
    if (pager == "cat") return false;
    // Who named no pager is told nothing of one that is missing.
    if (pager.empty()) pager = "command -v less >/dev/null && less";
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) return false;
    // Through the shell, since PAGER may have arguments; without the pager the text goes on as it
    // is.
    const std::string command = pager + " || cat";
    process_ = fork();
    if (process_ == 0) {
        dup2(ends[0], STDIN_FILENO);
        setenv("LESS", "FRX", 0);  // quit when it fits, show colours, leave the screen alone
        for (const int signal : {SIGPIPE, SIGINT, SIGTERM, SIGHUP}) std::signal(signal, SIG_DFL);
        execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
        _exit(127);
    }
    if (process_ > 0) dup2(ends[1], STDOUT_FILENO);
    close(ends[0]);
    close(ends[1]);
    return process_ > 0;
}

void Pager::Wait() {
    if (process_ <= 0) return;
    // It has the terminal for as long as somebody reads.
    std::signal(SIGINT, SIG_IGN);
    close(STDOUT_FILENO);
    while (waitpid(process_, nullptr, 0) < 0 && errno == EINTR) {
    }
    process_ = -1;
}

}  // namespace ipmisel
