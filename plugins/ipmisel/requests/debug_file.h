#pragma once

#include <cstdio>
#include <memory>

namespace ipmisel {

/// The dump file of a request object; closed with it at the latest.
class DebugFile {
public:
    bool Open(const char* path) {
        stream_.reset(std::fopen(path, "w"));
        return stream_ != nullptr;
    }
    /// False also when none is open.
    bool Close() { return stream_ != nullptr && std::fclose(stream_.release()) == 0; }

private:
    struct Closer {
        void operator()(std::FILE* stream) const { std::fclose(stream); }
    };
    std::unique_ptr<std::FILE, Closer> stream_;
};

}  // namespace ipmisel
