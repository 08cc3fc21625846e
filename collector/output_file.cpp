#include "collector/output_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>

#include "base/text.h"

namespace ipmisel {
namespace {

// What a signal handler can see: plain characters, set before and cleared after the file exists.
char gUnfinished[PATH_MAX] = {};

}  // namespace

void OutputFile::Fail(const char* what) const {
    throw OutputError("cannot " + std::string(what) + " " +
                      (temporary_.empty() && name_.empty() ? "standard output" : name_) + ": " +
                      std::strerror(errno) + "; choose another --output");
}

OutputFile::OutputFile(const std::optional<std::string>& name) {
    if (!name || *name == "-") {
        stream_ = stdout;
        return;
    }
    name_ = *name;
    struct stat found {};
    if (stat(name_.c_str(), &found) == 0 && S_ISDIR(found.st_mode)) {
        errno = EISDIR;
        Fail("write");
    }
    // O_EXCL follows no link that somebody has put there, and takes nobody else's file.
    temporary_ = name_ + Format(".%ld.part", static_cast<long>(getpid()));
    if (temporary_.size() >= sizeof gUnfinished) {
        errno = ENAMETOOLONG;
        Fail("write");
    }
    const int fd = open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
    if (fd < 0) {
        const int error = errno;
        temporary_.clear();
        errno = error;
        Fail("write");
    }
    std::memcpy(gUnfinished, temporary_.c_str(), temporary_.size() + 1);
    stream_ = fdopen(fd, "w");
    if (stream_ == nullptr) Fail("write");
}

OutputFile::~OutputFile() {
    if (temporary_.empty()) return;
    if (stream_ != nullptr) std::fclose(stream_);
    RemoveUnfinished();
}

void OutputFile::Commit() {
    if (std::fflush(stream_) != 0 || std::ferror(stream_) != 0) Fail("write");
    if (temporary_.empty()) return;
    if (fsync(fileno(stream_)) != 0 && errno != EINVAL) Fail("write");
    const int closed = std::fclose(stream_);
    stream_ = nullptr;
    if (closed != 0) Fail("write");
    if (rename(temporary_.c_str(), name_.c_str()) != 0) Fail("write");
    gUnfinished[0] = '\0';
    temporary_.clear();
}

void OutputFile::RemoveUnfinished() {
    if (gUnfinished[0] == '\0') return;
    unlink(gUnfinished);
    gUnfinished[0] = '\0';
}

}  // namespace ipmisel
