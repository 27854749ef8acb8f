// Replays every saved fuzz input of the INI parser, so that a crash once
// found stays fixed in the ordinary test run.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "fuzz/profile_target.h"

namespace {

TEST(ProfileFuzzReplay, EveryCorpusInputRuns) {
  const std::filesystem::path dir = std::filesystem::path(DOCUVANE_FUZZ_CORPUS) / "profile";
  ASSERT_TRUE(std::filesystem::is_directory(dir)) << dir;
  int replayed = 0;
  for (const auto& entry : std::filesystem::directory_iterator(dir)) {
    if (!entry.is_regular_file()) continue;
    std::ifstream in(entry.path(), std::ios::binary);
    std::vector<char> bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_EQ(FuzzProfileInput(reinterpret_cast<const uint8_t*>(bytes.data()), bytes.size()), 0)
        << entry.path();
    ++replayed;
  }
  EXPECT_GE(replayed, 5);
}

}  // namespace
