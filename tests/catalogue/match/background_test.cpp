// The background codes, of which every score depends a little.

#include <gtest/gtest.h>

#include "background_music.hpp"
#include "catalogue/match/population.hpp"

namespace {

TEST(BackgroundCodes, AreThoseOfTheMusicTheyStandFor)
{
    const auto codes = kzcat::background_codes();
    EXPECT_EQ(kzcat::test::make_background_codes(),
              std::vector<kzcat::Code>(codes.begin(), codes.end()));
}

} // namespace
