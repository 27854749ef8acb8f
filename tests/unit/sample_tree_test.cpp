// The sample TeX tree assembled at build time: its word index names only
// documents that the tree holds, and its documents are the ones [DOC] lists.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <string>

#include "platform/profile.h"
#include "wordindex/wordindex.h"

namespace {

namespace fs = std::filesystem;

TEST(SampleTree, IndexLabelsAndListedDocumentsExist) {
  const fs::path tree = DOCUVANE_SAMPLE_TEXMF;
  const fs::path index = tree / "Update" / "command.Index";
  if (!fs::exists(index)) GTEST_SKIP() << "sample tree not assembled (target docuvane_sample_tree)";

  ASSERT_EQ(OpenWordIndex(index.c_str()), 1);
  EXPECT_GE(LabelCount, 5);
  EXPECT_NE(FindIndexWord("\\section"), 0);
  EXPECT_NE(FindIndexWord("{align}"), 0);
  EXPECT_NE(FindIndexWord("\\@ifnextchar"), 0);
  for (int k = 1; k <= LabelCount; ++k) {
    char label[kLabelBufferSize];
    ReadIndexLabel(k, label);
    EXPECT_TRUE(fs::is_regular_file(tree / "doc" / label)) << label;
  }
  CloseWordIndex();

  const std::string ini = (tree / "Docuvane" / "Docuvane.ini").string();
  char keys[4000];
  ASSERT_GT(GetPrivateProfileStringA("DOC", nullptr, "", keys, sizeof keys, ini.c_str()), 0u);
  int documents = 0;
  for (const char* key = keys; *key; key += std::strlen(key) + 1) {
    char file[64];
    GetPrivateProfileStringA("DOC", key, "", file, sizeof file, ini.c_str());
    bool found = false;
    for (const auto& entry : fs::recursive_directory_iterator(tree / "doc"))
      if (entry.path().filename() == file) found = true;
    EXPECT_TRUE(found) << key << " = " << file;
    ++documents;
  }
  EXPECT_GE(documents, 6);
  EXPECT_TRUE(fs::is_regular_file(tree / "doc" / "docuvane" / "docuvane-help.pdf"));
}

}  // namespace
