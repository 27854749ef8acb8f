// The documentation scan: words of text and index lines, reading PDFs in
// isolated processes, the cache, and the files it replaces.
#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>
#include <thread>

#include "platform/profile.h"
#include "platform/worker.h"
#include "scan/scanner.h"
#include "scan/words.h"
#include "test_support.h"
#include "trovlib/trees.h"
#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"

using testing_support::TempDir;
namespace fs = std::filesystem;

namespace {

TEST(ScanWords, IndexLineHeads) {
  const struct {
    const char* line;
    const char* head;
  } rows[] = {
      {"\\cs_new:Npn . . . . . ", "\\cs_new:Npn"},
      {"  \\section . . . 12, ", "\\section"},
      {"\\section (macro) . . . ", "\\section"},
      {"align (environment) . . . ", "{align}"},
      {"{itemize} ", "{itemize}"},
      {"geometry (package) ", "geometry"},
      {"\\section: see also \\part ", ""},  // running text
      {"starred form . . . ", ""},          // plain sub-entry
      {"12, 14, ", ""},                     // continuation: no head here
  };
  for (const auto& row : rows) EXPECT_EQ(IndexEntryHead(row.line), row.head) << row.line;
}

TEST(ScanWords, CommandsAndEnvironmentsOfText) {
  const struct {
    const char* text;
    std::vector<std::string> words;
  } rows[] = {
      {"use \\section: or \\l_tmpa_tl", {"\\section", "\\l_tmpa_tl"}},
      {"\\begin{align*} \\end{align*}", {"{align*}", "\\end"}},
      {"\\\\ \\, \\1", {}},
      {"\xE2\x88\x96newcommand", {"\\newcommand"}},  // the backslash as "set minus"
  };
  for (const auto& row : rows) EXPECT_EQ(WordsOfText(row.text), row.words) << row.text;
}

TEST(ScanTrees, DefaultsPutTheUserTreeFirstAndTheSampleLast) {
  EXPECT_EQ(ChooseDefaultTrees("/u", false, {}, "/s"), std::vector<std::string>{"/s"});
  EXPECT_EQ(ChooseDefaultTrees("/u", true, {}, "/s"), std::vector<std::string>{"/u"});
  EXPECT_EQ(ChooseDefaultTrees("/u", false, {"/d", "/u"}, "/s"),
            (std::vector<std::string>{"/u", "/d"}));
}

TEST(Isolation, AFailingJobIsReportedAndTheOthersFinish) {
  IsolationLimits limits;
  limits.parallel = 2;
  limits.timeoutMs = 400;
  limits.memoryBytes = 256u << 20;
  std::map<std::size_t, IsolatedOutcome> outcomes;
  RunIsolated(
      4, limits,
      [](std::size_t i) -> std::string {
        if (i == 1) std::raise(SIGSEGV);
        if (i == 2) std::this_thread::sleep_for(std::chrono::seconds(30));
        if (i == 3) return std::string(std::size_t{1} << 30, 'x');  // beyond the limit
        return "fine";
      },
      [&](std::size_t i, IsolatedOutcome& o) {
        outcomes[i] = o;
        return true;
      });
  ASSERT_EQ(outcomes.size(), 4u);
  EXPECT_EQ(outcomes[0].status, IsolatedOutcome::Done);
  EXPECT_EQ(outcomes[0].output, "fine");
  EXPECT_NE(outcomes[1].status, IsolatedOutcome::Done);
  EXPECT_EQ(outcomes[2].status, IsolatedOutcome::TimedOut);
#ifndef __SANITIZE_ADDRESS__  // the sanitizer turns the crash into an exit, and has no memory limit
  EXPECT_EQ(outcomes[1].status, IsolatedOutcome::Crashed);
  EXPECT_NE(outcomes[3].status, IsolatedOutcome::Done);
#endif
}

// One worker runs many jobs; what an earlier job leaves behind (here: a
// count kept in the worker) does not skip a later one, which runs again.
TEST(Isolation, AJobFailingAfterOthersInItsWorkerRunsAgainInAFreshOne) {
  static int ranHere = 0;  // per worker process
  std::map<std::size_t, IsolatedOutcome> outcomes;
  RunIsolated(
      6, IsolationLimits{},
      [](std::size_t i) -> std::string {
        if (i == 4 && ranHere > 0) std::raise(SIGSEGV);
        return std::to_string(++ranHere);
      },
      [&](std::size_t i, IsolatedOutcome& o) { return outcomes.emplace(i, o).second; });
  ASSERT_EQ(outcomes.size(), 6u);
  EXPECT_EQ(outcomes[3].output, "4");  // no fork per job
  EXPECT_EQ(outcomes[4].output, "1");
  EXPECT_EQ(outcomes[5].output, "2");
}

// A tree with a manual (index with page labels and links), a plain PDF, a
// damaged and an encrypted one, HTML pages, and a package.
class ScanTree : public ::testing::Test {
 protected:
  void SetUp() override {
    Pdf("--manual", "latex/demo/manual.pdf");
    Pdf("--damaged", "latex/bad/damaged.pdf");
    Pdf("--encrypted", "latex/bad/locked.pdf");
    Plain("latex/demo/plain.pdf", "Using \\newcommand");
    Write("doc/html/guide/index.html", "<html></html>");
    Write("doc/html/guide/part/one.html", "<html></html>");  // covered by index.html
    Write("tex/latex/demo/demopkg.sty", "");
  }
  void Pdf(const char* kind, const std::string& rel) {
    fs::create_directories((tree / "doc" / rel).parent_path());
    const std::string command =
        std::string(DOCUVANE_MKPDF) + " " + kind + " " + (tree / "doc" / rel).string();
    ASSERT_EQ(std::system(command.c_str()), 0);
  }
  void Plain(const std::string& rel, const std::string& title) {
    fs::create_directories((tree / "doc" / rel).parent_path());
    const std::string command =
        std::string(DOCUVANE_MKPDF) + " " + (tree / "doc" / rel).string() + " '" + title + "' 2";
    ASSERT_EQ(std::system(command.c_str()), 0);
  }
  void Write(const std::string& rel, const std::string& text) {
    fs::create_directories((tree / rel).parent_path());
    std::ofstream(tree / rel) << text;
  }
  ScanResult Scan(std::function<bool(const ScanProgress&)> progress = nullptr) {
    ScanOptions options;
    options.trees = {tree.string()};
    options.userTree = user.string();
    options.parallel = 2;
    options.timeoutMs = 20000;
    options.progress = progress;
    warnings.clear();
    options.warn = [this](const std::string& w) { warnings += w + "\n"; };
    return Scan_Documentation(options);
  }
  // word -> label -> pages, from the index written.
  std::map<std::string, std::map<std::string, std::string>> Index() {
    std::map<std::string, std::map<std::string, std::string>> out;
    if (!OpenWordIndex((user / kScanIndexFile).c_str())) return out;
    std::stringstream dump;
    int skipped = 0;
    DumpWordIndex(dump, skipped);
    CloseWordIndex();
    std::string word, label, pages;
    while (std::getline(dump, word, '\t') && std::getline(dump, label, '\t') &&
           std::getline(dump, pages))
      out[word][label] = pages;
    return out;
  }

  TempDir dir;
  fs::path tree = dir / "tree", user = dir / "user";
  std::string warnings;
};

TEST_F(ScanTree, IndexPagesAreThePhysicalPagesTheIndexLinksTo) {
  const ScanResult result = Scan();
  ASSERT_TRUE(result.ok) << result.error;
  auto index = Index();
  const struct {
    const char* word;
    const char* label;
    const char* pages;
  } rows[] = {
      {"\\section", "latex/demo/manual.pdf", "3 4"},  // printed 1, 2
      {"\\cs_new:Npn", "latex/demo/manual.pdf", "4"},
      {"{align}", "latex/demo/manual.pdf", "3"},
      {"\\binom", "latex/demo/manual.pdf", "5"},  // no index entry: where it occurs
      {"\\newcommand", "latex/demo/plain.pdf", "1 2"},
      {"manual", "latex/demo/manual.pdf", "1"},  // own name
      {"demopkg", "latex/demo/plain.pdf", "1"},  // a package of its directory
      {"guide", "html/guide/index.html", "1"},
      {"locked", "latex/bad/locked.pdf", "1"},  // unreadable, still catalogued
  };
  for (const auto& row : rows) EXPECT_EQ(index[row.word][row.label], row.pages) << row.word;
  // Code line 17 links to physical page 2, labelled "ii": not a page.
  EXPECT_EQ(index["\\foo"]["latex/demo/manual.pdf"].find("2"), std::string::npos);
  EXPECT_EQ(index.count("one"), 0u);
  EXPECT_EQ(result.documents, 5u);
  EXPECT_NE(warnings.find("damaged.pdf: skipped"), std::string::npos) << warnings;
  EXPECT_NE(warnings.find("locked.pdf: skipped, encrypted"), std::string::npos) << warnings;
  ASSERT_TRUE(OpenWordIndex((user / kScanIndexFile).c_str()));
  const std::vector<std::string> labels = ListIndexLabels();
  CloseWordIndex();
  EXPECT_TRUE(std::is_sorted(labels.begin(), labels.end())) << "a directory's documents together";
  EXPECT_EQ(labels.size(), result.documents) << "every document once";
  char pdf[64];  // PDF documents open at their page through the launcher
  GetPrivateProfileStringA("Extensions", "pdf", "", pdf, sizeof pdf, (user / kScanIniFile).c_str());
  EXPECT_STREQ(pdf, "<docuvane-open>{ #} ^.pdf");
  GetPrivateProfileStringA("Titles", "latex/demo/manual.pdf", "", pdf, sizeof pdf,
                           (user / kScanIniFile).c_str());
  EXPECT_STREQ(pdf, "A manual for testing") << "the document's own title";
}

TEST_F(ScanTree, CacheReadsOnlyWhatChanged) {
  ASSERT_TRUE(Scan().ok);
  const fs::path cache = user / kScanCacheFile;
  const struct {
    const char* step;
    std::function<void()> change;
    std::size_t read, documents;
  } rows[] = {
      {"unchanged", [] {}, 0, 5},
      {"changed", [this] { Plain("latex/demo/plain.pdf", "Now \\renewcommand"); }, 1, 5},
      {"removed", [this] { fs::remove(tree / "doc/latex/bad/locked.pdf"); }, 0, 4},
      {"damaged cache", [&] { std::ofstream(cache) << "docuvane-scan-cache 2\ndoc 99\tx\n"; }, 3,
       4},
  };
  for (const auto& row : rows) {
    row.change();
    const ScanResult result = Scan();
    ASSERT_TRUE(result.ok) << row.step << ": " << result.error;
    EXPECT_EQ(result.read, row.read) << row.step;
    EXPECT_EQ(result.documents, row.documents) << row.step;
  }
  auto index = Index();
  EXPECT_EQ(index["\\renewcommand"].count("latex/demo/plain.pdf"), 1u);
  EXPECT_EQ(index["\\newcommand"].count("latex/demo/plain.pdf"), 0u);
  EXPECT_EQ(index.count("locked"), 0u);
  EXPECT_NE(warnings.find("damaged, rebuilt"), std::string::npos) << warnings;
}

TEST_F(ScanTree, ACancelledOrFailedScanLeavesTheOldFiles) {
  ASSERT_TRUE(Scan().ok);
  std::ifstream in(user / kScanIndexFile, std::ios::binary);
  const std::string before((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  Plain("latex/demo/plain.pdf", "Now \\renewcommand");
  EXPECT_EQ(Scan([](const ScanProgress&) { return false; }).error, "cancelled");
  std::ifstream again(user / kScanIndexFile, std::ios::binary);
  EXPECT_EQ(before,
            std::string((std::istreambuf_iterator<char>(again)), std::istreambuf_iterator<char>()));

  // More documents than the index has labels for: refused, never cut.
  fs::create_directories(tree / "doc/html/many");
  for (int k = 0; k < kMaxLabels; ++k)
    std::ofstream(tree / "doc/html/many" / ("p" + std::to_string(k) + ".html")) << "";
  EXPECT_NE(Scan().error.find(" documents found, but the word index holds 8190 at most"),
            std::string::npos);
  std::ifstream third(user / kScanIndexFile, std::ios::binary);
  EXPECT_EQ(before,
            std::string((std::istreambuf_iterator<char>(third)), std::istreambuf_iterator<char>()));

  fs::remove_all(tree / "doc");
  EXPECT_NE(Scan().error.find("no PDF documents found"), std::string::npos);
  std::ofstream(dir / "file") << "";
  user = fs::path(dir / "file") / "tree";
  EXPECT_NE(Scan().error.find("not writable"), std::string::npos);
}

}  // namespace
