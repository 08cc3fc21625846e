#pragma once

#include <sys/stat.h>

#include <optional>
#include <string>
#include <string_view>

namespace ipmisel {

/// Where the report goes: standard output, or a file that appears whole or not at all. Every
/// operation throws Failure.
class OutputFile {
public:
    /// None or "-" is standard output. A regular file is written beside its place under another
    /// name, and keeps mode and owner of the one that it replaces; a new one has mode 0600. What is
    /// no regular file (a device, a pipe) is written as it stands.
    explicit OutputFile(const std::optional<std::string>& name);
    /// Without Commit nothing stays behind.
    ~OutputFile();
    OutputFile(const OutputFile&) = delete;
    OutputFile& operator=(const OutputFile&) = delete;

    void Write(std::string_view text);
    /// What was written is with the reader, where the output is no regular file.
    void Flush();
    /// Flushes, syncs and renames into place. Nothing may follow.
    void Commit();

private:
    void OpenBeside();
    /// Mode and owner of the file that is to be replaced.
    void TakeOver(const struct stat& before) const;
    [[noreturn]] void Fail(int error) const;

    std::string name_;       ///< as the user wrote it; empty for standard output
    std::string temporary_;  ///< until it stands in its place
    std::string buffer_;
    int file_ = -1;
};

}  // namespace ipmisel
