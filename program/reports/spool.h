#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

#include "program/reports/output_file.h"

namespace ipmisel {

/// A file without a name, for what has to wait until the rest of a report is known. Every operation
/// throws Failure.
class Spool {
public:
    Spool();
    void Write(std::string_view text);
    /// The file, for whoever reads parts of it; what was written is there after Rewind.
    int Descriptor() const { return fileno(file_.get()); }
    /// All that was written, in one piece.
    void CopyTo(OutputFile& out);

    // Or as a list of texts, each with its length before it.
    void Append(std::string_view text);
    void Rewind();
    /// The next of the texts; false when there is none.
    bool Next(std::string* text);

private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };

    std::unique_ptr<std::FILE, Close> file_;
};

}  // namespace ipmisel
