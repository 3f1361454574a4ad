#include "kzsdk/abs/version.h"

#include <string>

#include <gtest/gtest.h>

namespace {

TEST(Version, IsTheProjects)
{
    EXPECT_STREQ(KZ_PROJECT_VERSION, KZSDK_VERSION);
    EXPECT_STREQ(KZSDK_VERSION, kzsdk_get_version());
}

TEST(Version, IsItsThreeNumbers)
{
    EXPECT_EQ(std::to_string(KZSDK_VERSION_MAJOR) + '.' + std::to_string(KZSDK_VERSION_MINOR) +
                  '.' + std::to_string(KZSDK_VERSION_PATCH),
              KZSDK_VERSION);
}

#if KZSDK_VERSION_MAJOR < 1
#error "the preprocessor can compare the numbers"
#endif

TEST(Version, TextsAreTheLiteralOnes)
{
    EXPECT_STREQ("common-5", kz_abs_get_common_version());
    EXPECT_STREQ("zonqa-abs-linux-5", kz_abs_get_platspec_version());
    EXPECT_STREQ("Device Software Version May 12 2011 00:44:31", kz_get_software_version());
    EXPECT_STREQ("Device Hardware Version May 12 2011 00:44:31", kz_get_hardware_version());
}

TEST(Version, TextsAreConstants)
{
    EXPECT_EQ(kz_get_software_version(), kz_get_software_version());
    EXPECT_EQ(kz_abs_get_common_version(), kz_abs_get_common_version());
}

} // namespace
