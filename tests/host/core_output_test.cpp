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
    const auto refused = [](TTQRStatusCode status) { return status.code == kStatusFailed; };

    // No instance is open.
    EXPECT_TRUE(refused(fdrAddProperty(output, "A", "1")));
    EXPECT_TRUE(refused(fdrAddArrayProperty(output, "A", array)));
    EXPECT_TRUE(refused(fdrAddReferenceProperty(output, "A", reference)));
    EXPECT_TRUE(refused(fdrAddInstance(output)));

    // Each argument in turn is null.
    EXPECT_TRUE(refused(fdrGetInstance(nullptr, "Class")));
    EXPECT_TRUE(refused(fdrGetInstance(output, nullptr)));
    ASSERT_FALSE(refused(fdrGetInstance(output, "Class")));
    EXPECT_TRUE(refused(fdrAddProperty(nullptr, "A", "1")));
    EXPECT_TRUE(refused(fdrAddProperty(output, nullptr, "1")));
    EXPECT_TRUE(refused(fdrAddProperty(output, "A", nullptr)));
    EXPECT_TRUE(refused(fdrAddInstance(nullptr)));
    EXPECT_TRUE(refused(fdrNewCIMValueArray(nullptr)));
    EXPECT_TRUE(refused(fdrArrayAddUint8(nullptr, 1)));
    EXPECT_TRUE(refused(fdrAddArrayProperty(nullptr, "A", array)));
    EXPECT_TRUE(refused(fdrAddArrayProperty(output, nullptr, array)));
    EXPECT_TRUE(refused(fdrAddArrayProperty(output, "A", nullptr)));
    EXPECT_TRUE(refused(fdrDeleteCIMValueArray(nullptr)));
    EXPECT_TRUE(refused(fdrNewCIMReference(nullptr, output)));
    EXPECT_TRUE(refused(fdrNewCIMReference(&none, nullptr)));
    EXPECT_EQ(none, nullptr);
    EXPECT_TRUE(refused(fdrSetReferenceClassName(nullptr, "Class")));
    EXPECT_TRUE(refused(fdrSetReferenceClassName(reference, nullptr)));
    EXPECT_TRUE(refused(fdrReferenceAddString(nullptr, "Key", "1")));
    EXPECT_TRUE(refused(fdrReferenceAddString(reference, nullptr, "1")));
    EXPECT_TRUE(refused(fdrReferenceAddString(reference, "Key", nullptr)));
    EXPECT_TRUE(refused(fdrAddReferenceProperty(nullptr, "A", reference)));
    EXPECT_TRUE(refused(fdrAddReferenceProperty(output, nullptr, reference)));
    EXPECT_TRUE(refused(fdrAddReferenceProperty(output, "A", nullptr)));
    EXPECT_TRUE(refused(fdrDeleteCIMReference(nullptr)));
    EXPECT_TRUE(refused(fdrGetHandle(nullptr, &provider)));
    EXPECT_TRUE(refused(fdrGetHandle(context.get(), nullptr)));
    EXPECT_TRUE(refused(fdrGetPluginPath(nullptr, &path)));
    EXPECT_TRUE(refused(fdrGetPluginPath(context.get(), nullptr)));
    EXPECT_TRUE(refused(fdrShowNotice(nullptr, "text", nullptr)));
    EXPECT_TRUE(refused(fdrShowNotice(context.get(), nullptr, "text")));

    // A handle that was given back.
    ASSERT_FALSE(refused(fdrDeleteCIMValueArray(array)));
    EXPECT_TRUE(refused(fdrDeleteCIMValueArray(array)));
    EXPECT_TRUE(refused(fdrArrayAddUint8(array, 1)));
    EXPECT_TRUE(refused(fdrAddArrayProperty(output, "A", array)));
    ASSERT_FALSE(refused(fdrDeleteCIMReference(reference)));
    EXPECT_TRUE(refused(fdrDeleteCIMReference(reference)));
    EXPECT_TRUE(refused(fdrAddReferenceProperty(output, "A", reference)));

    EXPECT_FALSE(refused(fdrAddInstance(output)));
    EXPECT_THAT(sink.instances[0].properties, IsEmpty());
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
