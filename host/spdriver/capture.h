#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "host/spdriver/source.h"

namespace NQORTQR20 {

/// Greatest length of a line without its end. Far more than a machine's SMBIOS takes, which stands
/// in the first one.
constexpr std::size_t kMaxCaptureLine = std::size_t{4} << 20;

/// A capture file in the making; docs/capture.md has its format. It is complete when the transports
/// that write to it are gone.
class CaptureWriter {
public:
    virtual ~CaptureWriter() = default;
    /// Flushes; false when anything could not be written.
    virtual bool Finish() = 0;
};

/// Wraps the ways to the nodes of a source so that every exchange is appended to the capture file.
/// Throws SourceError when the file cannot be written.
/// `classes` are those that are collected.
std::shared_ptr<CaptureWriter> RecordTo(const std::string& file, Source& source,
                                        const std::vector<std::string>& classes = {});

}  // namespace NQORTQR20
