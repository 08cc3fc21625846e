#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "host/core/internal.h"

namespace NQORTQR20 {

/// An object path: class name and string keys.
struct ObjectPath {
    std::string className;
    std::vector<std::pair<std::string, std::string>> keys;
};

/// A point in time.
struct Time {
    std::int64_t seconds = 0;  ///< since 1970-01-01 UTC; within the years 1 to 9999
    bool operator==(const Time&) const = default;
};
constexpr std::int64_t kFirstTime = -62135596800;  ///< 0001-01-01T00:00:00Z
constexpr std::int64_t kLastTime = 253402300799;   ///< 9999-12-31T23:59:59Z
/// RFC 3339 in UTC: "2026-03-09T02:31:44Z".
std::string TimeText(Time time);

/// Reals are finite.
using PropertyValue = std::variant<std::string, std::vector<std::uint8_t>, ObjectPath, std::int64_t,
                                   double, bool, Time, std::vector<std::string>>;

struct Instance {
    std::string className;
    std::vector<std::pair<std::string, PropertyValue>> properties;  ///< in the order written
};

/// Where the instances of a collection go. What a plug-in writes piece by piece is gathered and
/// taken whole, so that the host holds no more than the open instance; one that is opened while
/// another is still open replaces it. False refuses the piece; the plug-in gets kStatusFailed.
class InstanceSink {
public:
    virtual ~InstanceSink() = default;
    virtual bool OpenInstance(std::string_view className);
    virtual bool AddProperty(std::string_view name, PropertyValue value);
    bool CloseInstance() { return Take(open_); }

protected:
    /// False when the instance could not be taken.
    virtual bool Take(const Instance& instance) = 0;

private:
    Instance open_;
};

}  // namespace NQORTQR20
