#pragma once

#include <string>
#include <vector>

namespace ipmisel {

/// A file that an option names.
struct NamedFile {
    std::string option;  ///< as the user wrote it, with its dashes
    std::string name;
    bool written;
};

/// Throws Failure when a file that is written is one that another option names too, by whatever
/// path. What is no regular file may be named as often as wanted.
void RefuseSameFile(const std::vector<NamedFile>& files);

}  // namespace ipmisel
