#include "program/commands/doctor.h"

#include <CLI/CLI.hpp>
#include <memory>
#include <optional>
#include <string>

#include "ipmi/smbios.h"
#include "program/commands/access.h"
#include "program/commands/doctor_inband.h"
#include "program/commands/doctor_lan.h"
#include "program/commands/doctor_steps.h"
#include "program/commands/failure.h"
#include "program/commands/stop_signals.h"

namespace ipmisel {
namespace {

int ExamineOther(const AccessOptions& access, Steps* steps) {
    const bool inband = access.Sources().front() == "inband";
    if (inband) ExamineDriver(steps);
    std::optional<DoctorController> controller;
    try {
        controller.emplace(OpenSource(access));
    } catch (const Failure& failure) {
        if (failure.exitStatus == kExitUsage) throw;
        steps->Bad("source", failure.what());
        return kExitNoSource;
    }
    const auto& facts = controller->Facts();
    if (inband && facts.ipmiDriver) {
        CompareSmbios(facts.smbios, steps);
    } else if (ipmi::HasIpmiDevice(facts.smbios)) {
        steps->Good("SMBIOS", "announces a BMC (type 38)");
    } else {
        steps->Note("SMBIOS", "announces no BMC (type 38)");
    }
    if (inband && !facts.ipmiDriver) return kExitNoSource;  // and said so
    if (!controller->There()) {
        steps->Bad("BMC", "there is none; name another source");
        return kExitNoSource;
    }
    if (!TryCommands(&*controller, steps)) return kExitNoSource;
    TryLog(&*controller, steps);
    TrySensorRecords(&*controller, steps);
    // The clock of a simulated server or a capture stands.
    if (inband) TryClock(&*controller, steps);
    return steps->ExitStatus();
}

int Examine(const AccessOptions& access) {
    const StopSignals signals;
    Steps steps;
#ifdef IPMISEL_LAN
    if (access.Sources().front().starts_with("lan:")) return ExamineLan(access, &steps);
#endif
    return ExamineOther(access, &steps);
}

}  // namespace

Command AddDoctorCommand(CLI::App* program) {
    CLI::App* const command = program->add_subcommand(
        "doctor", "Tell step by step what of a source works, and what to do about the rest");
    const auto options = std::make_shared<AccessOptions>();
    AddAccessOptions(command, options.get());
    command->remove_option(command->get_option("--from"));
    const auto source = std::make_shared<std::string>("inband");
    command->add_option("SOURCE", *source, "inband, lan:HOST[:PORT], sim:FILE or replay:FILE")
        ->capture_default_str();
    command->footer(WorkaroundHelp() +
                    "Exit status:\n"
                    "  0  all is well\n"
                    "  2  wrong usage\n"
                    "  3  the BMC was not reached\n"
                    "  4  it was reached, and something is wrong\n");
    return {command, [options, source] {
                options->sources = {*source};
                return Examine(*options);
            }};
}

}  // namespace ipmisel
