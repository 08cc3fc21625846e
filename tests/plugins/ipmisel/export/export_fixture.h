#pragma once

#include <string>
#include <vector>

#include "host/core/host.h"
#include "plugins/ipmisel/records/sel_entry.h"
#include "tests/plugins/ipmisel/records/text_field.h"
#include "tests/support/bmc_fixture.h"
#include "tests/support/wire.h"

namespace ipmiseltest {

/// The host has no memory for value arrays.
extern bool gNoArrays;

/// A case over event records and the instances that become of them.
class ExportTest : public BmcTest {
protected:
    InstanceRecorder written;
    std::vector<IPMISELEntry> entries;
    IPMIMapping mapping;
    NQORTQR20::PluginContext context{IPMISEL_TEXTS};

    ~ExportTest() override { gNoArrays = false; }
    void Add(const SelRecord& record) {
        const s_SEL_row row = RowOf(record);
        ASSERT_EQ(entries.emplace_back().ScanSELDataFile(context.get(), &row, 0), 0U);
    }
    static std::string Names(const NQORTQR20::Instance& instance) {
        std::string names;
        for (const auto& property : instance.properties) names += property.first + " ";
        return names;
    }
    /// The last property.
    static std::vector<std::uint8_t> RawData(const NQORTQR20::Instance& instance) {
        return std::get<std::vector<std::uint8_t>>(instance.properties.back().second);
    }
    std::string Text(std::size_t instance, std::string_view property) const {
        return written.Texts(property).at(instance);
    }
};

}  // namespace ipmiseltest
