#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "tqr/plugin.h"

namespace standard {

/// Writes instances through the host. What is empty is not written, so that a property which is not
/// known is left out. Property names are texts that end with a NUL.
class Output {
public:
    explicit Output(NQORTQR20::fdriIOHandle* handle) : handle_(handle) {}

    /// False when the host takes no instance any more; then there is nothing left to write.
    [[nodiscard]] bool Begin(const char* className);
    void End();

    void Text(const char* name, std::string_view value);
    void Integer(const char* name, std::optional<std::int64_t> value);
    void Real(const char* name, std::optional<double> value);
    void Boolean(const char* name, std::optional<bool> value);
    /// Seconds since 1970-01-01 UTC.
    void Time(const char* name, std::optional<std::int64_t> seconds);
    void Texts(const char* name, std::span<const std::string> values);

    /// Whether the host has refused anything.
    bool failed() const { return failed_; }

private:
    void Note(NQORTQR20::TTQRStatusCode status);

    NQORTQR20::fdriIOHandle* handle_;
    bool failed_ = false;
};

}  // namespace standard
