// Replays the word index fuzz corpus through the fuzz target, so that every
// input that once went wrong stays covered in the ordinary test run.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

#include "fuzz/wordindex_target.h"
#include "test_support.h"

namespace {

TEST(WordIndexFuzzReplay, EveryCorpusFileRunsCleanly) {
  testing_support::MessageCapture quiet;  // damaged files trace a lot
  const std::filesystem::path dir = std::filesystem::path(DOCUVANE_FUZZ_CORPUS) / "wordindex";
  int files = 0;
  int opened = 0;
  for (const auto& entry : std::filesystem::directory_iterator(dir)) {
    if (!entry.is_regular_file()) continue;
    std::ifstream in(entry.path(), std::ios::binary);
    const std::vector<uint8_t> bytes((std::istreambuf_iterator<char>(in)),
                                     std::istreambuf_iterator<char>());
    SCOPED_TRACE(entry.path().filename().string());
    FuzzWordIndexInput(bytes.data(), bytes.size());
    if (OpenWordIndexFromMemory(bytes.data(), bytes.size(), "replay")) ++opened;
    CloseWordIndex();
    ++files;
  }
  EXPECT_GE(files, 8);
  // The files made by docuvane-mkindex must all open.
  EXPECT_GE(opened, 8);
}

}  // namespace
