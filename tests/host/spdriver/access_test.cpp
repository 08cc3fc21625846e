#include "host/spdriver/access.h"

#include <gmock/gmock.h>

#include <cmath>

namespace {

using namespace NQORTQR20;
using namespace ::testing;

TEST(Access, WhatNoBmcCouldBeOpenedWithIsRefusedInOneLine) {
    const struct {
        void (*change)(SourceOptions* options);
        const char* line;
    } cases[] = {
        {[](auto* o) { o->privilege = "king"; }, "\"king\"; use one of user, operator, admin"},
        {[](auto* o) {
             o->workarounds = {"authcap", "magic"};
         },
         "\"magic\"; use one of authcap,"},
        {[](auto* o) { o->workarounds = {"integritycheckvalue"}; },
         "integritycheckvalue was for cipher suite 0, which is never used"},
        {[](auto* o) { o->cipherSuite = 4; }, "cipher suite 4 is not supported; use 17 or 3"},
        {[](auto* o) { o->cipherSuite = 12; }, "cipher suite 12 is not supported"},
        {[](auto* o) { o->cipherSuite = 0; }, "cipher suite 0 has no password"},
        {[](auto* o) { o->user = std::string(17, 'u'); }, "user name is longer than the 16 bytes"},
        {[](auto* o) { o->window = 0; }, "a window of 0 requests"},
        {[](auto* o) { o->window = 33; }, "a window of 33 requests is not possible; give 1 to 32"},
        {[](auto* o) { o->timeoutSeconds = 0; }, "a timeout of 0 seconds"},
        {[](auto* o) { o->timeoutSeconds = 86401; }, "give more than 0, at most 86400"},
        {[](auto* o) { o->timeoutSeconds = std::nan(""); }, "a timeout of nan seconds"}};
    for (const auto& c : cases) {
        SourceOptions options;
        EXPECT_NO_THROW(ParseAccess(options));
        c.change(&options);
        try {
            ParseAccess(options);
            ADD_FAILURE() << c.line;
        } catch (const SourceUsageError& error) {
            EXPECT_THAT(error.what(), AllOf(HasSubstr(c.line), Not(HasSubstr("\n"))));
        }
    }
}

TEST(Access, IsInTheTermsOfTheStandard) {
    SourceOptions options;
    EXPECT_EQ(ParseAccess(options).privilege, 4);
    EXPECT_THAT(ParseAccess(options).cipherSuites, ElementsAre(17, 3));
    options = {.user = std::string(16, 'u'),
               .password = [] { return std::string("p"); },
               .kg = {},
               .cipherSuite = 16,
               .privilege = "operator",
               .workarounds = {"sun20", "sessionnumbers"},
               .window = 32,
               .timeoutSeconds = 0.25};
    const Access access = ParseAccess(options);
    EXPECT_EQ(access.user, std::string(16, 'u'));
    EXPECT_EQ(access.password(), "p");
    EXPECT_THAT(access.cipherSuites, ElementsAre(16));
    EXPECT_EQ(access.privilege, 3);
    EXPECT_TRUE(access.deviations.longRakp2Code && access.deviations.openSessionPrivilege &&
                access.deviations.sessionNumbers);
    EXPECT_FALSE(access.deviations.paddedUserName || access.deviations.checksums ||
                 access.deviations.capabilities);
    EXPECT_EQ(access.window, 32u);
    EXPECT_EQ(access.timeout, std::chrono::milliseconds(250));
}

}  // namespace
