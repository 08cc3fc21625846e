#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "tqr/plugin.h"

// What the fields of a SEL record say, from values to texts.

namespace ipmisel {

/// Where the text of a Copy operation is put together; what readers see is cut to 127 characters.
constexpr std::size_t kSelTextCapacity = 128;

/// Direction and class of an event (IPMI 2.0, table 42-1).
std::string EventTypeText(std::uint8_t directionAndType);

/// The source of an event from its generator ID (IPMI 2.0, table 32-1): a slave address or the kind
/// of system software, then the LUN (of an address) and the channel.
std::string SourceText(NQORTQR20::TCPluginCallbacks* context, std::uint8_t generator1,
                       std::uint8_t generator2);

/// A shutdown comment from record bytes 10 to 14.
std::string ShutDownText(std::span<const std::uint8_t, 5> bytes);

/// A time stamp, in seconds since 1970-01-01 UTC, as a CIM date-time with the given UTC offset in
/// minutes, with the log lines of its making. A time beyond the calendar is logged and gives the
/// time that stands for none.
std::string TimestampText(std::int64_t seconds, short utcOffset);

}  // namespace ipmisel
