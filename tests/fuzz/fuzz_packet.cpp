// The packets of an RMCP+ session: every answer that can come while a session is opened, and
// answers inside a session. First byte: the cipher suite.

#include <cstddef>
#include <cstdint>

#include "host/spdriver/rmcpplus_codec.h"

using tqrhost::rmcpplus::Codec;
using tqrhost::rmcpplus::FindCipherSuite;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    constexpr int kSuites[] = {3, 8, 12, 15, 16, 17};
    static Codec codec({.user = "root", .password = "secret", .kg = {}});
    codec.Begin(*FindCipherSuite(kSuites[data[0] % std::size(kSuites)]));
    const std::span<const std::uint8_t> packet(data + 1, size - 1);
    codec.ParseAuthenticationCapabilities(packet, 1);
    codec.ParseOpenSession(packet, 1);
    codec.ParseRakp2(packet, 1);
    codec.ParseRakp4(packet, 1);
    codec.ParseAnswer(packet);
    return 0;
}
