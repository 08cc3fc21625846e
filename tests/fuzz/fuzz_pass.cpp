// A whole pass of the plug-in over a BMC and an SMBIOS table that answer what the fuzzer wants.
//
// Input: one byte of switches; 16 bits of SMBIOS length and so many bytes; then one answer after
// the other, each a length byte (0xFF: no response) and so many bytes, the completion code first.
// When the input is used up nothing answers any more.

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string_view>
#include <utility>
#include <vector>

#include "base/bytes.h"
#include "host/core/host.h"
#include "host/smbios/smbios_tables.h"
#include "host/spdriver/source.h"
#include "plugins/ipmisel/pass/entry_points.h"
#include "plugins/ipmisel/pass/state.h"
#include "tests/support/described_classes.h"

namespace {

using Input = std::span<const std::uint8_t>;

std::uint8_t Take(Input* input) {
    if (input->empty()) return 0;
    const std::uint8_t byte = input->front();
    *input = input->subspan(1);
    return byte;
}

Input Take(Input* input, std::size_t count) {
    const Input taken = input->first(std::min(count, input->size()));
    *input = input->subspan(taken.size());
    return taken;
}

class FuzzedBmc : public NQORTQR20::Transport {
public:
    explicit FuzzedBmc(Input* answers) : answers_(answers) {}
    std::optional<NQORTQR20::Response> Exchange(const NQORTQR20::RequestFrame&) override {
        if (answers_->empty()) return std::nullopt;
        const std::uint8_t length = Take(answers_);
        if (length == 0xFF) return std::nullopt;
        const Input bytes = Take(answers_, length);
        if (bytes.empty()) return NQORTQR20::Response();
        return NQORTQR20::Response(bytes.begin(), bytes.end());
    }

private:
    Input* answers_;
};

class NoSink : public NQORTQR20::InstanceSink {
    bool Take(const NQORTQR20::Instance&) override { return true; }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const NQORTQR20::PluginContext context(IPMISEL_TEXTS);
    // Somebody reads every line, so that every line is built.
    static const int consumer = NQORTQR20::AddLogConsumer(
        NQORTQR20::ILogger::kTrace, [](NQORTQR20::ILogger::ETQRLogSeverity, std::string_view) {});
    static_cast<void>(consumer);

    Input input(data, size);
    const std::uint8_t switches = Take(&input);
    NQORTQR20::Source source;
    source.facts.machineType = (switches & 1) != 0 ? "SIM-1" : "Zorvanek";
    source.facts.integratedBmc = (switches & 2) != 0;
    source.facts.ipmiLan = (switches & 4) != 0;
    source.facts.ipmiDriver = (switches & 8) == 0;
    const std::size_t smbiosLength = Take(&input) + std::size_t{256} * (switches >> 6);
    source.facts.smbios = tqrhost::SplitSmbiosTable(Take(&input, smbiosLength));
    source.facts.smbios.push_back({38, 4, 0, 0, 0, 0});
    source.nodes.push_back({"", std::make_unique<FuzzedBmc>(&input), nullptr});
    if ((switches & 16) != 0)
        source.nodes.push_back({"", std::make_unique<FuzzedBmc>(&input), nullptr});

    ipmisel::ResetModuleState();
    NQORTQR20::OpenMachine(std::move(source));
    NoSink sink;
    const NQORTQR20::OutputHandle output(sink);
    static std::vector<const char*> classes = ipmiseltest::DefaultClasses();
    IPMISELGetData(context.get(), output.get(), classes.data(), static_cast<int>(classes.size()));
    NQORTQR20::CloseMachine();
    NQORTQR20::TakeNotices();
    return 0;
}
