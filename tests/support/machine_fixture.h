#pragma once

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/core/host.h"
#include "host/spdriver/completeness.h"
#include "host/spdriver/source.h"
#include "host/spdriver/stop_gate.h"
#include "plugins/ipmisel/pass/entry_points.h"
#include "plugins/ipmisel/pass/state.h"
#include "simulator/simulated_bmc.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/wire.h"

namespace ipmiseltest {

/// A case over a whole simulated machine and a plug-in that has just been loaded: describe the
/// machine in `facts` and `nodes`, then Collect().
class MachineTest : public ::testing::Test {
protected:
    NQORTQR20::MachineFacts facts;
    std::vector<ipmisim::BmcDescription> nodes{1};
    LogRecorder log;
    InstanceRecorder written;
    /// Request frames of all nodes in the order in which they came.
    std::vector<std::vector<std::uint8_t>> requests;
    NQORTQR20::PluginContext context{IPMISEL_TEXTS};

    MachineTest() {
        facts.smbios = {IpmiDeviceStructure()};
        ipmisel::ResetModuleState();
        IPMISELPluginInit(context.get());
        NQORTQR20::TakeNotices();
    }
    ~MachineTest() override {
        NQORTQR20::CloseMachine();
        ipmisel::ResetModuleState();
    }

    void OpenMachine() {
        NQORTQR20::Source source;
        source.facts = facts;
        for (const ipmisim::BmcDescription& node : nodes) {
            source.nodes.push_back({"",
                                    std::make_unique<tqrhost::StopGate>(
                                        std::make_unique<SimulatedTransport>(node, &requests)),
                                    nullptr});
        }
        NQORTQR20::OpenMachine(std::move(source));
    }
    /// One pass over the machine as it is described now; its status code. The log holds the lines
    /// of this pass alone, `written` and `requests` grow.
    int Collect(std::vector<const char*> classNames) {
        OpenMachine();
        log.Clear();
        const NQORTQR20::OutputHandle output(written);
        return IPMISELGetData(context.get(), output.get(), classNames.data(),
                              static_cast<int>(classNames.size()))
            .code;
    }
    std::vector<std::string> Written(std::string_view property) const {
        return written.Texts(property);
    }
    bool Logged(int severity, const std::string& line) const {
        const auto lines = log.Lines(severity);
        return std::find(lines.begin(), lines.end(), line) != lines.end();
    }
    long Sent(ipmi::CommandCode command) const { return CountOf(command, requests); }
};

}  // namespace ipmiseltest
