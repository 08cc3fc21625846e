#include <gmock/gmock.h>

#include <cstdint>
#include <limits>
#include <stdexcept>

#include "tests/support/bmc_fixture.h"
#include "tqr/plugin.h"

namespace {

using namespace NQORTQR20;
using namespace ::testing;
using namespace tqrhost;
using Bytes = std::vector<std::uint8_t>;

class Recorder : public ipmiseltest::InstanceRecorder {
public:
    bool full = false;
    bool broken = false;

    bool AddProperty(std::string_view name, PropertyValue value) override {
        if (broken) throw std::runtime_error("broken");
        return !full && InstanceRecorder::AddProperty(name, std::move(value));
    }

protected:
    bool Take(const NQORTQR20::Instance& instance) override {
        return !full && InstanceRecorder::Take(instance);
    }
};

class Output : public ::testing::Test {
protected:
    Recorder sink;
    NQORTQR20::OutputHandle handle{sink};
    fdriIOHandle* const output = handle.get();
};

TEST_F(Output, PropertiesStandInTheOrderWritten) {
    TCIMValueArray* array = nullptr;
    TCIMReference* reference = nullptr;
    ASSERT_EQ(fdrNewCIMValueArray(&array).code, 0);
    ASSERT_EQ(fdrNewCIMReference(&reference, output).code, 0);
    fdrGetInstance(output, "Abandoned");
    fdrAddProperty(output, "Z", "1");
    for (const TTQRStatusCode answer :
         {fdrGetInstance(output, "Class"), fdrAddProperty(output, "B", "text"),
          fdrArrayAddUint8(array, 0), fdrArrayAddUint8(array, 255),
          fdrAddArrayProperty(output, "A", array), fdrSetReferenceClassName(reference, "Other"),
          fdrReferenceAddString(reference, "Key", "1"),
          fdrReferenceAddString(reference, "Also", "2"),
          fdrAddReferenceProperty(output, "R", reference)}) {
        EXPECT_EQ(answer.code, 0);
    }
    EXPECT_THAT(sink.instances, IsEmpty());  // nothing counts before it is closed
    EXPECT_EQ(fdrAddInstance(output).code, 0);
    EXPECT_EQ(fdrDeleteCIMValueArray(array).code, 0);
    EXPECT_EQ(fdrDeleteCIMReference(reference).code, 0);
    fdrGetInstance(output, "Unfinished");

    ASSERT_EQ(sink.instances.size(), 1U);
    EXPECT_EQ(sink.instances[0].className, "Class");
    const auto& properties = sink.instances[0].properties;
    ASSERT_THAT(properties, ElementsAre(Pair("B", VariantWith<std::string>("text")),
                                        Pair("A", VariantWith<Bytes>(Bytes{0, 255})), Key("R")));
    const auto& path = std::get<ObjectPath>(properties[2].second);
    EXPECT_EQ(path.className, "Other");
    EXPECT_THAT(path.keys, ElementsAre(Pair("Key", "1"), Pair("Also", "2")));
}

TEST_F(Output, TypedPropertiesKeepTheirType) {
    const char* const texts[] = {"a", ""};
    fdrGetInstance(output, "Class");
    for (const TTQRStatusCode answer :
         {fdrAddIntegerProperty(output, "I", INT64_MIN), fdrAddRealProperty(output, "R", -0.25),
          fdrAddBooleanProperty(output, "B", true), fdrAddTimeProperty(output, "T", -1),
          fdrAddTextListProperty(output, "L", texts, 2),
          fdrAddTextListProperty(output, "None", nullptr, 0), fdrAddInstance(output)}) {
        EXPECT_EQ(answer.code, 0);
    }
    using Texts = std::vector<std::string>;
    ASSERT_EQ(sink.instances.size(), 1U);
    EXPECT_THAT(
        sink.instances[0].properties,
        ElementsAre(Pair("I", VariantWith<std::int64_t>(INT64_MIN)),
                    Pair("R", VariantWith<double>(-0.25)), Pair("B", VariantWith<bool>(true)),
                    Pair("T", VariantWith<Time>(Time{-1})),
                    Pair("L", VariantWith<Texts>(Texts{"a", ""})),
                    Pair("None", VariantWith<Texts>(Texts{}))));
}

TEST_F(Output, WhatIsNoValueOfItsTypeIsRefused) {
    const char* const texts[] = {"a", nullptr};
    fdrGetInstance(output, "Class");
    for (const TTQRStatusCode answer :
         {fdrAddRealProperty(output, "R", std::numeric_limits<double>::infinity()),
          fdrAddRealProperty(output, "R", std::numeric_limits<double>::quiet_NaN()),
          fdrAddTimeProperty(output, "T", kFirstTime - 1),
          fdrAddTimeProperty(output, "T", kLastTime + 1),
          fdrAddTextListProperty(output, "L", texts, 2),
          fdrAddTextListProperty(output, "L", nullptr, 1),
          fdrAddIntegerProperty(output, nullptr, 1), fdrAddBooleanProperty(nullptr, "B", true)}) {
        EXPECT_EQ(answer.code, kStatusFailed);
    }
    EXPECT_EQ(fdrAddInstance(output).code, 0);
    EXPECT_THAT(sink.instances[0].properties, IsEmpty());
}

TEST(TimeText, IsInUniversalTime) {
    const struct {
        std::int64_t seconds;
        const char* text;
    } cases[] = {{0, "1970-01-01T00:00:00Z"},          {1709213400, "2024-02-29T13:30:00Z"},
                 {-1, "1969-12-31T23:59:59Z"},         {4294967296, "2106-02-07T06:28:16Z"},
                 {kFirstTime, "0001-01-01T00:00:00Z"}, {kLastTime, "9999-12-31T23:59:59Z"}};
    for (const auto& c : cases) EXPECT_EQ(TimeText({c.seconds}), c.text) << c.seconds;
}

TEST_F(Output, RefusalOfTheSinkIsTold) {
    fdrGetInstance(output, "Class");
    sink.full = true;
    EXPECT_EQ(fdrAddProperty(output, "A", "1").code, kStatusFailed);
    EXPECT_EQ(fdrAddInstance(output).code, kStatusFailed);
    fdrGetInstance(output, "Class");
    sink.broken = true;
    EXPECT_EQ(fdrAddProperty(output, "A", "1").code, kStatusFailed);
}

TEST_F(Output, MisuseIsAnsweredWithThree) {
    TCIMValueArray* array = nullptr;
    TCIMReference* reference = nullptr;
    fdrNewCIMValueArray(&array);
    fdrNewCIMReference(&reference, output);
    TCIMReference* none = reference;
    NQORTQR20::PluginContext context("/plugins");
    const TPluginManagerProvider* provider = nullptr;
    const char* path = nullptr;
    const auto expectRefused = [](const char* why, std::initializer_list<TTQRStatusCode> answers) {
        int operation = 0;
        for (const TTQRStatusCode answer : answers) {
            EXPECT_EQ(answer.code, kStatusFailed) << why << ", operation " << ++operation;
        }
    };
    expectRefused("no instance is open",
                  {fdrAddProperty(output, "A", "1"), fdrAddArrayProperty(output, "A", array),
                   fdrAddReferenceProperty(output, "A", reference), fdrAddInstance(output)});
    ASSERT_EQ(fdrGetInstance(output, "Class").code, 0);
    expectRefused(
        "no output",
        {fdrGetInstance(nullptr, "Class"), fdrAddInstance(nullptr),
         fdrAddProperty(nullptr, "A", "1"), fdrAddArrayProperty(nullptr, "A", array),
         fdrAddReferenceProperty(nullptr, "A", reference), fdrNewCIMReference(&none, nullptr)});
    expectRefused("no value",
                  {fdrNewCIMValueArray(nullptr), fdrArrayAddUint8(nullptr, 1),
                   fdrAddArrayProperty(output, "A", nullptr), fdrDeleteCIMValueArray(nullptr),
                   fdrNewCIMReference(nullptr, output), fdrSetReferenceClassName(nullptr, "Class"),
                   fdrReferenceAddString(nullptr, "Key", "1"),
                   fdrAddReferenceProperty(output, "A", nullptr), fdrDeleteCIMReference(nullptr)});
    expectRefused("no context",
                  {fdrGetHandle(nullptr, &provider), fdrGetHandle(context.get(), nullptr),
                   fdrGetPluginPath(nullptr, &path), fdrGetPluginPath(context.get(), nullptr),
                   fdrShowNotice(nullptr, "text", nullptr), fdrRegisterPlugin(nullptr, nullptr)});
    EXPECT_EQ(none, nullptr);
    expectRefused(
        "no text",
        {fdrAddProperty(output, nullptr, "1"), fdrAddProperty(output, "A", nullptr),
         fdrAddArrayProperty(output, nullptr, array), fdrSetReferenceClassName(reference, nullptr),
         fdrReferenceAddString(reference, nullptr, "1"),
         fdrReferenceAddString(reference, "Key", nullptr),
         fdrAddReferenceProperty(output, nullptr, reference),
         fdrShowNotice(context.get(), nullptr, "text")});
    fdrDeleteCIMValueArray(array);
    fdrDeleteCIMReference(reference);
    expectRefused("given back",
                  {fdrDeleteCIMValueArray(array), fdrArrayAddUint8(array, 1),
                   fdrAddArrayProperty(output, "A", array), fdrDeleteCIMReference(reference),
                   fdrAddReferenceProperty(output, "A", reference)});
    EXPECT_EQ(fdrAddInstance(output).code, 0);  // none of it has touched the open instance
    EXPECT_THAT(sink.instances[0].properties, IsEmpty());
    expectRefused("closed", {fdrAddInstance(output), fdrAddProperty(output, "A", "1")});
    expectRefused("no class", {fdrGetInstance(output, nullptr)});
}

}  // namespace
