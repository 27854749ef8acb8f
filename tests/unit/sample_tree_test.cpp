// The sample TeX tree assembled at build time: its word index names only
// documents that the tree holds, and its documents are the ones [DOC] lists.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
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

// A generated PDF's cross-reference table points at each of its objects,
// and "startxref" near the end points at the table.
TEST(SampleTree, GeneratedDocumentsHaveAConsistentCrossReference) {
  const fs::path doc = fs::path(DOCUVANE_SAMPLE_TEXMF) / "doc";
  if (!fs::exists(doc)) GTEST_SKIP() << "sample tree not assembled (target docuvane_sample_tree)";
  int pdfs = 0;
  for (const auto& entry : fs::recursive_directory_iterator(doc)) {
    if (entry.path().extension() != ".pdf") continue;
    ++pdfs;
    std::ifstream in(entry.path(), std::ios::binary);
    const std::string pdf((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    SCOPED_TRACE(entry.path().string());
    ASSERT_EQ(pdf.rfind("%PDF-1.", 0), 0u);
    const std::size_t start = pdf.rfind("startxref\n");
    ASSERT_NE(start, std::string::npos);
    EXPECT_GT(start + 40, pdf.size());
    const std::size_t xref = std::stoul(pdf.substr(start + 10));
    ASSERT_EQ(pdf.compare(xref, 5, "xref\n"), 0);
    std::istringstream table(pdf.substr(xref + 5));
    int first = -1, count = 0;
    table >> first >> count;
    ASSERT_EQ(first, 0);
    ASSERT_GT(count, 3);
    std::string offset, generation, kind;
    table >> offset >> generation >> kind;  // the free entry 0
    for (int object = 1; object < count; ++object) {
      table >> offset >> generation >> kind;
      ASSERT_EQ(kind, "n");
      const std::string head = std::to_string(object) + " 0 obj";
      EXPECT_EQ(pdf.compare(std::stoul(offset), head.size(), head), 0) << "object " << object;
    }
    EXPECT_NE(pdf.find("/Root 1 0 R"), std::string::npos);
  }
  EXPECT_GE(pdfs, 6);
}

}  // namespace
