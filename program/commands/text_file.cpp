#include "program/commands/text_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>

#include "program/commands/failure.h"

namespace ipmisel {

std::string ReadTextFile(const std::string& name, const std::string& option, std::size_t maxSize) {
    const auto refuse = [&](const std::string& why) {
        throw Failure(kExitUsage,
                      "cannot read " + name + ": " + why + "; name another file with " + option);
    };
    // Not blocking: nobody may write to a pipe.
    const int descriptor = open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (descriptor < 0) refuse(std::strerror(errno));
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(fdopen(descriptor, "r"),
                                                               std::fclose);
    struct stat status {};
    if (!file || fstat(descriptor, &status) != 0) refuse(std::strerror(errno));
    if (!S_ISREG(status.st_mode)) refuse("it is no regular file");
    std::string text;
    std::array<char, 1 << 14> part;
    errno = 0;
    while (const std::size_t count = std::fread(part.data(), 1, part.size(), file.get())) {
        text.append(part.data(), count);
        if (text.size() > maxSize) {
            refuse("it has more than " + std::to_string(maxSize) + " bytes");
        }
    }
    if (std::ferror(file.get()) != 0) refuse(std::strerror(errno));
    if (text.find('\0') != std::string::npos) refuse("it is no text");
    return text;
}

}  // namespace ipmisel
