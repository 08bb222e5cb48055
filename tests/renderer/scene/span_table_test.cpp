#include "renderer/scene/span_table.h"

#include <gtest/gtest.h>

#include <vector>

#include "u_memory.h"

namespace {

struct Row {
    int16_t start, end;
    bool operator==(const Row&) const = default;
};

std::vector<Row> Rows(const SY_SpanTable& table) {
    std::vector<Row> rows;
    for (const SY_Span& s : table.rows)
        rows.push_back({s.start, s.end});
    return rows;
}

std::ostream& operator<<(std::ostream& out, const Row& row) {
    return out << "[" << row.start << ", " << row.end << ")";
}

TEST(SpanTable, CoversEveryPixelThePolygonTouches) {
    struct Case {
        std::vector<M_Point2> polygon;
        int32_t firstRow;
        std::vector<Row> rows;
    };
    const std::vector<Case> cases = {
        // Integer corners: four rows of pixels 2 to 5.
        {{{2, 3}, {6, 3}, {6, 7}, {2, 7}}, 3, {{2, 6}, {2, 6}, {2, 6}, {2, 6}}},
        // x + y ≤ 8: the top of band r reaches x = 8 − r.
        {{{0, 0}, {8, 0}, {0, 8}},
         0,
         {{0, 8}, {0, 7}, {0, 6}, {0, 5}, {0, 4}, {0, 3}, {0, 2}, {0, 1}}},
        // Half-pixel corners: the partly covered pixels around it count.
        {{{1.5, 0.5}, {3.5, 0.5}, {3.5, 2.5}, {1.5, 2.5}}, 0, {{1, 4}, {1, 4}, {1, 4}}},
        // 0.1 wide, rising 1.5 per row: edges x = 1.2 + 1.5 (y − 1.5) and x = 1.3 + ....
        {{{1.2, 1.5}, {1.3, 1.5}, {5.8, 4.5}, {5.7, 4.5}}, 1, {{1, 3}, {1, 4}, {3, 6}, {4, 6}}},
        // A diamond whose side vertices (0.75, 3.5) and (9.25, 3.5) lie inside band 3: that
        // row reaches them, beyond the x of the band's top and bottom (about 1.46 and 8.54).
        {{{5, 0.5}, {9.25, 3.5}, {5, 6.5}, {0.75, 3.5}},
         0,
         {{4, 6}, {2, 8}, {1, 9}, {0, 10}, {1, 9}, {2, 8}, {4, 6}}},
        // Negative rows and columns round outward too.
        {{{-2.5, -1.5}, {0.5, -1.5}, {0.5, 0.5}, {-2.5, 0.5}}, -2, {{-3, 1}, {-3, 1}, {-3, 1}}},
        {{{1, 2}, {5, 2}}, 0, {}},  // only a line: no rows
        {{}, 0, {}},
    };
    int64_t start = U_AccountedBytes();
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << "case " << &c - cases.data());
        SY_SpanTable table;
        SY_BuildSpanTable(c.polygon.data(), static_cast<int32_t>(c.polygon.size()), &table);
        if (!c.rows.empty()) {
            EXPECT_EQ(table.firstRow, c.firstRow);
        }
        EXPECT_EQ(Rows(table), c.rows);
    }
    EXPECT_EQ(U_AccountedBytes(), start);
}

}  // namespace
