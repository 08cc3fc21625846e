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
        tqrhost::MachineFacts facts;
        facts.smbios = {{38, 4, 1, 0, 0, 0}, {}, {11, 4, 2, 0, 'A', 0, 0}, {38, 4, 3, 0, 0, 0}};
        tqrhost::SetMachineFacts(facts);
        fdrGetHandle(context_.get(), &provider);
        ASSERT_EQ(smBiosLoad(provider, &handle), 0);
    }
    void TearDown() override {
        if (handle != nullptr) {
            EXPECT_EQ(smBiosClose(&handle), 0);
        }
        EXPECT_EQ(handle, nullptr);
        tqrhost::SetMachineFacts({});
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
    tqrhost::PluginContext context_{"/plugins"};
};

TEST_F(SmbiosReader, WalksTheStructuresOfOneType) {
    EXPECT_EQ(Read(38), (Bytes{38, 4, 1, 0, 0, 0}));
    EXPECT_EQ(Read({}), (Bytes{38, 4, 3, 0, 0, 0}));
    EXPECT_EQ(Read({}), Bytes());
    EXPECT_EQ(Read({}), Bytes());
    EXPECT_EQ(Read(11, 5), (Bytes{11, 4, 2, 0, 'A'}));  // cut at the capacity
    EXPECT_EQ(Read(1), Bytes());
    EXPECT_EQ(Read(256 + 38), Bytes());
}

TEST_F(SmbiosReader, FollowsAChangeOfTheMachine) {
    Read(38);
    tqrhost::SetMachineFacts({});
    EXPECT_EQ(Read({}), Bytes());
}

TEST_F(SmbiosReader, MisuseIsRefused) {
    char structure[8];
    int length = sizeof structure;
    int negative = -1;
    void* none = nullptr;
    EXPECT_NE(smBiosGetNext(handle, structure, &length), 0);  // before smBiosGetFirst
    EXPECT_NE(smBiosLoad(provider, nullptr), 0);
    EXPECT_NE(smBiosLoad(nullptr, &none), 0);
    EXPECT_NE(smBiosGetFirst(nullptr, 38, structure, &length), 0);
    EXPECT_NE(smBiosGetFirst(handle, 38, nullptr, &length), 0);
    EXPECT_NE(smBiosGetFirst(handle, 38, structure, nullptr), 0);
    EXPECT_NE(smBiosGetFirst(handle, 38, structure, &negative), 0);
    EXPECT_NE(smBiosClose(nullptr), 0);
    EXPECT_NE(smBiosClose(&none), 0);
    void* stale = handle;
    EXPECT_EQ(smBiosClose(&handle), 0);
    EXPECT_NE(smBiosGetFirst(stale, 38, structure, &length), 0);
    EXPECT_NE(smBiosClose(&stale), 0);
}

}  // namespace
