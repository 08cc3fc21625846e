#include "base/shared_library.h"

#include <gmock/gmock.h>

#include <cmath>

namespace {

using ipmisel::SharedLibrary;
using ipmisel::SharedLibraryError;
using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::StartsWith;
using ::testing::ThrowsMessage;

TEST(SharedLibrary, ItsFunctionsAreFoundByNameAndType) {
    const SharedLibrary library("libm.so.6", "the C library");
    double (*root)(double) = nullptr;
    library.Find("sqrt", &root);
    EXPECT_EQ(root(16), 4);
}

TEST(SharedLibrary, OneThatIsMissingOrTooOldIsRefusedWithWhatToInstall) {
    EXPECT_THAT([] { SharedLibrary("libmissing.so.1", "Missing 1 (package libmissing1)"); },
                ThrowsMessage<SharedLibraryError>(
                    AllOf(StartsWith("the library libmissing.so.1 cannot be used ("),
                          EndsWith("); install Missing 1 (package libmissing1)"))));
    EXPECT_THAT(
        [] {
            void (*function)() = nullptr;
            SharedLibrary("libm.so.6", "the C library").Find("no_such_function", &function);
        },
        ThrowsMessage<SharedLibraryError>(AllOf(
            StartsWith("the library libm.so.6 cannot be used ("), HasSubstr("no_such_function"))));
}

}  // namespace
