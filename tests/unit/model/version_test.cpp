// SPDX-License-Identifier: Apache-2.0
#include <ssoclient/version.h>

#include <gtest/gtest.h>

#include <string>

namespace {

using namespace SsoClient;

TEST(Version, TextHasTheThreeNumbers) {
  EXPECT_EQ(std::to_string(SSOCLIENT_VERSION_MAJOR) + '.' + std::to_string(SSOCLIENT_VERSION_MINOR) + '.' +
                std::to_string(SSOCLIENT_VERSION_PATCH),
            SSOCLIENT_VERSION_STRING);
}

TEST(Version, NumberGrowsWithEachPart) {
  EXPECT_EQ(1002003, SSOCLIENT_MAKE_VERSION(1, 2, 3));
  EXPECT_LT(SSOCLIENT_MAKE_VERSION(0, 1, 999), SSOCLIENT_MAKE_VERSION(0, 2, 0));
  EXPECT_LT(SSOCLIENT_MAKE_VERSION(0, 999, 999), SSOCLIENT_MAKE_VERSION(1, 0, 0));
}

// The preprocessor must be able to compare versions.
#if SSOCLIENT_VERSION_NUMBER < SSOCLIENT_MAKE_VERSION(0, 1, 0)
#error "The first version is 0.1.0."
#endif

TEST(Version, OfTheLibraryIsThatOfItsHeaders) {
  EXPECT_STREQ(SSOCLIENT_VERSION_STRING, GetLibraryVersion());
  EXPECT_EQ(SSOCLIENT_VERSION_NUMBER, GetLibraryVersionNumber());
}

} // namespace
