// Building the catalogue: Collect_Documents over a TeX tree of 50,000 files,
// then Fill_Tree into an in-memory tree, for 8,190 documents.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "base/settings.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "catalogue/tree.h"
#include "platform/profile.h"
#include "test_support.h"
#include "trovlib/trovlib.h"
#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"

namespace {

constexpr int kFiles = 50000;
constexpr int kPackages = 2500;  // 20 files in each package directory
constexpr int kDocuments = 8190;
// [DOC] key names are read in one 32000-byte piece: about 2,000 short keys
// fit, so the rest of the catalogue comes from word index labels.
constexpr int kListed = 2000;
constexpr int kDefinitionEvery = 8;  // one document in 8 has a definition file
constexpr int kKeysPerDefinition = 20;
constexpr int kVocabulary = 2000;  // distinct keywords over all definition files

// A tree whose children are kept in sibling lists, as a tree control does.
class MemoryTree : public DocumentTreeView {
 public:
  void Freeze() override {}
  void Thaw() override {}
  void DeleteAllItems() override {
    nodes_.clear();
    root_ = nullptr;
  }
  Item GetRootItem() override { return root_; }
  Item AddRoot(const std::string& text) override { return root_ = NewNode(text); }
  Item AppendItem(Item parent, const std::string& text) override {
    Node* node = NewNode(text);
    Node* p = static_cast<Node*>(parent);
    (p->last ? p->last->next : p->first) = node;
    p->last = node;
    return node;
  }
  Item GetFirstChild(Item parent) override { return static_cast<Node*>(parent)->first; }
  Item GetNextChild(Item, Item previous) override { return static_cast<Node*>(previous)->next; }
  std::string GetItemText(Item item) override { return static_cast<Node*>(item)->text; }
  std::size_t Size() const { return nodes_.size(); }

 private:
  struct Node {
    std::string text;
    Node* first = nullptr;
    Node* last = nullptr;
    Node* next = nullptr;
  };
  Node* NewNode(const std::string& text) {
    nodes_.push_back(std::make_unique<Node>());
    nodes_.back()->text = text;
    return nodes_.back().get();
  }
  std::vector<std::unique_ptr<Node>> nodes_;
  Node* root_ = nullptr;
};

std::string FileName(int i) {
  char name[64];
  std::snprintf(name, sizeof name, "pkg%04d/doc%05d.pdf", i % kPackages, i);
  return name;
}

// The TeX tree, the INI file and the word index, made once.
class Catalogue {
 public:
  Catalogue() {
    for (int i = 0; i < kFiles; ++i) tex_.Write("doc/" + FileName(i), "%PDF");

    std::string ini = "[Setup]\nTrace=0\n[DOC]\n";
    for (int i = 0; i < kListed; ++i) {
      char key[96];
      // Neighbours share their categories, as the real [DOC] section is laid out.
      std::snprintf(key, sizeof key, "C%02d>G%03d>%05d", i / 400, i / 20, i);
      ini += std::string(key) + "=" + FileName(i).substr(8) + "\n";
      if (i % kDefinitionEvery == 0) {
        std::string ddf = "[Keywords]\n";
        for (int k = 0; k < kKeysPerDefinition; ++k) {
          const int word = (i * 7 + k * 101) % kVocabulary;
          ddf += "#5Cword" + std::to_string(word) + "=anchor" + std::to_string(k) + "#alt\n";
        }
        std::string ddfName = FileName(i);
        ddfName.replace(ddfName.size() - 4, 4, ".ddf");
        tex_.Write("doc/" + ddfName, ddf);
      }
    }
    ini_path_ = tex_.Write("Docuvane/Docuvane.ini", ini);
    tex_.Write("lomari.ini", "[Docuvane.Search]\nC00>G000>00000=P\n");

    WordIndexBuilder builder;
    std::string error;
    for (int i = kListed; i < kDocuments; ++i)
      builder.Add("\\w" + std::to_string(i), "latex/" + FileName(i), {1, 2}, error);
    std::vector<uint8_t> bytes;
    builder.Build(WordIndexBuilder::Form::Compact, bytes, error);
    index_path_ = tex_.Write("Update/command.Index", std::string(bytes.begin(), bytes.end()));
  }

  // Points the program at this tree; the path search indexes it on first use.
  void Activate() {
    setenv("TEXMF", tex_.path().c_str(), 1);
    TrovResetCaches();
    ProfileCacheClear();
    IniFilePath = ini_path_;
    TraceMode = 0;
    CloseWordIndex();
    OpenWordIndex(index_path_.c_str());
  }

 private:
  testing_support::TempDir tex_;
  std::string ini_path_;
  std::string index_path_;
};

Catalogue& TheCatalogue() {
  static Catalogue catalogue;
  return catalogue;
}

void BuildCatalogue(benchmark::State& state, bool cold) {
  TheCatalogue().Activate();
  std::size_t nodes = 0;
  for (auto _ : state) {
    state.PauseTiming();
    KeywordListReset();
    PoolReset();
    if (cold) {
      TrovResetCaches();
      ProfileCacheClear();
    }
    MemoryTree tree;
    state.ResumeTiming();

    Collect_Documents();
    Fill_Tree(tree);

    state.PauseTiming();
    nodes = tree.Size();
    state.ResumeTiming();
  }
  if (DocumentCount != kDocuments) state.SkipWithError("not every document was collected");
  state.counters["documents"] = DocumentCount;
  state.counters["tree_nodes"] = static_cast<double>(nodes);
  state.counters["pool_chunks"] = PoolChunkCount();
  int keywords = 0;
  for (const KeywordNode* n = KeywordListHead.Next; n != &KeywordListEnd; n = n->Next) ++keywords;
  state.counters["keywords"] = keywords;
}

// Warm: the path search's file-name index and the parsed INI files are kept
// between runs, as they are after the first search of a session.
void BM_CollectAndFillWarm(benchmark::State& state) { BuildCatalogue(state, false); }
// Cold: every run indexes the 50,000 files again.
void BM_CollectAndFillCold(benchmark::State& state) { BuildCatalogue(state, true); }

// The two steps apart, to see where the time goes.
void BM_CollectOnly(benchmark::State& state) {
  TheCatalogue().Activate();
  for (auto _ : state) {
    state.PauseTiming();
    KeywordListReset();
    PoolReset();
    state.ResumeTiming();
    Collect_Documents();
  }
}
void BM_FillTreeOnly(benchmark::State& state) {
  TheCatalogue().Activate();
  KeywordListReset();
  PoolReset();
  Collect_Documents();
  for (auto _ : state) {
    MemoryTree tree;
    Fill_Tree(tree);
    state.PauseTiming();
    tree.DeleteAllItems();
    state.ResumeTiming();
  }
}

BENCHMARK(BM_CollectOnly)
    ->Unit(benchmark::kMillisecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);
BENCHMARK(BM_FillTreeOnly)
    ->Unit(benchmark::kMillisecond)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);
BENCHMARK(BM_CollectAndFillWarm)
    ->Unit(benchmark::kMillisecond)
    ->Iterations(3)
    ->Repetitions(7)
    ->ReportAggregatesOnly(true);
BENCHMARK(BM_CollectAndFillCold)
    ->Unit(benchmark::kMillisecond)
    ->Iterations(1)
    ->Repetitions(5)
    ->ReportAggregatesOnly(true);

}  // namespace

BENCHMARK_MAIN();
