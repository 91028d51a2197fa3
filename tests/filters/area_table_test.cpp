// The area table against the areas that it stands for, computed by integration, and against single known values.
#include "filters/area_table.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <utility>

namespace {

using Sides = std::pair<int, int>;  // channel 0, channel 1

Sides texel(size_t column, size_t row, size_t left, size_t right) {
    const size_t x = kAreaBlockSize * column + left;
    const size_t y = kAreaBlockSize * row + right;
    const auto& table = areaTable();
    return {table[2 * (x + kAreaTableSize * y)], table[2 * (x + kAreaTableSize * y) + 1]};
}

// Integral over [from, from + 1] of a line that falls from 1/2 at 0 to 0 at half the length and stays there.
double areaUnderLine(double from, double length) {
    const auto inner = [&](double x) {
        const double inside = std::min(x, length / 2);
        return inside / 2 - inside * inside / (2 * length);
    };
    return inner(from + 1) - inner(from);
}

int bytes(double area) {
    return static_cast<int>(255 * area + 1e-9);  // truncated; whole numbers stay
}

}  // namespace

TEST(AreaTable, HasTheStatedSize) {
    EXPECT_EQ(areaTable().size(), 54450u);
}

TEST(AreaTable, HoldsTheKnownValues) {
    struct Known {
        size_t column, row, left, right;
        Sides sides;
    };
    const Known values[] = {
        {1, 0, 0, 0, {0, 31}},   {1, 0, 1, 0, {0, 0}},    {1, 0, 32, 0, {0, 0}},  {1, 0, 0, 4, {0, 102}},
        {1, 0, 1, 4, {0, 63}},   {1, 0, 2, 4, {0, 36}},   {1, 0, 3, 4, {0, 15}},  {1, 0, 4, 4, {0, 3}},
        {1, 0, 8, 4, {0, 0}},    {1, 0, 0, 32, {0, 123}}, {1, 0, 8, 32, {0, 74}}, {1, 0, 16, 32, {0, 41}},
        {1, 0, 32, 32, {0, 0}},  {1, 1, 0, 0, {0, 62}},   {1, 1, 1, 1, {0, 20}},  {1, 1, 2, 2, {0, 12}},
        {1, 1, 3, 3, {0, 8}},    {1, 1, 0, 4, {0, 102}},  {1, 3, 2, 5, {0, 47}},  {1, 3, 7, 2, {63, 0}},
        {1, 3, 0, 0, {31, 31}},  {3, 1, 0, 4, {102, 0}},  {4, 3, 0, 0, {31, 31}}, {4, 3, 1, 1, {10, 10}},
        {4, 3, 4, 4, {3, 3}},    {4, 3, 0, 4, {0, 102}},  {4, 3, 7, 2, {63, 0}},  {4, 1, 0, 4, {102, 0}},
        {1, 4, 10, 20, {0, 41}}, {0, 3, 1, 0, {63, 0}},
    };
    for (const Known& known : values)
        EXPECT_EQ(texel(known.column, known.row, known.left, known.right), known.sides)
            << "block " << known.column << ", " << known.row << " at " << known.left << ", " << known.right;
}

// One decided end: the area lies on its side, whichever end it is.
TEST(AreaTable, OneDecidedEndGivesTheAreaUnderItsLine) {
    for (size_t left = 0; left < kAreaBlockSize; ++left) {
        for (size_t right = 0; right < kAreaBlockSize; ++right) {
            const int area = bytes(areaUnderLine(static_cast<double>(left), static_cast<double>(left + right + 1)));
            EXPECT_EQ(texel(1, 0, left, right), (Sides{0, area})) << left << ", " << right;
            EXPECT_EQ(texel(3, 0, left, right), (Sides{area, 0})) << left << ", " << right;
            EXPECT_EQ(texel(0, 1, right, left), (Sides{0, area})) << left << ", " << right;
            EXPECT_EQ(texel(0, 3, right, left), (Sides{area, 0})) << left << ", " << right;
        }
    }
}

TEST(AreaTable, TwoDecidedEndsAddTheirAreasOnTheirSides) {
    for (size_t left = 0; left < kAreaBlockSize; ++left) {
        for (size_t right = 0; right < kAreaBlockSize; ++right) {
            const auto length = static_cast<double>(left + right + 1);
            const int first = bytes(areaUnderLine(static_cast<double>(left), length));
            const int second = bytes(areaUnderLine(static_cast<double>(right), length));
            EXPECT_EQ(texel(1, 1, left, right), (Sides{0, first + second}));
            EXPECT_EQ(texel(3, 3, left, right), (Sides{first + second, 0}));
            EXPECT_EQ(texel(1, 3, left, right), (Sides{second, first}));
            EXPECT_EQ(texel(3, 1, left, right), (Sides{first, second}));
        }
    }
}

// An end where both sides are crossed makes a Z with a decided end, and nothing with another.
TEST(AreaTable, DoubleEndsTakeTheSideThatMakesAZ) {
    for (size_t left = 0; left < kAreaBlockSize; ++left) {
        for (size_t right = 0; right < kAreaBlockSize; ++right) {
            EXPECT_EQ(texel(4, 1, left, right), texel(3, 1, left, right));
            EXPECT_EQ(texel(4, 3, left, right), texel(1, 3, left, right));
            EXPECT_EQ(texel(1, 4, left, right), texel(1, 3, left, right));
            EXPECT_EQ(texel(3, 4, left, right), texel(3, 1, left, right));
            for (const auto& [column, row] : {std::pair{0, 0}, {0, 4}, {4, 0}, {4, 4}})
                EXPECT_EQ(texel(static_cast<size_t>(column), static_cast<size_t>(row), left, right), (Sides{0, 0}));
            for (size_t index = 0; index < kAreaBlocks; ++index) {
                EXPECT_EQ(texel(2, index, left, right), (Sides{0, 0}));
                EXPECT_EQ(texel(index, 2, left, right), (Sides{0, 0}));
            }
        }
    }
}

TEST(AreaTable, NoValueIsAboveTheLargest) {
    EXPECT_EQ(*std::max_element(areaTable().begin(), areaTable().end()), 123);
}
