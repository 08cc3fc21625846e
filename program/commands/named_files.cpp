#include "program/commands/named_files.h"

#include <sys/stat.h>

#include <filesystem>
#include <optional>
#include <system_error>
#include <tuple>

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

/// Device and inode of a file, or of the folder in which it would be made, and then its name.
using Identity = std::tuple<dev_t, ino_t, std::string>;

std::optional<Identity> IdentityOf(const std::string& name) {
    struct stat status {};
    if (stat(name.c_str(), &status) == 0) {
        if (!S_ISREG(status.st_mode)) return std::nullopt;
        return Identity(status.st_dev, status.st_ino, "");
    }
    const std::filesystem::path path(name);
    const auto folder = path.has_parent_path() ? path.parent_path() : std::filesystem::path(".");
    if (stat(folder.c_str(), &status) != 0) return std::nullopt;
    return Identity(status.st_dev, status.st_ino, path.filename().string());
}

}  // namespace

void RefuseSameFile(const std::vector<NamedFile>& files) {
    for (std::size_t i = 0; i < files.size(); ++i) {
        for (std::size_t j = 0; j < i; ++j) {
            if (!files[i].written && !files[j].written) continue;
            const auto identity = IdentityOf(files[i].name);
            if (!identity || identity != IdentityOf(files[j].name)) continue;
            throw Failure(kExitUsage, files[j].option + " and " + files[i].option +
                                          " name one file, " + files[i].name +
                                          "; name another with one of them");
        }
    }
}

}  // namespace ipmisel
