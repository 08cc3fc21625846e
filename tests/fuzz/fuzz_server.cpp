// The reader of simulated servers, and a BMC made of what it has read.

#include <cstddef>
#include <cstdint>
#include <string>

#include "simulator/server_file.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    try {
        auto server = ipmisim::ParseServer(std::string(data, data + size), "fuzz");
        for (ipmisim::BmcDescription& description : server.bmcs) {
            description.latencyMicroseconds = 0;
            ipmisim::SimulatedBmc bmc(std::move(description));
            const std::uint8_t read[] = {0, 0, 0, 0, 0, 0xFF};
            bmc.Execute(0x0A, 0, 0x43, read);
            bmc.Execute(0x0A, 0, 0x23, read);
            bmc.Execute(0x0A, 0, 0x11, std::span(read).subspan(2));
            bmc.Execute(0x06, 0, 0x01, {});
        }
    } catch (const ipmisim::ServerFileError&) {
    }
    return 0;
}
