#pragma once

#include <cstdint>

namespace tqrhost {

// Commands that the host has to know, IPMI 2.0 tables 5-1 and G-1.
constexpr std::uint8_t kNetFnApplication = 0x06;
constexpr std::uint8_t kSetSessionPrivilegeLevel = 0x3B;
constexpr std::uint8_t kCloseSession = 0x3C;
constexpr std::uint8_t kNetFnStorage = 0x0A;
constexpr std::uint8_t kReadFruData = 0x11;
constexpr std::uint8_t kGetSdrRepositoryInfo = 0x20;
constexpr std::uint8_t kReserveSdrRepository = 0x22;
constexpr std::uint8_t kGetSdr = 0x23;
constexpr std::uint8_t kGetSelInfo = 0x40;
constexpr std::uint8_t kGetSelEntry = 0x43;

}  // namespace tqrhost
