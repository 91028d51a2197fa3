// The area table against the areas that it stands for, and against single known values.
#include "filters/area_table.h"

#include <gtest/gtest.h>

#include "area_rule.h"

namespace {

std::array<int, 2> texel(size_t column, size_t row, size_t first, size_t second) {
    const size_t at = 2 * (kAreaBlockSize * column + first + kAreaTableSize * (kAreaBlockSize * row + second));
    return {areaTable().at(at), areaTable().at(at + 1)};
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
}

TEST(AreaTable, HoldsTheKnownValues) {
    const struct {
        size_t column, row, first, second;
        std::array<int, 2> sides;
    } values[] = {
        {1, 0, 0, 0, {0, 31}},  {1, 0, 3, 4, {0, 15}},  {1, 0, 0, 32, {0, 123}}, {1, 0, 16, 32, {0, 41}},
        {1, 1, 0, 0, {0, 62}},  {1, 1, 0, 4, {0, 102}}, {1, 3, 2, 5, {0, 47}},   {1, 3, 7, 2, {63, 0}},
        {4, 3, 0, 0, {31, 31}}, {4, 3, 0, 4, {0, 102}}, {1, 4, 10, 20, {0, 41}}, {0, 3, 1, 0, {63, 0}},
    };
    for (const auto& [column, row, first, second, sides] : values)
        EXPECT_EQ(texel(column, row, first, second), sides)
            << "block " << column << ", " << row << " at " << first << ", " << second;
}
