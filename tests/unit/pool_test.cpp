#include "catalogue/pool.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <string>

#include "test_support.h"

namespace {

using testing_support::MessageCapture;

class PoolTest : public ::testing::Test {
 protected:
  void SetUp() override { PoolReset(); }
  void TearDown() override { PoolReset(); }
};

TEST_F(PoolTest, RequestsOutsideOneToChunkSizeAreRefused) {
  struct Row {
    const char* what;
    int count;
    int size;
    const char* formatted;
  };
  const Row rows[] = {
      {"one byte over a chunk", 1, 64001, "1 x 64001 = 64001"},
      {"zero count", 0, 24, "0 x 24 = 0"},
      {"negative size", 1, -8, "1 x -8 = -8"},
      {"product wraps to a small positive number", 65537, 65537, "65537 x 65537 = 131073"},
      {"product wraps to zero", 65536, 65536, "65536 x 65536 = 0"},
      {"product wraps negative", 46341, 46341, "46341 x 46341 = -2147479015"},
  };
  for (const Row& row : rows) {
    MessageCapture capture;
    EXPECT_EQ(PoolAlloc(row.count, row.size), nullptr) << row.what;
    EXPECT_TRUE(capture.Contains(std::string("PS ERROR: VM Range check in allocation ") +
                                 row.formatted))
        << row.what;
    EXPECT_EQ(PoolChunkCount(), 0) << row.what << ": a refused request takes no chunk";
  }
}

TEST_F(PoolTest, WholeChunkRequestFillsOneChunk) {
  EXPECT_NE(PoolAlloc(1, 64000), nullptr);
  EXPECT_EQ(PoolChunkCount(), 1);
  EXPECT_EQ(PoolChunkFill(0), 64000);
  EXPECT_NE(PoolAlloc(1, 1), nullptr);
  EXPECT_EQ(PoolChunkCount(), 2);
}

TEST_F(PoolTest, RequestsFollowEachOtherAlignedForPointers) {
  char* a = static_cast<char*>(PoolAlloc(24, 1));
  char* b = static_cast<char*>(PoolAlloc(24, 1));
  EXPECT_EQ(b - a, 24);
  char* odd = static_cast<char*>(PoolAlloc(1, 5));
  char* next = static_cast<char*>(PoolAlloc(1, 8));
  EXPECT_EQ(next - odd, 8) << "odd sizes are rounded so the next record stays aligned";
  EXPECT_EQ(reinterpret_cast<std::uintptr_t>(next) % alignof(void*), 0u);
}

TEST_F(PoolTest, NewestChunkWithRoomIsUsedFirst) {
  char* old = static_cast<char*>(PoolAlloc(1, 104));
  ASSERT_NE(PoolAlloc(1, 63984), nullptr);  // does not fit chunk 0: opens chunk 1
  ASSERT_EQ(PoolChunkCount(), 2);
  ASSERT_EQ(PoolChunkFill(1), 63984);  // 16 bytes left in the newest chunk

  char* big = static_cast<char*>(PoolAlloc(1, 20));
  EXPECT_EQ(big, old + 104) << "too big for the newest chunk: goes to the older one";
  const int fill1 = PoolChunkFill(1);
  EXPECT_NE(PoolAlloc(1, 5), nullptr);
  EXPECT_GT(PoolChunkFill(1), fill1) << "small enough for the newest chunk";
  EXPECT_EQ(PoolChunkCount(), 2);
}

TEST_F(PoolTest, ChunkLimitIsReported) {
  for (int i = 0; i < kPoolMaxChunks; ++i) ASSERT_NE(PoolAlloc(1, 64000), nullptr);
  MessageCapture capture;
  EXPECT_EQ(PoolAlloc(1, 1), nullptr);
  EXPECT_EQ(PoolAlloc(8, 8), nullptr);
  EXPECT_TRUE(capture.Contains("PS ERROR: VM Memory allocation out VM chunk limit"));
  EXPECT_EQ(capture.LevelOf("PS ERROR: VM"), 4);
  EXPECT_EQ(PoolChunkCount(), kPoolMaxChunks);
}

}  // namespace
