#include "host/smbios/smbios_tables.h"

#include <gtest/gtest.h>

#include <numeric>

#include "tests/support/temporary_folder.h"
#include "tests/support/wire.h"

namespace {

using namespace tqrhost;
using Bytes = std::vector<std::uint8_t>;

const Bytes kSystem{1,   8,   0x10, 0,   1, 2,   9,   0,  // maker 1, product 2, version 9
                    'A', 'c', 'm',  'e', 0, 'S', '1', ' ', ' ', 0, 0};
const Bytes kBare{32, 4, 0x11, 0, 0, 0};  // no more than its header
const Bytes kEnd{127, 4, 0x12, 0, 0, 0};

Bytes Join(std::initializer_list<Bytes> parts) {
    Bytes all;
    for (const Bytes& part : parts) all.insert(all.end(), part.begin(), part.end());
    return all;
}

/// Makes `bytes` add up to 0 by the byte at `at`.
void SetChecksum(std::span<std::uint8_t> bytes, std::size_t at) {
    bytes[at] = 0;
    bytes[at] = static_cast<std::uint8_t>(-std::accumulate(bytes.begin(), bytes.end(), 0));
}

Bytes EntryPoint2(std::uint16_t length, std::uint8_t count) {
    Bytes bytes(0x1F);
    std::copy_n("_SM_", 4, bytes.begin());
    std::copy_n("_DMI_", 5, bytes.begin() + 0x10);
    bytes[0x05] = 0x1F;
    bytes[0x16] = ipmiseltest::Low(length);
    bytes[0x17] = ipmiseltest::High(length);
    bytes[0x1C] = count;
    SetChecksum(std::span(bytes).subspan(0x10), 5);
    SetChecksum(bytes, 4);
    return bytes;
}

Bytes EntryPoint3(std::uint8_t length) {
    Bytes bytes{'_', 'S', 'M', '3', '_', 0, 0x18, 3, 5, 0, 1, 0, length, 0, 0, 0};
    bytes.resize(0x18, 0xE0);
    SetChecksum(bytes, 5);
    return bytes;
}

TEST(SmbiosTable, IsCutIntoItsStructures) {
    EXPECT_EQ(SplitSmbiosTable(Join({kSystem, kBare, kEnd, kBare})),
              (SmbiosStructures{kSystem, kBare}));
    EXPECT_EQ(SplitSmbiosTable(Join({kSystem, kBare}), 1), SmbiosStructures{kSystem});
}

TEST(SmbiosTable, EveryTruncationKeepsTheWholeStructuresBeforeIt) {
    const Bytes table = Join({kSystem, kBare, kEnd});
    for (std::size_t length = 0; length < table.size(); ++length) {
        const Bytes cut(table.begin(), table.begin() + static_cast<std::ptrdiff_t>(length));
        const std::size_t whole = length < kSystem.size()                  ? 0
                                  : length < kSystem.size() + kBare.size() ? 1
                                                                           : 2;
        EXPECT_EQ(SplitSmbiosTable(cut).size(), whole) << length;
    }
}

TEST(SmbiosTable, ImpossibleLengthEndsTheWalk) {
    for (const int length : {0, 3, 200}) {
        Bytes poisoned = kBare;
        poisoned[1] = static_cast<std::uint8_t>(length);
        EXPECT_EQ(SplitSmbiosTable(Join({kSystem, poisoned, kEnd})), SmbiosStructures{kSystem});
    }
}

TEST(SmbiosTable, ProductNameComesWithoutTrailingBlanks) {
    EXPECT_EQ(SystemProductName({{}, kBare, kSystem}), "S1");
    EXPECT_EQ(SystemProductName({kBare}), "");
    EXPECT_EQ(SystemProductName({{1}}), "");
}

TEST(SmbiosEntryPoint, BothFormsAreReadAndDamageIsSeen) {
    const Bytes second = EntryPoint2(0x1234, 7);
    ASSERT_TRUE(ReadSmbiosEntryPoint(second));
    EXPECT_EQ(ReadSmbiosEntryPoint(second)->tableLength, 0x1234U);
    EXPECT_EQ(ReadSmbiosEntryPoint(second)->numberOfStructures, 7);
    const Bytes third = EntryPoint3(0x34);
    ASSERT_TRUE(ReadSmbiosEntryPoint(third));
    EXPECT_EQ(ReadSmbiosEntryPoint(third)->tableLength, 0x34U);
    EXPECT_EQ(ReadSmbiosEntryPoint(third)->numberOfStructures, std::nullopt);
    for (const Bytes& good : {second, third}) {
        for (std::size_t at = 0; at < good.size(); ++at) {
            Bytes bad = good;
            ++bad[at];
            EXPECT_FALSE(ReadSmbiosEntryPoint(bad)) << at;
            EXPECT_FALSE(ReadSmbiosEntryPoint(std::span(good).first(at))) << at;
        }
    }
    Bytes inner = second;  // the sum of its own part is wrong
    ++inner[0x1C];
    SetChecksum(inner, 4);
    EXPECT_FALSE(ReadSmbiosEntryPoint(inner));
    Bytes old = EntryPoint2(0x40, 1);  // states one byte less than it has, as SMBIOS 2.1 did
    old[5] = 0x1E;
    SetChecksum(std::span(old).first(0x1E), 4);
    EXPECT_TRUE(ReadSmbiosEntryPoint(old));
}

TEST(SystemSmbios, SmallerBoundHolds) {
    const ipmiseltest::TemporaryFolder place;
    const auto& folder = place.path();
    const auto write = [&](const char* file, const Bytes& bytes) {
        place.Write(file, {bytes.begin(), bytes.end()});
    };
    EXPECT_EQ(ReadSystemSmbios(folder), SmbiosStructures());
    EXPECT_EQ(SystemSmbiosError(folder), 0);  // there is none
    std::filesystem::create_symlink("DMI", folder / "DMI");
    EXPECT_EQ(SystemSmbiosError(folder), ELOOP);
    std::filesystem::remove(folder / "DMI");
    write("DMI", Join({kSystem, kBare, kBare, kEnd}));
    EXPECT_EQ(ReadSystemSmbios(folder), SmbiosStructures());
    const auto systemOnly = static_cast<std::uint8_t>(kSystem.size());
    const struct {
        Bytes entryPoint;
        SmbiosStructures structures;
    } cases[] = {{EntryPoint3(200), {kSystem, kBare, kBare}},
                 {EntryPoint3(systemOnly), {kSystem}},
                 {EntryPoint3(0), {}},
                 {EntryPoint2(0xFFFF, 9), {kSystem, kBare, kBare}},
                 {EntryPoint2(0xFFFF, 2), {kSystem, kBare}},
                 {EntryPoint2(systemOnly, 9), {kSystem}},
                 {Bytes(0x18, 0), {}}};
    for (const auto& c : cases) {
        write("smbios_entry_point", c.entryPoint);
        EXPECT_EQ(ReadSystemSmbios(folder), c.structures);
    }
}

}  // namespace
