#include "program/fleet/fork_server.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <fstream>
#include <span>
#include <string_view>
#include <vector>

#include "program/commands/failure.h"

// A request is a datagram with the worker's name and its descriptors (SCM_RIGHTS), the answer one
// with the number of its process, or an error number below zero.

namespace ipmisel {
namespace {

constexpr std::size_t kDescriptors = 4;
constexpr std::size_t kMaxName = 1024;

using Descriptors = std::array<int, kDescriptors>;
using Work = std::function<int(const std::string&)>;

[[noreturn]] void Fail(int error) {
    throw Failure(kExitUsage, std::string("cannot start a worker: ") + std::strerror(error) +
                                  "; collect from fewer at a time with --jobs");
}

/// What a datagram with descriptors is made of; valid as long as the object stays where it is.
struct Datagram {
    explicit Datagram(std::span<char> bytes) : part{bytes.data(), bytes.size()} {
        header.msg_iov = &part;
        header.msg_iovlen = 1;
        header.msg_control = control;
        header.msg_controllen = sizeof control;
    }
    Datagram(const Datagram&) = delete;
    Datagram& operator=(const Datagram&) = delete;

    iovec part;
    msghdr header{};
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(Descriptors))]{};
};

/// A secret in the environment would stand in every worker's memory, for /proc to show.
void WipeSecrets() {
    for (char** variable = environ; *variable != nullptr; ++variable) {
        for (const std::string_view name : {"IPMISEL_PASSWORD=", "IPMISEL_KG="}) {
            if (!std::string_view(*variable).starts_with(name)) continue;
            explicit_bzero(*variable + name.size(), std::strlen(*variable + name.size()));
        }
    }
}

/// Where the system shows what a process is (ps): its arguments, overwritten.
class Title {
public:
    Title() {
        std::ifstream in("/proc/self/stat");
        const std::string text(std::istreambuf_iterator<char>(in), {});
        // proc(5): the name of the program in parentheses is the second field
        constexpr int kArgumentsBegin = 48, kArgumentsEnd = 49;
        std::size_t at = text.rfind(')');
        for (int field = 2; at < text.size() && field < kArgumentsEnd; ++field) {
            at = text.find(' ', at + 1);
            if (at == std::string::npos) return;
            const auto number = std::strtoull(text.c_str() + at, nullptr, 10);
            if (field + 1 == kArgumentsBegin) begin_ = static_cast<std::uintptr_t>(number);
            if (field + 1 == kArgumentsEnd) end_ = static_cast<std::uintptr_t>(number);
        }
    }
    /// As much of it as there is room for.
    void Set(const std::string& text) const {
        if (begin_ == 0 || end_ <= begin_) return;
        const std::size_t room = end_ - begin_;
        // NOLINTNEXTLINE(performance-no-int-to-ptr): the system gives the address as a number
        auto* const place = reinterpret_cast<char*>(begin_);
        std::memset(place, 0, room);
        std::copy_n(text.begin(), std::min(text.size(), room - 1), place);
    }

private:
    std::uintptr_t begin_ = 0, end_ = 0;
};

/// In the worker: never returns.
[[noreturn]] void BeWorker(const Work& work, const std::string& name, const Descriptors& given) {
    setpgid(0, 0);
    Descriptors high{};  // where none of them is in the way of another
    std::transform(given.begin(), given.end(), high.begin(), [](int descriptor) {
        return fcntl(descriptor, F_DUPFD_CLOEXEC, static_cast<int>(2 * kDescriptors));
    });
    for (const int descriptor : given) close(descriptor);
    for (std::size_t i = 0; i < kDescriptors; ++i) {
        if (dup2(high[i], static_cast<int>(i)) < 0) _exit(kExitPassFailed);
        close(high[i]);
    }
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
    int status = kExitPassFailed;
    try {
        status = work(name);
    } catch (const std::exception&) {
        // Whoever waits for its result sees that there is none.
    }
    std::fflush(nullptr);
    // What was made for all workers is not this one's to take down.
    _exit(status);
}

/// The number of the new worker's process, or an error number below zero.
std::int32_t MakeWorker(const Work& work, const std::string& name, const Descriptors& descriptors) {
    // As fork(), but the worker is a child of whoever made the server (clone(2), CLONE_PARENT). The
    // server has one thread, and nothing here wants what fork() does for libraries.
    const long worker =
        syscall(SYS_clone, CLONE_PARENT | SIGCHLD, nullptr, nullptr, nullptr, nullptr);
    if (worker == 0) BeWorker(work, name, descriptors);
    return static_cast<std::int32_t>(worker < 0 ? -errno : worker);
}

/// Until the other end is closed.
void Serve(const FileDescriptor& socket, const Title& title, const Work& work) {
    const Work titled = [&](const std::string& name) {
        title.Set("ipmisel worker " + name);
        return work(name);
    };
    for (;;) {
        std::array<char, kMaxName> name;
        Datagram request(name);
        const ssize_t length = recvmsg(socket.get(), &request.header, MSG_CMSG_CLOEXEC);
        if (length < 0 && errno == EINTR) continue;
        if (length <= 0) return;
        const cmsghdr* const rights = CMSG_FIRSTHDR(&request.header);
        std::int32_t answer = -EBADMSG;
        if (rights != nullptr && rights->cmsg_len == CMSG_LEN(sizeof(Descriptors))) {
            Descriptors descriptors;
            std::memcpy(descriptors.data(), CMSG_DATA(rights), sizeof descriptors);
            answer = MakeWorker(titled, std::string(name.data(), static_cast<std::size_t>(length)),
                                descriptors);
            for (const int descriptor : descriptors) close(descriptor);
        }
        if (send(socket.get(), &answer, sizeof answer, MSG_NOSIGNAL) < 0) return;
    }
}

}  // namespace

ForkServer::ForkServer(const std::function<void()>& prepare, const Work& work) {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) Fail(errno);
    socket_ = FileDescriptor(ends[0]);
    FileDescriptor other(ends[1]);
    std::fflush(nullptr);  // what waits in a buffer is not to be written twice
    process_ = fork();
    if (process_ < 0) Fail(errno);
    if (process_ > 0) return;
    try {
        socket_.Close();
        setpgid(0, 0);  // Ctrl-C is for whoever made it
        WipeSecrets();
        const Title title;
        title.Set("ipmisel fork server");
        prepare();
        Serve(other, title, work);
    } catch (const std::exception&) {
        // Whoever made it sees that it is gone.
    }
    _exit(0);
}

ForkServer::~ForkServer() {
    socket_.Close();
    while (waitpid(process_, nullptr, 0) < 0 && errno == EINTR) {
    }
}

void ForkServer::RequestWorker(const std::string& name, const std::array<int, 4>& descriptors) {
    std::string shown = name.empty() ? "?" : name.substr(0, kMaxName);
    Datagram request(shown);
    cmsghdr* const rights = CMSG_FIRSTHDR(&request.header);
    rights->cmsg_level = SOL_SOCKET;
    rights->cmsg_type = SCM_RIGHTS;
    rights->cmsg_len = CMSG_LEN(sizeof descriptors);
    std::memcpy(CMSG_DATA(rights), descriptors.data(), sizeof descriptors);
    if (sendmsg(socket_.get(), &request.header, MSG_NOSIGNAL) < 0) Fail(errno);
}

pid_t ForkServer::AwaitWorker() {
    std::int32_t answer = 0;
    ssize_t length = 0;
    while ((length = recv(socket_.get(), &answer, sizeof answer, 0)) < 0 && errno == EINTR) {
    }
    if (length != sizeof answer) Fail(ECHILD);
    if (answer < 0) Fail(-answer);
    return answer;
}

}  // namespace ipmisel
