#pragma once

#include <fcntl.h>
#include <pty.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <fstream>
#include <map>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace ipmiseltest {

/// What a program left behind.
struct Ended {
    int exitStatus = -1;  ///< -1 when a signal ended it
    int signal = 0;
    std::string out;
    std::string err;
};

/// The text of a file; empty when there is none.
inline std::string ReadText(const std::string& file) {
    std::ifstream in(file, std::ios::binary);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

/// How a program is run.
struct Setting {
    std::map<std::string, std::string> environment{};  ///< beside what is there
    bool onTerminal = false;                  ///< with a terminal of its own, which Terminal() is
    unsigned long fileLimit = RLIM_INFINITY;  ///< largest file that it may write
};

/// A program that runs without a terminal, its output kept in files of a folder.
class RunningProgram {
public:
    RunningProgram(const std::string& folder, std::vector<std::string> command,
                   const Setting& setting = {})
        : out_(folder + "/stdout"), err_(folder + "/stderr") {
        // So that nobody takes what another run wrote for its own.
        unlink(out_.c_str());
        unlink(err_.c_str());
        int master = -1;
        process_ = setting.onTerminal ? forkpty(&master, nullptr, nullptr, nullptr) : fork();
        if (process_ < 0) throw std::runtime_error("no process for " + command[0]);
        terminal_ = master;
        if (process_ == 0) Become(command, setting);
    }
    ~RunningProgram() {
        if (process_ > 0) {
            kill(process_, SIGKILL);
            waitpid(process_, nullptr, 0);
        }
        if (terminal_ >= 0) close(terminal_);
    }
    RunningProgram(const RunningProgram&) = delete;
    RunningProgram& operator=(const RunningProgram&) = delete;

    int Terminal() const { return terminal_; }
    void Signal(int signal) const { kill(process_, signal); }
    /// What it has written to standard error so far.
    std::string Errors() const { return ReadText(err_); }
    Ended Wait() {
        int status = 0;
        waitpid(process_, &status, 0);
        process_ = -1;
        return {WIFEXITED(status) ? WEXITSTATUS(status) : -1,
                WIFSIGNALED(status) ? WTERMSIG(status) : 0, ReadText(out_), ReadText(err_)};
    }

private:
    [[noreturn]] void Become(const std::vector<std::string>& command, const Setting& setting) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        if (!setting.onTerminal) setsid();
        if (setting.fileLimit != RLIM_INFINITY) {
            signal(SIGXFSZ, SIG_IGN);
            const rlimit limit{setting.fileLimit, setting.fileLimit};
            setrlimit(RLIMIT_FSIZE, &limit);
        }
        unsetenv("IPMISEL_PASSWORD");
        for (const auto& [name, value] : setting.environment) {
            setenv(name.c_str(), value.c_str(), 1);
        }
        if (!setting.onTerminal) dup2(open("/dev/null", O_RDONLY), STDIN_FILENO);
        dup2(open(out_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600), STDOUT_FILENO);
        dup2(open(err_.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600), STDERR_FILENO);
        std::vector<char*> arguments;
        for (const std::string& part : command)
            arguments.push_back(const_cast<char*>(part.c_str()));
        arguments.push_back(nullptr);
        execv(arguments[0], arguments.data());
        _exit(127);
    }

    std::string out_;
    std::string err_;
    pid_t process_ = -1;
    int terminal_ = -1;
};

/// Whether something becomes true before patience ends.
template <typename Condition>
bool Eventually(Condition condition) {
    for (int i = 0; i < 1000; ++i) {
        if (condition()) return true;
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    return condition();
}

}  // namespace ipmiseltest
