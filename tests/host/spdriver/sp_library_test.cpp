#include "tqr/splibrary.h"

#include <gmock/gmock.h>

#include <stdexcept>

#include "host/spdriver/source.h"

namespace {

using NQORTQR20::SPLibrary;
using namespace tqrhost;

/// Answers what it is told to and keeps the last request.
struct Script {
    std::optional<Response> response;
    bool throws = false;
    std::optional<RequestFrame> asked;
};

class ScriptedTransport : public NQORTQR20::Transport {
public:
    explicit ScriptedTransport(Script* script) : script_(script) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        script_->asked = request;
        if (script_->throws) throw std::runtime_error("gone");
        return script_->response;
    }

private:
    Script* script_;
};

class Send : public ::testing::Test {
protected:
    Script script;
    SPLibrary library{std::make_unique<ScriptedTransport>(&script)};

    /// Get SEL Time in a buffer whose every byte after the frame is 0xEE.
    static std::vector<unsigned char> Buffer(std::size_t size) {
        std::vector<unsigned char> buffer{0x01, 0x20, 0x0A, 0, 0x48, 0, 0, 0, 0};
        buffer.resize(size, 0xEE);
        return buffer;
    }
};

TEST_F(Send, ReplyOfEveryLengthStaysInsideEveryBuffer) {
    for (const std::size_t size : {9u, 10u, 15u, 256u}) {
        for (std::size_t length = 1; length <= 300; ++length) {
            script.response = Response(length, 0x77);
            script.response->front() = 0xC5;
            // One byte more than is told of would show a write past the end; sanitizers show more.
            auto buffer = Buffer(size + 1);
            int reported = 256;
            ASSERT_TRUE(
                library.sendIPMICommand(buffer.data(), &reported, static_cast<int>(size), true));
            const std::size_t fits = std::min(length, size - 8);
            EXPECT_EQ(reported, static_cast<int>(fits) - 1);
            std::vector<unsigned char> expected(size, 0);
            expected[4] = 0xC5;
            std::fill_n(expected.begin() + 8, fits, 0x77);
            expected[8] = 0xC5;
            expected.push_back(0xEE);
            ASSERT_EQ(buffer, expected) << size << " " << length;
        }
    }
}

TEST_F(Send, WithoutAnAnswerTheBufferKeepsTheRequest) {
    const struct {
        std::optional<Response> response;
        bool throws;
    } cases[] = {{std::nullopt, false}, {Response{}, false}, {Response{0x00}, true}};
    for (const auto& c : cases) {
        script.response = c.response;
        script.throws = c.throws;
        auto buffer = Buffer(32);
        int length = 256;
        EXPECT_FALSE(library.sendIPMICommand(buffer.data(), &length, 32, true));
        EXPECT_EQ(buffer, Buffer(32));
        EXPECT_EQ(length, 256);
    }
}

TEST_F(Send, MisuseIsRefusedBeforeAnythingIsSent) {
    script.response = Response{0x00};
    auto buffer = Buffer(15);
    int length = 256;
    const auto send = [&](int size) {
        return library.sendIPMICommand(buffer.data(), &length, size, true);
    };
    EXPECT_FALSE(library.sendIPMICommand(nullptr, &length, 15, true));
    EXPECT_FALSE(library.sendIPMICommand(buffer.data(), nullptr, 15, true));
    for (const int size : {-1, 0, 8}) EXPECT_FALSE(send(size)) << size;
    buffer[5] = 7;  // data bytes up to position 15 of 0 to 14
    EXPECT_FALSE(send(15));
    buffer[5] = 0;
    buffer[8] = 0xFF;
    EXPECT_FALSE(send(15));
    EXPECT_FALSE(script.asked);
    EXPECT_FALSE(SPLibrary(nullptr).sendIPMICommand(Buffer(15).data(), &length, 15, true));
}

TEST(Machine, ItsNodesLastUntilItIsClosed) {
    Script script;
    NQORTQR20::Source source;
    for (int i = 0; i < 2; ++i)
        source.nodes.push_back({"", std::make_unique<ScriptedTransport>(&script), nullptr});
    NQORTQR20::OpenMachine(std::move(source));
    ASSERT_EQ(SPLibrary::GetNumberBMCNode(), 2);
    EXPECT_NE(SPLibrary::GetSplibraryInstance(1), nullptr);
    EXPECT_EQ(SPLibrary::GetSplibraryInstance(2), nullptr);
    EXPECT_EQ(SPLibrary::GetSplibraryInstance(-1), nullptr);
    NQORTQR20::CloseMachine();
    EXPECT_EQ(SPLibrary::GetSplibraryInstance(0), nullptr);
}

}  // namespace
