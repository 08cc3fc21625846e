#include "program/commands/password.h"

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <iterator>
#include <string_view>

#include "base/hex.h"
#include "host/spdriver/stop.h"
#include "program/commands/failure.h"
#include "program/commands/stop_signals.h"

namespace ipmisel {
namespace {

constexpr std::size_t kLongestLine = 256;  // IPMI 2.0 knows passwords of 20 bytes
constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGTSTP};

class Descriptor {
public:
    explicit Descriptor(int fd) : fd_(fd) {}
    ~Descriptor() {
        if (fd_ >= 0) close(fd_);
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int get() const { return fd_; }

private:
    int fd_;
};

[[noreturn]] void Refuse(const std::string& line) { throw Failure(kExitUsage, line); }

/// "credential:NAME" is one that the service manager hands over, systemd.exec(5).
std::string PathOf(const std::string& name) {
    constexpr std::string_view kCredential = "credential:";
    if (!name.starts_with(kCredential)) return name;
    const char* const folder = std::getenv("CREDENTIALS_DIRECTORY");
    if (folder == nullptr) {
        Refuse("there is no " + name +
               ": CREDENTIALS_DIRECTORY is not set; hand it over with "
               "LoadCredential= in the service's unit");
    }
    return std::string(folder) + "/" + name.substr(kCredential.size());
}

std::string FromFile(const std::string& name, const std::string& what) {
    const auto refuse = [&name, &what](const std::string& why) {
        Refuse("cannot read a " + what + " from " + name + ": " + why + "; name a file with the " +
               what + " in its first line");
    };
    const Descriptor file(open(PathOf(name).c_str(), O_RDONLY | O_CLOEXEC));
    if (file.get() < 0) refuse(ProblemText(errno));
    std::string line;
    for (char c = 0;;) {
        const ssize_t count = read(file.get(), &c, 1);
        if (count < 0) refuse(ProblemText(errno));
        if (count == 0 || c == '\n') {
            if (count == 0 && line.empty()) refuse("it is empty");
            break;
        }
        if (line.size() == kLongestLine) refuse("its first line is too long");
        line += c;
    }
    if (!line.empty() && line.back() == '\r') line.pop_back();
    return line;
}

volatile std::sig_atomic_t gSignal = 0;
void NoteSignal(int signal) { gSignal = signal; }

/// The terminal without echo, and with it again however the prompt ends. Signals that would end or
/// stop the program come only while Wait waits, and are passed on when the echo is back.
class QuietTerminal {
public:
    explicit QuietTerminal(int terminal) : terminal_(terminal) {
        sigset_t block;
        sigemptyset(&block);
        for (const int signal : kSignals) sigaddset(&block, signal);
        sigprocmask(SIG_BLOCK, &block, &mask_);
        gSignal = 0;
        struct sigaction note {};
        note.sa_handler = NoteSignal;
        for (std::size_t i = 0; i < std::size(kSignals); ++i) {
            sigaction(kSignals[i], &note, &actions_[i]);
        }
        known_ = tcgetattr(terminal_, &before_) == 0;
        termios quiet = before_;
        quiet.c_lflag &= ~static_cast<tcflag_t>(ECHO);
        if (known_) tcsetattr(terminal_, TCSAFLUSH, &quiet);
    }
    ~QuietTerminal() {
        if (known_) tcsetattr(terminal_, TCSAFLUSH, &before_);
        for (std::size_t i = 0; i < std::size(kSignals); ++i) {
            sigaction(kSignals[i], &actions_[i], nullptr);
        }
        const int signal = gSignal;
        if (signal != 0) raise(signal);  // waits for the next line
        sigprocmask(SIG_SETMASK, &mask_, nullptr);
    }
    QuietTerminal(const QuietTerminal&) = delete;
    QuietTerminal& operator=(const QuietTerminal&) = delete;

    /// False when a signal or the deadline came instead of input.
    bool Wait() const {
        pollfd input{terminal_, POLLIN, 0};
        const auto end = NQORTQR20::StopTime();
        if (end == std::chrono::steady_clock::time_point::max()) {
            return ppoll(&input, 1, nullptr, &mask_) > 0;
        }
        const auto rest = std::max(
            std::chrono::ceil<std::chrono::milliseconds>(end - std::chrono::steady_clock::now()),
            std::chrono::milliseconds(0));
        const timespec wait{static_cast<time_t>(rest.count() / 1000),
                            static_cast<long>(rest.count() % 1000 * 1'000'000)};
        return ppoll(&input, 1, &wait, &mask_) > 0;
    }

private:
    int terminal_;
    bool known_ = false;
    termios before_{};
    sigset_t mask_{};
    struct sigaction actions_[std::size(kSignals)]{};
};

/// Empty when a signal or the end of the input came before a line was whole.
std::optional<std::string> Prompt(int terminal) {
    static constexpr char kPrompt[] = "Password: ";
    const QuietTerminal quiet(terminal);
    if (write(terminal, kPrompt, sizeof kPrompt - 1) < 0) return std::nullopt;
    std::optional<std::string> password;
    std::string line;
    for (char c = 0; quiet.Wait() && read(terminal, &c, 1) == 1;) {
        if (c == '\n') {
            password = line;
            break;
        }
        if (line.size() < kLongestLine) line += c;
    }
    // The line end that was typed has not been shown.
    if (write(terminal, "\n", 1) < 0) return std::nullopt;
    return password;
}

std::string FromTerminal() {
    const Descriptor terminal(open("/dev/tty", O_RDWR | O_CLOEXEC | O_NOCTTY));
    if (terminal.get() < 0) {
        Refuse(
            "a password is needed and there is no terminal to ask at; give --password-file "
            "FILE or set IPMISEL_PASSWORD");
    }
    const std::optional<std::string> password = Prompt(terminal.get());
    if (!password && NQORTQR20::Stopped() != NQORTQR20::StopReason::kNone) {
        Refuse("the deadline has passed at the prompt; type sooner, or give --password-file FILE");
    }
    if (!password) Refuse("no password was typed; type one and Enter, or give --password-file");
    return *password;
}

constexpr std::size_t kLongestKg = 20;  // IPMI 2.0, clause 13.33

}  // namespace

std::string ReadPassword(const std::optional<std::string>& file) {
    if (file) return FromFile(*file, "password");
    if (const char* given = std::getenv("IPMISEL_PASSWORD")) return given;
    return FromTerminal();
}

std::vector<std::uint8_t> ReadKg(const std::optional<std::string>& file) {
    const char* const given = std::getenv("IPMISEL_KG");
    if (!file && given == nullptr) return {};
    const std::string text = file ? FromFile(*file, "key") : given;
    const bool isHex = text.starts_with("0x");
    auto key =
        isHex ? ParseHex(std::string_view(text).substr(2)).value_or(std::vector<std::uint8_t>())
              : std::vector<std::uint8_t>(text.begin(), text.end());
    if (key.empty() || key.size() > kLongestKg) {
        Refuse("the key of the BMC (Kg) from " + (file ? *file : "IPMISEL_KG") +
               " is none; give 1 to 20 characters, or 0x and 2 to 40 hexadecimal digits");
    }
    return key;
}

}  // namespace ipmisel
