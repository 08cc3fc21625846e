#pragma once

#include <cstdint>

namespace tqrhost::rmcpplus {

// Algorithm numbers, IPMI 2.0, tables 13-17 to 13-19.
constexpr std::uint8_t kRakpHmacSha1 = 1;
constexpr std::uint8_t kRakpHmacSha256 = 3;
constexpr std::uint8_t kNoIntegrity = 0;
constexpr std::uint8_t kHmacSha1_96 = 1;
constexpr std::uint8_t kHmacSha256_128 = 4;
constexpr std::uint8_t kNoConfidentiality = 0;
constexpr std::uint8_t kAesCbc128 = 1;

/// A cipher suite by its number (IPMI 2.0, table 22-20) and its algorithm numbers.
struct CipherSuite {
    int id;
    std::uint8_t authentication;
    std::uint8_t integrity;
    std::uint8_t confidentiality;
};
/// Those that are supported.
inline constexpr CipherSuite kCipherSuites[] = {
    {1, kRakpHmacSha1, kNoIntegrity, kNoConfidentiality},
    {2, kRakpHmacSha1, kHmacSha1_96, kNoConfidentiality},
    {3, kRakpHmacSha1, kHmacSha1_96, kAesCbc128},
    {15, kRakpHmacSha256, kNoIntegrity, kNoConfidentiality},
    {16, kRakpHmacSha256, kHmacSha256_128, kNoConfidentiality},
    {17, kRakpHmacSha256, kHmacSha256_128, kAesCbc128},
};

/// Null for a suite that is not supported.
constexpr const CipherSuite* FindCipherSuite(int id) {
    for (const CipherSuite& suite : kCipherSuites) {
        if (suite.id == id) return &suite;
    }
    return nullptr;
}

}  // namespace tqrhost::rmcpplus
