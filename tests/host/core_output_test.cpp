#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

#include "host/core/host.h"
#include "tqr/plugin.h"

namespace {

using namespace NQORTQR20;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using tqrhost::ObjectPath;
using tqrhost::PropertyValue;

class Recorder : public tqrhost::WholeInstanceSink {
public:
    std::vector<tqrhost::Instance> instances;
    bool full = false;
    bool broken = false;

    bool AddProperty(std::string_view name, const PropertyValue& value) override {
        if (broken) throw std::runtime_error("broken");
        return !full && WholeInstanceSink::AddProperty(name, value);
    }

protected:
    bool Take(const tqrhost::Instance& instance) override {
        if (full) return false;
        instances.push_back(instance);
        return true;
    }
};

class Output : public ::testing::Test {
protected:
    Recorder sink;
    tqrhost::OutputHandle handle{sink};
    fdriIOHandle* const output = handle.get();
};

TEST_F(Output, PropertiesStandInTheOrderWritten) {
    TCIMValueArray* array = nullptr;
    TCIMReference* reference = nullptr;
    ASSERT_EQ(fdrNewCIMValueArray(&array).code, 0);
    ASSERT_EQ(fdrNewCIMReference(&reference, output).code, 0);
    EXPECT_EQ(fdrGetInstance(output, "Class").code, 0);
    EXPECT_EQ(fdrAddProperty(output, "B", "text").code, 0);
    for (const unsigned char byte : {0, 255}) EXPECT_EQ(fdrArrayAddUint8(array, byte).code, 0);
    EXPECT_EQ(fdrAddArrayProperty(output, "A", array).code, 0);
    EXPECT_EQ(fdrSetReferenceClassName(reference, "Other").code, 0);
    EXPECT_EQ(fdrReferenceAddString(reference, "Key", "1").code, 0);
    EXPECT_EQ(fdrReferenceAddString(reference, "Also", "2").code, 0);
    EXPECT_EQ(fdrAddReferenceProperty(output, "R", reference).code, 0);
    EXPECT_THAT(sink.instances, IsEmpty());  // nothing counts before it is closed
    EXPECT_EQ(fdrAddInstance(output).code, 0);
    EXPECT_EQ(fdrDeleteCIMValueArray(array).code, 0);
    EXPECT_EQ(fdrDeleteCIMReference(reference).code, 0);

    ASSERT_EQ(sink.instances.size(), 1U);
    EXPECT_EQ(sink.instances[0].className, "Class");
    const auto& properties = sink.instances[0].properties;
    ASSERT_EQ(properties.size(), 3U);
    EXPECT_EQ(properties[0].first, "B");
    EXPECT_EQ(std::get<std::string>(properties[0].second), "text");
    EXPECT_EQ(std::get<std::vector<std::uint8_t>>(properties[1].second),
              (std::vector<std::uint8_t>{0, 255}));
    const auto& path = std::get<ObjectPath>(properties[2].second);
    EXPECT_EQ(path.className, "Other");
    EXPECT_THAT(path.keys, ElementsAre(std::pair("Key", "1"), std::pair("Also", "2")));
}

TEST_F(Output, AbandonedInstanceIsDropped) {
    fdrGetInstance(output, "Abandoned");
    fdrAddProperty(output, "A", "1");
    fdrGetInstance(output, "Kept");
    fdrAddProperty(output, "B", "2");
    EXPECT_EQ(fdrAddInstance(output).code, 0);
    fdrGetInstance(output, "Unfinished");
    ASSERT_EQ(sink.instances.size(), 1U);
    EXPECT_EQ(sink.instances[0].className, "Kept");
    EXPECT_EQ(sink.instances[0].properties.size(), 1U);
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
    tqrhost::PluginContext context("/plugins");
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
    expectRefused("no handle", {fdrGetInstance(nullptr, "Class"),
                                fdrAddProperty(nullptr, "A", "1"),
                                fdrAddInstance(nullptr),
                                fdrNewCIMValueArray(nullptr),
                                fdrArrayAddUint8(nullptr, 1),
                                fdrAddArrayProperty(nullptr, "A", array),
                                fdrAddArrayProperty(output, "A", nullptr),
                                fdrDeleteCIMValueArray(nullptr),
                                fdrNewCIMReference(nullptr, output),
                                fdrNewCIMReference(&none, nullptr),
                                fdrSetReferenceClassName(nullptr, "Class"),
                                fdrReferenceAddString(nullptr, "Key", "1"),
                                fdrAddReferenceProperty(nullptr, "A", reference),
                                fdrAddReferenceProperty(output, "A", nullptr),
                                fdrDeleteCIMReference(nullptr),
                                fdrGetHandle(nullptr, &provider),
                                fdrGetHandle(context.get(), nullptr),
                                fdrGetPluginPath(nullptr, &path),
                                fdrGetPluginPath(context.get(), nullptr),
                                fdrShowNotice(nullptr, "text", nullptr)});
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

TEST(Context, LeadsToPathProviderAndNotices) {
    tqrhost::PluginContext context("/plugins");
    const char* path = nullptr;
    const TPluginManagerProvider* provider = nullptr;
    EXPECT_EQ(fdrGetPluginPath(context.get(), &path).code, 0);
    EXPECT_STREQ(path, "/plugins/ipmisel");
    EXPECT_EQ(fdrGetHandle(context.get(), &provider).code, 0);
    EXPECT_NE(provider, nullptr);
    fdrShowNotice(context.get(), "plain\ntext", nullptr);
    fdrShowNotice(context.get(), "plain", "<a>");
    const auto notices = tqrhost::TakeNotices();
    ASSERT_EQ(notices.size(), 2U);
    EXPECT_EQ(notices[0].plainText, "plain\ntext");
    EXPECT_EQ(notices[0].markupText, "");
    EXPECT_EQ(notices[1].markupText, "<a>");
    EXPECT_THAT(tqrhost::TakeNotices(), IsEmpty());
}

}  // namespace
