#pragma once

#include <functional>
#include <istream>
#include <memory>
#include <string>

#include "program/reports/report.h"

namespace ipmisel {

/// A report that was written with --format json, read again. Its instances are read one at a time.
class SavedReport {
public:
    /// Reads all but the instances. Throws Failure when the file cannot be read or is no report.
    explicit SavedReport(const std::string& file);
    /// One that is read from elsewhere: each call opens it anew, at its beginning.
    SavedReport(std::string name, std::function<std::unique_ptr<std::istream>()> open);
    const ReportHead& Head() const { return head_; }
    const ReportEnd& End() const { return end_; }
    /// The instances in their order. Throws Failure, and whatever `take` throws.
    void ForEach(const std::function<void(const NQORTQR20::Instance&)>& take) const;

private:
    std::string name_;
    std::function<std::unique_ptr<std::istream>()> open_;
    ReportHead head_;
    ReportEnd end_;
};

/// An instance of which the properties stand in a text as JsonProperties writes them, with braces;
/// and a node's object of `completeness`. What is no such text says nothing.
NQORTQR20::Instance ParseInstance(std::string className, const std::string& properties);
NQORTQR20::NodeCompleteness ParseCompleteness(const std::string& object);

/// Whether a file is a capture of --record, by its beginning.
bool IsCapture(const std::string& file);

}  // namespace ipmisel
