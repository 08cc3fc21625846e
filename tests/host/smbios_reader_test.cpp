#include <gtest/gtest.h>

#include <cstring>

#include "host/core/host.h"
#include "tqr/plugin.h"
#include "tqr/smbios.h"

namespace {

using namespace NQORTQR20;
using Bytes = std::vector<std::uint8_t>;

class SmbiosReader : public ::testing::Test {
protected:
    void SetUp() override {
        NQORTQR20::MachineFacts facts;
        facts.smbios = {{38, 4, 1, 0, 0, 0}, {}, {11, 4, 2, 0, 'A', 0, 0}, {38, 4, 3, 0, 0, 0}};
        NQORTQR20::SetMachineFacts(facts);
        fdrGetHandle(context_.get(), &provider);
        ASSERT_EQ(smBiosLoad(provider, &handle), 0);
    }
    void TearDown() override {
        if (handle != nullptr) {
            EXPECT_EQ(smBiosClose(&handle), 0);
        }
        EXPECT_EQ(handle, nullptr);
        NQORTQR20::SetMachineFacts({});
    }
    /// The structure that smBiosGetFirst (a type) or smBiosGetNext (none) copies.
    Bytes Read(std::optional<int> type, int capacity = 64) {
        Bytes structure(64, '#');
        structure.resize(static_cast<std::size_t>(capacity));
        int length = capacity;
        EXPECT_EQ(type ? smBiosGetFirst(handle, *type, structure.data(), &length)
                       : smBiosGetNext(handle, structure.data(), &length),
                  0);
        structure.resize(static_cast<std::size_t>(length));
        return structure;
    }
    const TPluginManagerProvider* provider = nullptr;
    void* handle = nullptr;

private:
    NQORTQR20::PluginContext context_{"/plugins"};
};

TEST_F(SmbiosReader, WalksTheStructuresOfOneType) {
    EXPECT_EQ(Read(38), (Bytes{38, 4, 1, 0, 0, 0}));
    EXPECT_EQ(Read({}), (Bytes{38, 4, 3, 0, 0, 0}));
    EXPECT_EQ(Read({}), Bytes());
    EXPECT_EQ(Read({}), Bytes());
    EXPECT_EQ(Read(11, 5), (Bytes{11, 4, 2, 0, 'A'}));  // cut at the capacity
    EXPECT_EQ(Read(1), Bytes());
    EXPECT_EQ(Read(256 + 38), Bytes());
    Read(38);
    NQORTQR20::SetMachineFacts({});  // another machine in the middle of a walk
    EXPECT_EQ(Read({}), Bytes());
}

TEST_F(SmbiosReader, MisuseIsRefused) {
    char structure[8];
    int length = sizeof structure;
    int negative = -1;
    void* none = nullptr;
    for (const int refused : {smBiosGetNext(handle, structure, &length),  // before smBiosGetFirst
                              smBiosLoad(provider, nullptr), smBiosLoad(nullptr, &none),
                              smBiosGetFirst(nullptr, 38, structure, &length),
                              smBiosGetFirst(handle, 38, nullptr, &length),
                              smBiosGetFirst(handle, 38, structure, nullptr),
                              smBiosGetFirst(handle, 38, structure, &negative),
                              smBiosClose(nullptr), smBiosClose(&none)}) {
        EXPECT_NE(refused, 0);
    }
    void* stale = handle;
    EXPECT_EQ(smBiosClose(&handle), 0);
    EXPECT_NE(smBiosGetFirst(stale, 38, structure, &length), 0);
    EXPECT_NE(smBiosClose(&stale), 0);
}

}  // namespace
