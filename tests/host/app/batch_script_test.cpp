// The batch script's pieces that a job depends on: how frames are cut into tasks, and words a
// shell reads back as they were.
#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <vector>

#include "submit/batch_script.h"

namespace ostrel {
namespace {

TEST(BatchScript, CutsFramesIntoChunksInOrder) {
    struct Case {
        FrameRange range;
        int32_t size;
        std::vector<std::pair<int32_t, int32_t>> chunks;
    };
    const Case kCases[] = {
        {{0, 23}, 5, {{0, 4}, {5, 9}, {10, 14}, {15, 19}, {20, 23}}},
        {{10, 19}, 5, {{10, 14}, {15, 19}}},  // ends on a chunk's end
        {{7, 7}, 5, {{7, 7}}},
        {{3, 5}, 100, {{3, 5}}},
        {{0, 2}, 1, {{0, 0}, {1, 1}, {2, 2}}},
    };
    for (const Case& c : kCases) {
        std::vector<std::pair<int32_t, int32_t>> chunks;
        for (FrameRange chunk : SplitFrames(c.range, c.size))
            chunks.emplace_back(chunk.first, chunk.last);
        EXPECT_EQ(chunks, c.chunks) << c.range.first << "-" << c.range.last << " by " << c.size;
    }
}

TEST(BatchScript, QuotesWordsTheShellReadsBackWhole) {
    for (std::string word :
         {"/plain/path.####.png", "", "it's", "a b", "$HOME `id` \\ \"", "'''"}) {
        // One word, whole: "a b" split in two or "" dropped would change the count.
        std::string command = "set -- " + ShellQuoted(word) + "; printf '%s:%s' \"$#\" \"$1\"";
        std::FILE* shell = ::popen(command.c_str(), "r");
        ASSERT_NE(shell, nullptr);
        std::string read;
        for (int c; (c = std::fgetc(shell)) != EOF;)
            read.push_back(static_cast<char>(c));
        ::pclose(shell);
        EXPECT_EQ(read, "1:" + word);
    }
}

}  // namespace
}  // namespace ostrel
