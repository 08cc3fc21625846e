#pragma once

#include <cstdio>
#include <optional>
#include <stdexcept>
#include <string>

namespace ipmisel {

/// what() is one line that says what to do.
struct OutputError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// Standard output, or a file that appears whole or not at all: it is written under a name of its
/// own beside the wanted one, and renamed at the end. Throws OutputError.
class OutputFile {
public:
    /// Empty, or "-": standard output.
    explicit OutputFile(const std::optional<std::string>& name);
    /// Without Commit nothing stays behind.
    ~OutputFile();
    OutputFile(const OutputFile&) = delete;
    OutputFile& operator=(const OutputFile&) = delete;

    std::FILE* stream() const { return stream_; }
    /// Everything is written out; a file gets its name.
    void Commit();

    /// Removes the unfinished file of this process, if there is one. For signal handlers.
    static void RemoveUnfinished();

private:
    [[noreturn]] void Fail(const char* what) const;

    std::string name_;
    std::string temporary_;  ///< empty for standard output
    std::FILE* stream_ = nullptr;
};

}  // namespace ipmisel
