#include <gtest/gtest.h>

#include <vector>

#include "plugin/Segmentation.h"

namespace {

struct Span {
    int core0, core1, pad0, pad1;
    friend bool operator==(const Span&, const Span&) = default;
};

// Walks every tile and collects the column spans of the first row and the row spans of the first column.
void walk(const pi::Rect16& filter, std::vector<Span>& columns, std::vector<Span>& rows, int& tiles) {
    cSegmentation s(filter, 200, 200, 50);
    s.Reset();
    tiles = 0;
    do {
        ++tiles;
        const auto& c = s.CoreRect();
        const auto& p = s.PaddedRect();
        if (c.y0 == filter.top) columns.push_back({c.x0, c.x1, p.x0, p.x1});
        if (c.x0 == filter.left) rows.push_back({c.y0, c.y1, p.y0, p.y1});
    } while (s.Next());
}

struct Case {
    int width;
    std::vector<Span> spans;
};

TEST(Segmentation, ColumnSpansFollowTheTileRule) {
    const std::vector<Case> cases = {
        {1, {{0, 1, 0, 1}}},
        {250, {{0, 250, 0, 250}}},
        {251, {{0, 200, 0, 250}, {200, 251, 150, 251}}},
        {450, {{0, 200, 0, 250}, {200, 450, 150, 450}}},
        {451, {{0, 200, 0, 250}, {200, 400, 150, 450}, {400, 451, 350, 451}}},
        {1031, {{0, 200, 0, 250}, {200, 400, 150, 450}, {400, 600, 350, 650}, {600, 800, 550, 850},
                {800, 1031, 750, 1031}}},
    };
    for (const auto& c : cases) {
        std::vector<Span> columns, rows;
        int tiles = 0;
        walk(pi::Rect16{0, 0, 10, int16_t(c.width)}, columns, rows, tiles);
        EXPECT_EQ(columns, c.spans) << "width " << c.width;
        EXPECT_EQ(tiles, int(c.spans.size())) << "width " << c.width;
    }
}

TEST(Segmentation, RowsUseTheSameRuleAndEveryRowRestartsAtTheLeftEdge) {
    std::vector<Span> columns, rows;
    int tiles = 0;
    walk(pi::Rect16{0, 0, 451, 251}, columns, rows, tiles);
    EXPECT_EQ(rows, (std::vector<Span>{{0, 200, 0, 250}, {200, 400, 150, 450}, {400, 451, 350, 451}}));
    EXPECT_EQ(tiles, 3 * 2);
}

TEST(Segmentation, SelectionIsTiledFromItsOwnCorner) {
    std::vector<Span> columns, rows;
    int tiles = 0;
    walk(pi::Rect16{37, 13, 37 + 260, 13 + 451}, columns, rows, tiles);
    EXPECT_EQ(columns, (std::vector<Span>{{13, 213, 13, 263}, {213, 413, 163, 463}, {413, 464, 363, 464}}));
    EXPECT_EQ(rows, (std::vector<Span>{{37, 237, 37, 287}, {237, 297, 187, 297}}));
    EXPECT_EQ(tiles, 6);
}

TEST(Segmentation, CoresCoverTheRectangleExactlyOnce) {
    const pi::Rect16 filter{5, 3, 5 + 777, 3 + 1031};
    std::vector<int> covered(size_t(777) * 1031, 0);
    cSegmentation s(filter, 200, 200, 50);
    s.Reset();
    do {
        const auto& c = s.CoreRect();
        const auto& p = s.PaddedRect();
        ASSERT_LE(p.x0, c.x0);
        ASSERT_GE(p.x1, c.x1);
        ASSERT_LE(p.width(), 300);
        ASSERT_LE(p.height(), 300);
        for (int y = c.y0; y < c.y1; ++y)
            for (int x = c.x0; x < c.x1; ++x) ++covered[size_t(y - 5) * 1031 + size_t(x - 3)];
    } while (s.Next());
    for (int v : covered) ASSERT_EQ(v, 1);
}

TEST(Segmentation, NextAfterTheLastTileKeepsItsRectangles) {
    cSegmentation s(pi::Rect16{0, 0, 100, 100}, 200, 200, 50);
    s.Reset();
    EXPECT_FALSE(s.Next());
    EXPECT_EQ(s.CoreRect(), (KERNEL::cRect{0, 100, 0, 100}));
    EXPECT_EQ(s.PaddedRect(), (KERNEL::cRect{0, 100, 0, 100}));
}

}  // namespace
