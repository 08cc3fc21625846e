#include "plugins/ipmisel/records/sdr_entry.h"

#include <gmock/gmock.h>

#include <cctype>
#include <memory>

#include "tests/plugins/ipmisel/records/text_field.h"
#include "tests/plugins/ipmisel/texts/mapping_fixture.h"

namespace {

using ipmiseltest::Fill;
using ::testing::ElementsAre;
using ::testing::Pair;

/// A full sensor record "CPU 1 Temp" as its three texts; neighbouring values differ.
s_SDR_entry SensorTexts(int sensorNumber = 0x30) {
    s_SDR_entry texts;
    Fill(texts.SDRHeaderData,
         ipmisel::Format("00 F1 F2 04 03 51 01 35 20 10 %02X 07 61 ", sensorNumber));
    Fill(texts.SDRUnitsData, "00 F1 F2 81 12 13 0A 05 C0 06 41 99 D3 ");
    Fill(texts.SDRStringData, "00 F1 F2 CA 43 50 55 20 31 20 54 65 6D 70 ");
    return texts;
}

const unsigned char* Bytes(const char* text) {
    return reinterpret_cast<const unsigned char*>(text);
}

int Scan(const s_SDR_entry& texts, IPMISDREntry* entry) {
    return entry->ScanSDRDataFile(nullptr, nullptr, Bytes(texts.SDRHeaderData),
                                  Bytes(texts.SDRUnitsData), Bytes(texts.SDRStringData));
}

class SdrEntry : public ::testing::Test {
protected:
    ipmiseltest::LogRecorder log;
    IPMISDREntry entry;
    s_SDR_entry texts = SensorTexts();
};

TEST_F(SdrEntry, TakesItsFieldsOutOfTheThreeTexts) {
    ASSERT_EQ(Scan(texts, &entry), 0);
    EXPECT_THAT(
        log.All(),
        ElementsAre(Pair(3,
                         "SDRUnitsData=00 F1 F2 81 12 13 0A 05 C0 06 41 99 D3 . M = 773. B = 262. "
                         "Rexp = 13. Bexp = 3. Lin = 10"),
                    Pair(4, "tempIDString=CPU 1 Temp"), Pair(4, "strlen(SDRstring) = 42"),
                    Pair(3, "this->IDString=CPU 1 Temp"),
                    // Record ID low, high, version, type, length, number, entity, units, ID type.
                    Pair(3,
                         "Results of ScanSDRDataFile: 4 3 51 1 35 30 7 61 81 12 13 ca "
                         "CPU 1 Temp\n")));
}

TEST_F(SdrEntry, OfAnotherVersionHasItsHeaderAlone) {
    Fill(texts.SDRHeaderData, "00 F1 F2 04 03 02 01 35 20 10 30 07 61 ");
    EXPECT_EQ(Scan(texts, &entry), 3);
    EXPECT_THAT(log.All(), ElementsAre(Pair(1,
                                            "This SDR entry (ID 772, vers 0x2) does not match the "
                                            "current IPMI Version (0x51).\n")));
    EXPECT_EQ(entry.sensorNumber, 0x30);
    EXPECT_EQ(entry.recordIdLs, 0);
    EXPECT_EQ(entry.m, 0);
}

TEST_F(SdrEntry, IdStringEndsAtItsFirstCharacterThatIsNotAllowed) {
    for (int c = 1; c < 256; ++c) {
        const bool allowed = c < 128 && (std::isalnum(c) != 0 || c == ' ' || c == '.');
        const std::string text = std::string("A") + static_cast<char>(c) + "B";
        std::copy_n(text.c_str(), 4, entry.IDString.get());
        EXPECT_EQ(entry.RemoveInvalidChars(), allowed ? text : "A") << c;
    }
}

TEST_F(SdrEntry, IdStringOfSixteenCharactersIsKeptWhole) {
    std::string row = "00 F1 F2 D0 ";
    for (char c = 'A'; c <= 'T'; ++c) row += ipmisel::Format("%02X ", c);
    Fill(texts.SDRStringData, row);  // twenty, the field not terminated
    ASSERT_EQ(Scan(texts, &entry), 0);
    EXPECT_STREQ(entry.IDString.get(), "ABCDEFGHIJKLMNOP");
    Fill(texts.SDRStringData, "00 F1 F2 C1 5A ");
    ASSERT_EQ(Scan(texts, &entry), 0);
    EXPECT_STREQ(entry.IDString.get(), "Z");  // nothing left of the record before
}

TEST_F(SdrEntry, EmptyTextsEndTheScanAtTheEndOfTheirFields) {
    // Separate blocks, so that a byte read too far shows.
    std::vector<unsigned char> header(64, ' '), units(96, ' '), string(64, ' ');
    const auto scan = [&] {
        return entry.ScanSDRDataFile(nullptr, nullptr, header.data(), units.data(), string.data());
    };
    EXPECT_EQ(scan(), 1);
    std::copy_n(texts.SDRHeaderData, 39, header.begin());
    EXPECT_EQ(scan(), 1);
    units.back() = '0';
    EXPECT_EQ(scan(), 1);
    string.back() = '0';
    EXPECT_EQ(scan(), 0);
    EXPECT_THAT(log.Lines(0), ElementsAre("Error in reading data file for SDRHeaderData.",
                                          "Error reading data file for SDRUnitsData.",
                                          "Error reading data file for SDRIDStringData."));
}

TEST_F(SdrEntry, RepositoryInformationMustBeOfItsVersion) {
    const std::vector<unsigned char> blank(kSdrInfoTextLength, ' ');
    EXPECT_EQ(entry.ScanSDRInfoDataFile(nullptr, nullptr, Bytes("00 51 02 ")), 0);
    EXPECT_EQ(entry.ScanSDRInfoDataFile(nullptr, nullptr, Bytes("00 52 51 ")), 1);
    EXPECT_EQ(entry.ScanSDRInfoDataFile(nullptr, nullptr, blank.data()), 1);
    EXPECT_THAT(log.Lines(1), ElementsAre("This SDR Version (0x52) does not match the current IPMI "
                                          "Version (0x51).\n"));
    EXPECT_THAT(log.Lines(0), ElementsAre("Error in reading data file for SDRInfostring"));
}

using SdrEntities = ipmiseltest::MappingTest;

TEST_F(SdrEntities, NameTheSensorAndItsEntity) {
    const std::pair<std::uint8_t, const char*> cases[] = {{0x07, "<1007>"},
                                                          {0x28, "<1040>"},
                                                          {0x29, "Processing blade"},
                                                          {0x34, "Processor or front-side bus"},
                                                          {0x35, ""}};
    for (const auto& [entityId, entityName] : cases) {
        IPMISDREntry entry;
        ASSERT_EQ(Scan(SensorTexts(), &entry), 0);
        entry.entityId = entityId;
        char id[17], name[64], instance[2];
        const auto describe = [&](const IPMISDREntry* sensor) {
            IPMISDREntry::GetSensorSDREntities(sensor, context.get(), &mapping, id, name, instance,
                                               sizeof id, sizeof name, sizeof instance);
            return std::string(id) + "|" + name + "|" + std::string(instance, 2);
        };
        EXPECT_EQ(describe(&entry), std::string("CPU 1 Temp|") + entityName + "|97");
        EXPECT_EQ(describe(nullptr), std::string("||\0\0", 4));
    }
}

/// Leaks and double frees show under the sanitizer.
class SdrCache : public ::testing::Test {
protected:
    ipmiseltest::LogRecorder log;
    SDRCache cache;
    std::unique_ptr<IPMISDREntry> first = std::make_unique<IPMISDREntry>();
    std::vector<s_SDR_entry> texts;

    ~SdrCache() override { DeleteSDRCache(nullptr, &cache); }
    int Create(const char* info = "00 51 ") {
        const int result = CreateSDRCache(nullptr, first.get(), &cache, &texts, Bytes(info));
        if (!cache.empty()) {
            EXPECT_EQ(cache.back(), first.get());
            static_cast<void>(first.release());
        }
        return result;
    }
    std::vector<int> Numbers() const {
        std::vector<int> numbers;
        for (const IPMISDREntry* entry : cache) numbers.push_back(entry->sensorNumber);
        return numbers;
    }
};

TEST_F(SdrCache, HoldsTheLastRecordOfTheRepositoryFirst) {
    texts = {SensorTexts(0x30), SensorTexts(0x31), SensorTexts(0x30)};
    EXPECT_EQ(Create(), 0);
    EXPECT_THAT(Numbers(), ElementsAre(0x30, 0x31, 0x30));
    EXPECT_EQ(GetSensorSDR(0x30, &cache), cache.front());
    EXPECT_EQ(GetSensorSDR(0x32, &cache), nullptr);
}

TEST_F(SdrCache, KeepsARecordOfAnotherVersion) {
    texts = {SensorTexts(0x30), SensorTexts(0x31)};
    Fill(texts[0].SDRHeaderData, "00 F1 F2 04 03 02 01 35 20 10 30 07 61 ");
    EXPECT_EQ(Create(), 0);
    EXPECT_THAT(Numbers(), ElementsAre(0x31, 0x30));
}

TEST_F(SdrCache, EmptyTextEndsItWithWhatItHas) {
    texts = {SensorTexts(0x30), SensorTexts(0x31), SensorTexts(0x32)};
    Fill(texts[1].SDRStringData, "");
    EXPECT_EQ(Create(), 0);
    EXPECT_THAT(Numbers(), ElementsAre(0x30));
    EXPECT_THAT(log.Lines(1), ElementsAre("Failed to scan all SDRs from buffer."));
    EXPECT_EQ(log.All().back().second, "CreateSDRCache() function completed.");
}

TEST_F(SdrCache, FirstStaysTheCallersWhereNothingIsCached) {
    EXPECT_EQ(Create(), 0);
    EXPECT_EQ(GetSensorSDR(0, &cache), nullptr);
    texts = {SensorTexts()};
    log.Clear();
    EXPECT_EQ(Create("00 20 "), 1);
    EXPECT_THAT(log.Lines(0), ElementsAre("Failed to obtain correct SDR info."));
    Fill(texts[0].SDRHeaderData, "");
    EXPECT_EQ(Create(), 0);
    EXPECT_TRUE(cache.empty());
}

TEST_F(SdrCache, IsDeletedOnceHoweverOftenItIsAsked) {
    texts = {SensorTexts(0x30), SensorTexts(0x31)};
    Create();
    log.Clear();
    DeleteSDRCache(nullptr, &cache);
    EXPECT_THAT(log.Lines(4), ElementsAre("DeleteSDRCacheSDRCache() function entered.",
                                          "DeleteSDRCacheSDRCache() function completed."));
    EXPECT_EQ(GetSensorSDR(0x30, &cache), nullptr);
}

}  // namespace
