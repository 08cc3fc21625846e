// The packets of an RMCP+ session: every answer that can come while a session is opened, and
// answers inside a session. First byte: the cipher suite and the deviations that are put up with.

#include <cstddef>
#include <cstdint>
#include <iterator>

#include "host/spdriver/lan/rmcpplus_codec.h"

using namespace tqrhost::rmcpplus;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    constexpr int kSuites[] = {1, 2, 3, 15, 16, 17};
    Credentials credentials{.user = "root", .password = "secret", .kg = {}};
    credentials.deviations.longRakp2Code = (data[0] & 0x40) != 0;
    credentials.deviations.checksums = (data[0] & 0x80) != 0;
    Codec codec(credentials, *FindCipherSuite(kSuites[data[0] % std::size(kSuites)]));
    const std::span<const std::uint8_t> packet(data + 1, size - 1);
    ParseAuthenticationCapabilities(packet, 1, false);
    codec.ParseOpenSession(packet, 1);
    codec.ParseRakp2(packet, 1);
    codec.Rakp3(1);  // the keys stand
    codec.ParseRakp4(packet, 1);
    codec.ParseAnswer(packet);
    return 0;
}
