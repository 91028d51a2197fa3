// The area table against the areas that it stands for, and against single known values.
#include "filters/area_table.h"

#include <gtest/gtest.h>

#include "area_rule.h"

namespace {

std::array<int, 2> texel(size_t column, size_t row, size_t first, size_t second) {
    const size_t at = 2 * (kAreaBlockSize * column + first + kAreaTableSize * (kAreaBlockSize * row + second));
    return {areaTable()[at], areaTable()[at + 1]};
}

}  // namespace

TEST(AreaTable, HoldsTheAreaUnderTheLinesForAllEndsAndDistances) {
    ASSERT_EQ(areaTable().size(), 54450u);
    for (int column = 0; column < 5; ++column)
        for (int row = 0; row < 5; ++row)
            for (int first = 0; first < 33; ++first)
                for (int second = 0; second < 33; ++second)
                    ASSERT_EQ(texel(size_t(column), size_t(row), size_t(first), size_t(second)),
                              areaRule(first, second, column, row))
                        << "block " << column << ", " << row << " at " << first << ", " << second;
    // Known values, against an error in the rule.
    EXPECT_EQ(texel(1, 1, 0, 0), (std::array{0, 62}));
    EXPECT_EQ(texel(1, 3, 7, 2), (std::array{63, 0}));
    EXPECT_EQ(texel(4, 3, 0, 4), (std::array{0, 102}));
    EXPECT_EQ(texel(1, 4, 10, 20), (std::array{0, 41}));
}
