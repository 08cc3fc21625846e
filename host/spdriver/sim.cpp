#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "host/spdriver/kinds.h"
#include "host/spdriver/stop_gate.h"
#include "simulator/server_file.h"
#include "simulator/simulated_bmc.h"

namespace tqrhost {
namespace {

class SimTransport : public Transport {
public:
    explicit SimTransport(ipmisim::BmcDescription description) : bmc_(std::move(description)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        return bmc_.Execute(request.netFn(), request.lun(), request.command(), request.data());
    }

private:
    ipmisim::SimulatedBmc bmc_;
};

}  // namespace

Source OpenSimulated(const std::vector<std::string>& places, const Access& /*access*/) {
    const std::string& place = places.front();
    ipmisim::ServerDescription server;
    try {
        server = ipmisim::ReadServerFile(place);
    } catch (const ipmisim::ServerFileError& error) {
        throw SourceError(std::string(error.what()) +
                          "; correct the file or name another with --from");
    }
    Source source;
    source.facts = {
        std::move(server.machineType), server.integratedBmc,    server.ipmiDriver, server.ipmiLan,
        std::move(server.localTime),   std::move(server.smbios)};
    for (auto& bmc : server.bmcs) {
        source.nodes.push_back(
            {"sim:" + place,
             std::make_unique<StopGate>(std::make_unique<SimTransport>(std::move(bmc))), nullptr});
    }
    return source;
}

}  // namespace tqrhost
