#include "plugins/standard/smbios_facts.h"

#include <gtest/gtest.h>

#include "host/core/host.h"
#include "tests/support/wire.h"

namespace standard {
namespace {

using ipmiseltest::SmbiosStructure;

TEST(SmbiosFacts, EveryStructureOfTheHostsMachineIsRead) {
    const auto memory = [](const char* slot) {
        return SmbiosStructure(17, {0, 0, 0, 0, 0, 0, 0, 0, 0, 0x20, 0, 0, 1, 0, 0x1A, 0, 0},
                               {slot});
    };
    NQORTQR20::MachineFacts machine;
    machine.smbios = {memory("DIMM_1"), SmbiosStructure(1, {1, 0, 0, 0}, {"Acme"}),
                      SmbiosStructure(9, {1, 0, 0, 0, 0, 0, 0, 0}, {"Slot 1"}), memory("DIMM_2"),
                      SmbiosStructure(17, {0, 0}, {})};  // too short to be one
    NQORTQR20::SetMachineFacts(machine);
    const NQORTQR20::PluginContext context("/plugins");
    const NQORTQR20::TPluginManagerProvider* provider = nullptr;
    NQORTQR20::fdrGetHandle(context.get(), &provider);
    const SmbiosFacts facts = ReadSmbios(provider);
    ASSERT_EQ(facts.memoryDevices.size(), 2u);
    EXPECT_EQ(facts.memoryDevices[1].slot, "DIMM_2");
    EXPECT_EQ(facts.system->manufacturer, "Acme");
    EXPECT_EQ(facts.slots.size(), 1u);
    EXPECT_TRUE(facts.processors.empty());
    NQORTQR20::SetMachineFacts({});
    EXPECT_FALSE(ReadSmbios(provider).system);
    EXPECT_FALSE(ReadSmbios(nullptr).system);
}

}  // namespace
}  // namespace standard
