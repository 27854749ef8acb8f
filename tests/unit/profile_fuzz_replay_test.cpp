// Replays every saved fuzz input of the INI parser, with every buffer size,
// section and key the target can choose, so that a crash once found stays fixed.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include "fuzz/profile_target.h"

TEST(ProfileFuzzReplay, EveryCorpusInputRuns) {
  int replayed = 0;
  for (const auto& entry : std::filesystem::directory_iterator(
           std::filesystem::path(DOCUVANE_FUZZ_CORPUS) / "profile")) {
    std::ifstream in(entry.path(), std::ios::binary);
    std::string text((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    for (const char* section : {"setup", "DOC", "", "a", static_cast<const char*>(nullptr)})
      for (const char* key : {"TRACE", "root", "a", "", static_cast<const char*>(nullptr)})
        for (unsigned long size : {0, 1, 2, 3, 9, 31, 300})
          FuzzProfileLookup(text.data(), text.size(), section, key, size);
    EXPECT_EQ(FuzzProfileInput(reinterpret_cast<const uint8_t*>(text.data()), text.size()), 0);
    ++replayed;
  }
  EXPECT_GE(replayed, 5);
}
