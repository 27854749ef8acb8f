#include "catalogue/documents.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "platform/profile.h"
#include "shell/settings.h"
#include "test_support.h"
#include "trovlib/trovlib.h"
#include "wordindex/wordindex.h"

namespace {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

// A word index without words that holds the given labels.
std::string IndexBytes(const std::vector<std::string>& labels) {
  std::string bytes = "WX";
  bytes += '\x01';  // shortest word
  bytes += '\x01';  // longest word: groups for lengths 1 and 2, both empty
  const uint32_t headerEnd = static_cast<uint32_t>(4 + 2 * 4 + 2 + 3 * (labels.size() + 1));
  for (int group = 0; group < 2; ++group)
    for (int shift = 24; shift >= 0; shift -= 8) bytes += static_cast<char>(headerEnd >> shift);
  bytes += static_cast<char>(labels.size() >> 8);
  bytes += static_cast<char>(labels.size());
  uint32_t at = headerEnd;
  for (std::size_t k = 0; k <= labels.size(); ++k) {
    for (int shift = 16; shift >= 0; shift -= 8) bytes += static_cast<char>(at >> shift);
    if (k < labels.size()) at += static_cast<uint32_t>(labels[k].size());
  }
  for (const std::string& label : labels) bytes += label;
  return bytes;
}

class DocumentsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    saved_ini_ = IniFilePath;
    saved_trace_mode_ = TraceMode;
    TraceMode = 0;
    ProfileCacheClear();
    Empty();
  }
  void TearDown() override {
    Empty();
    IniFilePath = saved_ini_;
    TraceMode = saved_trace_mode_;
  }
  static void Empty() {
    CloseWordIndex();
    for (int i = 0; i < DocumentCount; ++i) DocumentTable[i] = DocumentEntry{};
    DocumentCount = 0;
    KeywordListReset();
    PoolReset();
  }

  // Writes Docuvane.ini with the given [DOC] lines and points the settings at it.
  void WriteIni(const std::string& docLines) {
    IniFilePath = tex_.Write("Docuvane/Docuvane.ini", "[Setup]\nTrace=0\n[DOC]\n" + docLines);
  }
  void OpenIndex(const std::vector<std::string>& labels) {
    const std::string path = tex_.Write("Update/command.Index", IndexBytes(labels));
    ASSERT_EQ(OpenWordIndex(path.c_str()), 1);
  }

  TempDir tex_;
  ScopedEnv texmf_{"TEXMF", tex_.path()};
  std::string saved_ini_;
  int saved_trace_mode_ = 0;
};

TEST_F(DocumentsTest, IniDocumentsWithDuplicatesGapsAndSearchFlags) {
  tex_.Write("lomari.ini",
             "[Docuvane.Search]\nP>doc=p\nN>doc=N\n*Star=N\nNoDdf=Y\n");
  for (const char* file : {"p.pdf", "n.pdf", "y.pdf", "star.pdf", "noddf.pdf", "guide.pdf"})
    tex_.Write(std::string("doc/") + file, "%PDF");
  for (const char* ddf : {"p.ddf", "n.ddf", "y.ddf", "star.ddf"})
    tex_.Write(std::string("doc/") + ddf, "[Keywords]\n\\x=a\n");
  WriteIni(
      "Manuals>Guide=guide.pdf\n"
      "MANUALS>guide=guide.pdf\n"
      "Empty=\n"
      "Absent=absent.pdf\n"
      "P>doc=p.pdf\n"
      "N>doc=n.pdf\n"
      "Y>doc=y.pdf\n"
      "*Star=star.pdf\n"
      "NoDdf=noddf.pdf\n");
  MessageCapture capture;
  Collect_Documents();

  struct Row {
    const char* name;
    const char* file;
    int searchMode;
    bool hasDefinition;
  };
  const Row rows[] = {
      {"Manuals>Guide", "guide.pdf", 0, false},  // the case-folded repeat is not added
      {"P>doc", "p.pdf", 2, true},               // "p"
      {"N>doc", "n.pdf", 0, true},               // "N"
      {"Y>doc", "y.pdf", 1, true},               // no key: "Y"
      {"*Star", "star.pdf", 2, true},            // a leading "*" wins over "N"
      {"NoDdf", "noddf.pdf", 0, false},          // flags need a definition file
  };
  ASSERT_EQ(DocumentCount, static_cast<int>(std::size(rows)));
  for (int i = 0; i < DocumentCount; ++i) {
    const DocumentEntry& e = DocumentTable[i];
    EXPECT_EQ(e.Name, rows[i].name);
    EXPECT_EQ(e.FileName, rows[i].file) << rows[i].name;
    EXPECT_EQ(e.Path, tex_ / (std::string("doc/") + rows[i].file)) << rows[i].name;
    EXPECT_EQ(e.Language, "ENG") << rows[i].name;
    EXPECT_EQ(e.SearchMode, rows[i].searchMode) << rows[i].name;
    EXPECT_EQ(!e.DefinitionFile.empty(), rows[i].hasDefinition) << rows[i].name;
    EXPECT_EQ(e.SameAs, -1) << rows[i].name;
    EXPECT_EQ(e.TreeItem, nullptr) << rows[i].name;
  }
  EXPECT_TRUE(capture.messages().empty()) << "empty values and unfound files are silent: "
                                          << capture.messages().front().line();
}

TEST_F(DocumentsTest, AddDocumentDuplicatesAndOtherLanguages) {
  tex_.Write("doc/guide.pdf", "%PDF");
  tex_.Write("doc/guide.ddf", "[Keywords]\n\\x=a\n");
  EXPECT_EQ(AddDocument("Cat>Guide", "guide.pdf", "/p/guide.pdf", "ENG"), 0);
  EXPECT_EQ(AddDocument("Other", "other.pdf", "/p/other.pdf", "ENG"), 1);
  EXPECT_EQ(AddDocument("cat>guide", "x.pdf", "/p/x.pdf", "eng"), 0) << "same name and language";
  EXPECT_EQ(DocumentCount, 2);

  EXPECT_EQ(AddDocument("CAT>GUIDE", "guide.pdf", "/p/guide.pdf", "GER"), 0)
      << "another language answers with the earlier entry";
  ASSERT_EQ(DocumentCount, 3);
  EXPECT_EQ(DocumentTable[2].SameAs, 0);
  EXPECT_EQ(DocumentTable[2].DefinitionFile, "");
  EXPECT_EQ(DocumentTable[2].Language, "GER");
  EXPECT_FALSE(DocumentTable[0].DefinitionFile.empty());

  EXPECT_EQ(AddDocument("Cat>Guide", "guide.pdf", "/p/guide.pdf", "FRE"), 2)
      << "the nearest earlier entry of that name";
  EXPECT_EQ(DocumentTable[3].SameAs, 2);
  EXPECT_EQ(AddDocument("cat>guide", "", "", "ger"), 2) << "found again in its own language";
}

TEST_F(DocumentsTest, TableFullRefusesFurtherDocuments) {
  for (int i = 0; i < kMaxDocuments; ++i) {
    const std::string name = "D" + std::to_string(i);
    ASSERT_EQ(AddDocument(name.c_str(), "f", "/f", "ENG"), i);
  }
  MessageCapture capture;
  EXPECT_EQ(AddDocument("Extra", "f", "/f", "ENG"), -1);
  EXPECT_EQ(AddDocument("D17", "f", "/f", "ENG"), 17) << "a listed document is still found";
  EXPECT_TRUE(capture.Contains("Docuvane: ERROR: Too many documents when try to add: Extra"));
  EXPECT_EQ(DocumentCount, kMaxDocuments);
}

TEST_F(DocumentsTest, LabelsBecomeEntriesAfterTheIniDocuments) {
  tex_.Write("doc/guide.pdf", "%PDF");
  WriteIni("Guide=guide.pdf\n");
  const std::string longLabel = "deep/" + std::string(300, 'x') + ".pdf";
  OpenIndex({"latex/base/guide.pdf", "win\\dir\\file.pdf", longLabel, "guide=x", "flat.pdf"});
  MessageCapture capture;
  Collect_Documents();

  struct Row {
    const char* name;
    const char* label;
  };
  const Row rows[] = {
      {"latex>base>guide.pdf", "latex/base/guide.pdf"},
      {"win>dir>file.pdf", "win\\dir\\file.pdf"},
      {"guide=x", "guide=x"},
      {"flat.pdf", "flat.pdf"},
  };
  ASSERT_EQ(DocumentCount, 1 + static_cast<int>(std::size(rows)));
  EXPECT_EQ(DocumentTable[0].Name, "Guide");
  for (int i = 0; i < 4; ++i) {
    const DocumentEntry& e = DocumentTable[1 + i];
    EXPECT_EQ(e.Name, rows[i].name);
    EXPECT_EQ(e.FileName, rows[i].label);
    EXPECT_EQ(e.Path, rows[i].label);
    EXPECT_EQ(e.DefinitionFile, "");
    EXPECT_EQ(e.Language, "ENG");
    EXPECT_EQ(e.SearchMode, 0);
    EXPECT_EQ(e.SameAs, -1);
  }
  EXPECT_TRUE(capture.Contains("WARNING: Word index label longer than 255 bytes skipped: deep/xxx"));

  // A second collection starts from an empty table.
  Collect_Documents();
  EXPECT_EQ(DocumentCount, 5);
}

TEST_F(DocumentsTest, LabelsBeyondTheTableAreReportedOnce) {
  for (int i = 0; i < 5; ++i) tex_.Write("doc/d" + std::to_string(i) + ".pdf", "%PDF");
  WriteIni("D0=d0.pdf\nD1=d1.pdf\nD2=d2.pdf\nD3=d3.pdf\nD4=d4.pdf\n");
  std::vector<std::string> labels;
  for (int k = 1; k <= kMaxLabels; ++k) labels.push_back("l/" + std::to_string(k));
  OpenIndex(labels);
  MessageCapture capture;
  Collect_Documents();

  EXPECT_EQ(DocumentCount, kMaxDocuments);
  EXPECT_EQ(DocumentTable[kMaxDocuments - 1].Path, "l/8187");
  EXPECT_EQ(std::count_if(capture.messages().begin(), capture.messages().end(),
                          [](const auto& m) { return m.text.find("Too many") != std::string::npos; }),
            1);
  EXPECT_TRUE(capture.Contains("Docuvane: ERROR: Too many documents when try to add: l/8188"));
}

TEST_F(DocumentsTest, OverlongDocListIsCutWithAWarning) {
  tex_.Write("doc/guide.pdf", "%PDF");
  std::string lines;
  for (int i = 0; i < 1000; ++i) {
    char key[48];
    std::snprintf(key, sizeof key, "K%039d", i);  // 40 bytes and a NUL in the list
    lines += std::string(key) + "=guide.pdf\n";
  }
  WriteIni(lines);
  MessageCapture capture;
  Collect_Documents();
  EXPECT_EQ(DocumentCount, 31998 / 41) << "whole keys only; the cut one finds no value";
  EXPECT_TRUE(capture.Contains("WARNING: [DOC] key list cut at 32000 bytes in " + IniFilePath));
}

TEST_F(DocumentsTest, TracesOfTheCollection) {
  tex_.Write("doc/here.pdf", "%PDF");
  tex_.Write("doc/gone.pdf", "%PDF");
  WriteIni("Here=here.pdf\nGone=gone.pdf\nAbsent=absent.pdf\n");
  // The library's file-name index still lists gone.pdf after it is removed.
  ASSERT_NE(TrovSearch("TeX system documentation", "gone.pdf"), nullptr);
  std::filesystem::remove(tex_ / "doc/gone.pdf");

  struct Row {
    int traceMode;
    const char* message;
    bool expected;
  };
  const Row rows[] = {
      {0, "Docuvane: ERROR: There is not Accesible Document file: ", true},
      {0, "Collect Document:", false},
      {0, "Attach document: ", false},
      {0, "Docuvane: absent.pdf", false},
      {1, "Docuvane: ERROR: There is not Accesible Document file: ", true},
      {1, "Docuvane: Collect Document:Here", true},
      {1, "Docuvane: Collect Document:Absent", true},
      {1, "Docuvane: absent.pdf", true},
      {1, "Docuvane: INFO: Load_Document_Index - here.pdf", true},
  };
  for (const Row& row : rows) {
    TraceMode = row.traceMode;
    MessageCapture capture;
    Collect_Documents();
    EXPECT_EQ(capture.Contains(row.message), row.expected)
        << "TraceMode " << row.traceMode << ": " << row.message;
    EXPECT_EQ(DocumentCount, 1);
  }
  TraceMode = 1;
  MessageCapture capture;
  Collect_Documents();
  EXPECT_TRUE(capture.Contains("Docuvane: Attach document: " + (tex_ / "doc/here.pdf")));
  EXPECT_TRUE(capture.Contains("Docuvane: ERROR: There is not Accesible Document file: " +
                               (tex_ / "doc/gone.pdf")));
  EXPECT_EQ(capture.LevelOf("not Accesible"), 4);
}

}  // namespace
