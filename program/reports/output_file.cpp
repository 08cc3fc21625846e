#include "program/reports/output_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <system_error>

#include "base/text.h"
#include "program/commands/failure.h"
#include "program/commands/stop_signals.h"
#include "program/reports/report_sink.h"

namespace ipmisel {
namespace {

constexpr std::size_t kBuffer = 1 << 16;
constexpr int kMaxNames = 100;
constexpr mode_t kNewFileMode = 0600;  // serial numbers and addresses are not for everybody

/// A device, a pipe or the like, also through a symbolic link; there is nothing to replace.
bool IsWrittenInPlace(const std::string& name) {
    struct stat status {};
    if (name.starts_with("/dev/")) return true;  // /dev/stdout may lead to a regular file
    return stat(name.c_str(), &status) == 0 && !S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode);
}

/// Of the temporary files of one output file; short, whatever that is called.
std::string TemporaryPrefix(const std::string& name) {
    std::uint64_t hash = 0xCBF29CE484222325;  // FNV-1a, 64 bits
    for (const char c : name) hash = (hash ^ static_cast<std::uint8_t>(c)) * 0x100000001B3;
    return Format(".ipmisel-%016llx.", static_cast<unsigned long long>(hash));
}

/// Removes temporary files of runs that were killed; nobody holds their lock.
void RemoveLeftovers(const std::filesystem::path& folder, const std::string& prefix) {
    std::error_code error;
    for (std::filesystem::directory_iterator entry(folder.empty() ? "." : folder, error), end;
         !error && entry != end; entry.increment(error)) {
        if (!entry->path().filename().string().starts_with(prefix)) continue;
        const int file =
            open(entry->path().c_str(), O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
        if (file < 0) continue;
        if (flock(file, LOCK_EX | LOCK_NB) == 0) unlink(entry->path().c_str());
        close(file);
    }
}

}  // namespace

OutputFile::OutputFile(const std::optional<std::string>& name)
    : name_(name == "-" ? "" : name.value_or("")) {
    buffer_.reserve(kBuffer);
    if (name_.empty()) {
        file_ = STDOUT_FILENO;
    } else if (IsWrittenInPlace(name_)) {
        file_ = open(name_.c_str(), O_WRONLY | O_CLOEXEC);
        if (file_ < 0) Fail(errno);
    } else {
        OpenBeside();
    }
}

void OutputFile::OpenBeside() {
    struct stat before {};
    const bool exists = stat(name_.c_str(), &before) == 0;
    if (exists && S_ISDIR(before.st_mode)) Fail(EISDIR);
    // A file that may not be written is not to be replaced either.
    if (access(name_.c_str(), W_OK) != 0 && errno != ENOENT) Fail(errno);
    const std::filesystem::path place(name_);
    const std::string prefix = TemporaryPrefix(place.filename().string());
    RemoveLeftovers(place.parent_path(), prefix);
    const SignalsHeld held;
    for (int i = 0; file_ < 0 && i < kMaxNames; ++i) {
        const std::string other =
            prefix + std::to_string(getpid()) + (i == 0 ? "" : "-" + std::to_string(i));
        temporary_ = (place.parent_path() / other).string();
        // O_EXCL does not follow a symbolic link.
        file_ = open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kNewFileMode);
        if (file_ < 0 && errno != EEXIST) break;
    }
    if (file_ < 0) {
        temporary_.clear();
        Fail(errno);
    }
    RemoveWhenKilled(temporary_);
    flock(file_, LOCK_EX | LOCK_NB);  // as long as it is held, the file is no leftover
    if (exists) TakeOver(before);
}

void OutputFile::TakeOver(const struct stat& before) const {
    // Only root may give a file away; whoever may not keeps the group if that is allowed.
    if (fchown(file_, before.st_uid, before.st_gid) != 0 &&
        fchown(file_, static_cast<uid_t>(-1), before.st_gid) != 0) {
        fchmod(file_, before.st_mode & 0707);  // what the group could do, this one should not
        return;
    }
    fchmod(file_, before.st_mode & 0777);
}

OutputFile::~OutputFile() {
    const SignalsHeld held;
    if (file_ >= 0 && file_ != STDOUT_FILENO) close(file_);
    if (!temporary_.empty()) unlink(temporary_.c_str());
    RemoveWhenKilled("");
}

void OutputFile::Write(std::string_view text) {
    if (buffer_.size() + text.size() > kBuffer) Flush();
    if (text.size() > kBuffer) buffer_.reserve(text.size());
    buffer_ += text;
}

void OutputFile::Flush() {
    std::string_view rest = buffer_;
    while (!rest.empty()) {
        const ssize_t written = write(file_, rest.data(), rest.size());
        if (written >= 0) {
            rest.remove_prefix(static_cast<std::size_t>(written));
        } else if (errno != EINTR || OutputIsOver()) {
            buffer_.clear();
            Fail(errno);
        }
    }
    buffer_.clear();
}

void OutputFile::Commit() {
    Flush();
    if (temporary_.empty()) return;
    // Only what is on the disk may take the place of what was there.
    if (fsync(file_) != 0 && errno != EINVAL) Fail(errno);
    const SignalsHeld held;
    // A symbolic link in that place is replaced, not followed.
    if (rename(temporary_.c_str(), name_.c_str()) != 0) Fail(errno);
    temporary_.clear();
    RemoveWhenKilled("");
}

void OutputFile::Fail(int error) const {
    if (error == EPIPE && temporary_.empty()) {
        // The reader has seen enough (`| head`): end as other programs do, without a word.
        std::signal(SIGPIPE, SIG_DFL);
        std::raise(SIGPIPE);
    }
    if (name_.empty()) {
        throw Failure(kExitUsage, "cannot write to standard output: " + ProblemText(error) +
                                      "; send it elsewhere or use --output FILE");
    }
    throw Failure(kExitUsage, "cannot write " + name_ + ": " + ProblemText(error) +
                                  "; name another file with --output");
}

}  // namespace ipmisel
