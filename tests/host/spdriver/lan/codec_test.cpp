#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "base/hex.h"
#include "base/text.h"
#include "host/spdriver/lan/crypto.h"
#include "host/spdriver/lan/rmcpplus_codec.h"
#include "simulator/rmcp_bmc.h"

namespace {

using namespace tqrhost;
using namespace tqrhost::rmcpplus;
using ipmisim::RmcpBmc;
using Bytes = std::vector<std::uint8_t>;

Bytes FromHex(const char* text) { return ipmisel::ParseHex(text).value(); }
Bytes FromText(std::string_view text) { return {text.begin(), text.end()}; }

TEST(Crypto, HmacOfThePublishedVectors) {
    const struct {
        Hmac::Digest digest;
        Bytes key, data;
        const char* code;
    } cases[] = {
        // RFC 2202, 3: test cases 1, 2 and 6
        {Hmac::Digest::kSha1, Bytes(20, 0x0B), FromText("Hi There"),
         "b617318655057264e28bc0b6fb378c8ef146be00"},
        {Hmac::Digest::kSha1, FromText("Jefe"), FromText("what do ya want for nothing?"),
         "effcdf6ae5eb2fa2d27416d5f184df9c259a7c79"},
        {Hmac::Digest::kSha1, Bytes(80, 0xAA),
         FromText("Test Using Larger Than Block-Size Key - Hash Key First"),
         "aa4ae5e15272d00e95705637ce8a3b55ed402112"},
        // RFC 4231, 4.2 and 4.3
        {Hmac::Digest::kSha256, Bytes(20, 0x0B), FromText("Hi There"),
         "b0344c61d8db38535ca8afceaf0bf12b881dc200c9833da726e9376c2e32cff7"},
        {Hmac::Digest::kSha256, FromText("Jefe"), FromText("what do ya want for nothing?"),
         "5bdcc146bf60754e6a042426089575c75a003f089d2739839dec58b964ec3843"},
    };
    for (const auto& c : cases) {
        Hmac hmac(c.digest);
        hmac.SetKey(c.key);
        const std::span data(c.data);
        for (int again = 0; again < 2; ++again) {  // the key is kept
            const Hmac::Code code = hmac.Compute({data.first(3), data.subspan(3)});
            EXPECT_EQ(Bytes(code.begin(), code.begin() + hmac.length()), FromHex(c.code));
        }
    }
}

TEST(Crypto, AesOfThePublishedVectors) {
    // NIST SP 800-38A, F.2.1, the first two blocks
    AesCbc::Block key, initial;
    const Bytes keyBytes = FromHex("2b7e151628aed2a6abf7158809cf4f3c");
    const Bytes initialBytes = FromHex("000102030405060708090a0b0c0d0e0f");
    std::copy(keyBytes.begin(), keyBytes.end(), key.begin());
    std::copy(initialBytes.begin(), initialBytes.end(), initial.begin());
    const Bytes plain = FromHex("6bc1bee22e409f96e93d7e117393172aae2d8a571e03ac9c9eb76fac45af8e51");
    const Bytes cipher =
        FromHex("7649abac8119b246cee98e9b12e9197d5086cb9b507219ee95db113a917678b2");
    AesCbc aes(key);
    for (int again = 0; again < 2; ++again) {
        Bytes bytes = plain;
        aes.Encrypt(initial, bytes, bytes);
        EXPECT_EQ(bytes, cipher);
        aes.Decrypt(initial, bytes, bytes);
        EXPECT_EQ(bytes, plain);
    }
    Bytes half(8);
    EXPECT_THROW(aes.Encrypt(initial, half, half), CryptoError);
}

TEST(Crypto, ComparesContentsAndLengths) {
    const Bytes one{1, 2, 3}, other{1, 2, 4};
    EXPECT_TRUE(EqualInConstantTime(one, one));
    EXPECT_FALSE(EqualInConstantTime(one, other));
    EXPECT_FALSE(EqualInConstantTime(one, ByteView(one).first(2)));
    EXPECT_TRUE(EqualInConstantTime({}, {}));
}

ipmisim::BmcDescription SomeBmc() {
    ipmisim::BmcDescription bmc;
    bmc.deviceId = Bytes{0x20, 1, 2, 0x15, 2, 0xBF, 0x57, 1, 0, 0, 1};
    return bmc;
}

Bytes Ask(RmcpBmc* bmc, const Packet& packet) {
    return bmc->Answer({packet.bytes().begin(), packet.bytes().end()});
}

/// A session between the codec and a BMC of the simulator, as far as it comes.
struct Conversation {
    Credentials credentials{.user = "root", .password = "secret", .kg = {}};
    RmcpBmc::Options options{};
    std::optional<RmcpBmc> bmc;
    std::optional<Codec> codec;

    /// What came of Open Session, RAKP 2 and RAKP 4.
    std::vector<Check> Open() {
        bmc.emplace(SomeBmc(), options);
        codec.emplace(credentials, *FindCipherSuite(options.cipherSuite));
        std::vector<Check> checks;
        checks.push_back(codec->ParseOpenSession(Ask(&*bmc, codec->OpenSessionRequest(1)), 1));
        if (checks.back() != Check::kGood) return checks;
        checks.push_back(codec->ParseRakp2(Ask(&*bmc, codec->Rakp1(2)), 2));
        if (checks.back() != Check::kGood) return checks;
        checks.push_back(codec->ParseRakp4(Ask(&*bmc, codec->Rakp3(3)), 3));
        return checks;
    }
    std::optional<Bytes> DeviceId(std::uint32_t sequence) {
        Packet packet;
        codec->WriteRequest(sequence, 5, ipmi::GetDeviceId(), &packet);
        const Bytes reply = Ask(&*bmc, packet);
        const auto answer = codec->ParseAnswer(reply);
        if (!answer || answer->rqSeq != 5 || answer->command != ipmi::kGetDeviceId) return {};
        EXPECT_EQ(answer->sequence, sequence);
        return Bytes(answer->response.begin(), answer->response.end());
    }
};

TEST(Codec, SpeaksEverySuiteWithAndWithoutAKeyOfTheBmc) {
    Bytes expected = *SomeBmc().deviceId;
    expected.insert(expected.begin(), 0);
    for (const int suite : {1, 2, 3, 15, 16, 17}) {
        for (const char* kg : {"", "key of the BMC"}) {
            Conversation talk;
            talk.options.cipherSuite = suite;
            talk.options.kg = kg;
            talk.credentials.kg = FromText(kg);
            EXPECT_EQ(talk.Open(), std::vector<Check>(3, Check::kGood)) << suite << kg;
            for (const std::uint32_t sequence : {1U, 2U, 3U}) {
                EXPECT_EQ(talk.DeviceId(sequence), expected) << suite;
            }
        }
    }
    for (const int none : {0, 4, 6, 8, 12, 18}) EXPECT_EQ(FindCipherSuite(none), nullptr);
}

TEST(Codec, WhatIsWrongShowsInTheStepThatProvesIt) {
    using enum Check;
    const struct {
        const char* what;
        void (*change)(Conversation* talk);
        std::vector<Check> checks;
    } cases[] = {
        {"password", [](Conversation* t) { t->credentials.password = "secreT"; }, {kGood, kForged}},
        {"user", [](Conversation* t) { t->credentials.user = "roof"; }, {kGood, kStatus}},
        {"BMC's key", [](Conversation* t) { t->options.kg = "k"; }, {kGood, kGood, kForged}},
        {"no privilege",
         [](Conversation* t) { t->options.deviations.noPrivilege = true; },
         {kStatus}},
        {"padded name",
         [](Conversation* t) { t->options.deviations.paddedUserName = true; },
         {kGood, kStatus}},
        {"long code",
         [](Conversation* t) { t->options.deviations.longRakp2Code = true; },
         {kGood, kForged}},
    };
    for (const auto& c : cases) {
        Conversation talk;
        c.change(&talk);
        EXPECT_EQ(talk.Open(), c.checks) << c.what;
    }
}

TEST(Codec, DeviationsArePutUpWithWhenAskedFor) {
    const struct {
        const char* what;
        void (*change)(ipmisim::RmcpDeviations* bmc, Deviations* ours);
    } cases[] = {
        {"padded name",
         [](auto* bmc, auto* ours) { bmc->paddedUserName = ours->paddedUserName = true; }},
        {"long code",
         [](auto* bmc, auto* ours) { bmc->longRakp2Code = ours->longRakp2Code = true; }},
        {"no privilege",
         [](auto* bmc, auto* ours) { bmc->noPrivilege = ours->openSessionPrivilege = true; }},
        {"checksums", [](auto* bmc, auto* ours) { bmc->badChecksums = ours->checksums = true; }},
    };
    for (const int suite : {1, 2, 3, 15, 16, 17}) {
        for (const auto& c : cases) {
            Conversation talk;
            talk.options.cipherSuite = suite;
            c.change(&talk.options.deviations, &talk.credentials.deviations);
            EXPECT_EQ(talk.Open(), std::vector<Check>(3, Check::kGood)) << c.what << suite;
            EXPECT_TRUE(talk.DeviceId(1)) << c.what << suite;
        }
    }
    Conversation talk;
    talk.options.deviations.badChecksums = true;
    EXPECT_EQ(talk.Open(), std::vector<Check>(3, Check::kGood));
    EXPECT_FALSE(talk.DeviceId(1));
}

/// Every answer of an opening and of a session, cut at every byte and with every bit turned over.
TEST(Codec, TakesNoAnswerThatWasCutOrChanged) {
    for (const int suite : {3, 17}) {
        Conversation talk;
        talk.options.cipherSuite = suite;
        talk.Open();
        Packet packet;
        talk.codec->WriteRequest(1, 5, ipmi::GetDeviceId(), &packet);
        const Bytes good = Ask(&*talk.bmc, packet);
        ASSERT_TRUE(talk.codec->ParseAnswer(good));
        for (std::size_t length = 0; length < good.size(); ++length) {
            EXPECT_FALSE(talk.codec->ParseAnswer(ByteView(good).first(length))) << length;
        }
        for (std::size_t bit = 8 * 3; bit < 8 * good.size(); ++bit) {
            Bytes changed = good;
            changed[bit / 8] ^= static_cast<std::uint8_t>(1U << bit % 8);
            EXPECT_FALSE(talk.codec->ParseAnswer(changed)) << bit;
        }
        Bytes longer = good;
        longer.push_back(0);
        EXPECT_FALSE(talk.codec->ParseAnswer(longer));
        EXPECT_FALSE(talk.codec->ParseAnswer(Bytes(2000, 6)));

        const Bytes rakp2 = Ask(&*talk.bmc, talk.codec->Rakp1(2));
        ASSERT_EQ(talk.codec->ParseRakp2(rakp2, 2), Check::kGood);
        EXPECT_EQ(talk.codec->ParseRakp2(rakp2, 3), Check::kNotOurs);
        for (std::size_t length = 0; length < rakp2.size(); ++length) {
            EXPECT_NE(talk.codec->ParseRakp2(ByteView(rakp2).first(length), 2), Check::kGood);
        }
    }
}

TEST(Codec, ARequestOfAnyLengthThatFitsArrivesWhole) {
    for (const int suite : {2, 15, 17}) {
        Conversation talk;
        talk.options.cipherSuite = suite;
        talk.Open();
        for (std::uint32_t length = 0; length <= Codec::kMaxRequestData; ++length) {
            Packet packet;
            talk.codec->WriteRequest(length + 1, 0,
                                     ipmi::MakeCommand({0x2E, 0x77}, Bytes(length, 0x5A)), &packet);
            const Bytes reply = Ask(&*talk.bmc, packet);
            const auto answer = talk.codec->ParseAnswer(reply);
            ASSERT_TRUE(answer) << suite << " " << length;
            EXPECT_EQ(answer->response[0], ipmi::kInvalidCommand);
        }
    }
}

TEST(Codec, CapabilitiesNameIpmi20OrDenyIt) {
    const Packet request = AuthenticationCapabilitiesRequest(4, 9);
    RmcpBmc bmc({}, {});
    const Bytes reply = Ask(&bmc, request);
    EXPECT_TRUE(ParseAuthenticationCapabilities(reply, 9, false)->ipmi20);
    EXPECT_FALSE(ParseAuthenticationCapabilities(reply, 8, false));
    Bytes changed = reply;
    ++changed.back();
    EXPECT_FALSE(ParseAuthenticationCapabilities(changed, 9, false));
    EXPECT_TRUE(ParseAuthenticationCapabilities(changed, 9, true)->ipmi20);
    for (std::size_t length = 0; length < reply.size(); ++length) {
        EXPECT_FALSE(ParseAuthenticationCapabilities(ByteView(reply).first(length), 9, false));
    }
    RmcpBmc old({}, {.deviations = {.noIpmi20 = true}});
    EXPECT_FALSE(ParseAuthenticationCapabilities(Ask(&old, request), 9, false)->ipmi20);
}

}  // namespace
