#include "collector/password.h"

#include <fcntl.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <fstream>

#include "host/spdriver/transport.h"

namespace ipmisel {
namespace {

std::string FromFile(const std::string& file) {
    std::ifstream in(file);
    std::string line;
    if (!in || !std::getline(in, line)) {
        throw tqrhost::SourceError("cannot read a password from " + file +
                                   "; check --password-file");
    }
    if (!line.empty() && line.back() == '\r') line.pop_back();
    return line;
}

/// The terminal without echo, and with it again however the prompt ends.
class QuietTerminal {
public:
    explicit QuietTerminal(int fd) : fd_(fd) {
        // A signal that would end the program waits until the echo is back.
        sigset_t block;
        sigemptyset(&block);
        for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGTSTP}) {
            sigaddset(&block, signal);
        }
        sigprocmask(SIG_BLOCK, &block, &signals_);
        known_ = tcgetattr(fd_, &before_) == 0;
        termios quiet = before_;
        quiet.c_lflag &= ~static_cast<tcflag_t>(ECHO | ISIG);
        if (known_) tcsetattr(fd_, TCSAFLUSH, &quiet);
    }
    ~QuietTerminal() {
        if (known_) tcsetattr(fd_, TCSAFLUSH, &before_);
        sigprocmask(SIG_SETMASK, &signals_, nullptr);
    }
    QuietTerminal(const QuietTerminal&) = delete;
    QuietTerminal& operator=(const QuietTerminal&) = delete;

private:
    int fd_;
    bool known_ = false;
    termios before_{};
    sigset_t signals_{};
};

std::string FromTerminal() {
    const int fd = open("/dev/tty", O_RDWR | O_CLOEXEC | O_NOCTTY);
    if (fd < 0) {
        throw tqrhost::SourceError(
            "no password: give --password-file FILE or set IPMISEL_PASSWORD");
    }
    std::string password;
    bool interrupted = false;
    {
        const QuietTerminal quiet(fd);
        static constexpr char kPrompt[] = "Password: ";
        if (write(fd, kPrompt, sizeof kPrompt - 1) < 0) errno = 0;
        for (char c = 0; read(fd, &c, 1) == 1 && c != '\n';) {
            interrupted = c == 3;  // Ctrl-C, which makes no signal now
            if (interrupted) break;
            password += c;
        }
        if (write(fd, "\n", 1) < 0) errno = 0;
    }
    close(fd);
    if (interrupted) throw tqrhost::SourceError("interrupted at the password");
    return password;
}

}  // namespace

std::string ReadPassword(const std::optional<std::string>& file) {
    if (file) return FromFile(*file);
    if (const char* given = std::getenv("IPMISEL_PASSWORD")) return given;
    return FromTerminal();
}

}  // namespace ipmisel
