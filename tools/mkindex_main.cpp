// docuvane-mkindex: builds a word index file from a listing, or lists one.
//
//   docuvane-mkindex [--long] LISTING INDEX   ("-" reads the listing from stdin)
//   docuvane-mkindex --dump INDEX
//   docuvane-mkindex --scan [--jobs N] [--progress-lines] [TREE...]
//       builds the user's word index and catalogue from the documentation of
//       the TeX trees (TEXMF's, or those given)
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "platform/worker.h"
#include "scan/scanner.h"
#include "trovlib/trees.h"
#include "trovlib/trovlib.h"
#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"

namespace {

int Usage() {
  std::cerr << "usage: docuvane-mkindex [--long] LISTING INDEX\n"
               "       docuvane-mkindex --dump INDEX\n"
               "       docuvane-mkindex --scan [--jobs N] [--progress-lines] [TREE...]\n";
  return 2;
}

int Dump(const char* path) {
  if (!OpenWordIndex(path)) {
    std::cerr << "docuvane-mkindex: " << path << ": not a readable word index file\n";
    return 1;
  }
  int skipped = 0;
  const bool ok = DumpWordIndex(std::cout, skipped);
  std::cout.flush();
  CloseWordIndex();
  if (skipped > 0)
    std::cerr << "docuvane-mkindex: " << skipped << " location(s) naming no label left out\n";
  if (!ok) {
    std::cerr << "docuvane-mkindex: " << path << ": damaged reference data\n";
    return 1;
  }
  return 0;
}

int Make(bool longForm, const char* listing, const char* indexPath) {
  WordIndexBuilder builder;
  std::string error;
  bool ok;
  if (strcmp(listing, "-") == 0) {
    ok = builder.AddListing(std::cin, error);
  } else {
    std::ifstream in(listing, std::ios::binary);
    if (!in) {
      std::cerr << "docuvane-mkindex: cannot open " << listing << "\n";
      return 1;
    }
    ok = builder.AddListing(in, error);
  }
  if (!ok) {
    std::cerr << "docuvane-mkindex: " << listing << ": " << error << "\n";
    return 1;
  }
  std::vector<uint8_t> bytes;
  if (!builder.Build(longForm ? WordIndexBuilder::Form::Long : WordIndexBuilder::Form::Compact,
                     bytes, error)) {
    std::cerr << "docuvane-mkindex: " << error << "\n";
    return 1;
  }
  std::ofstream out(indexPath, std::ios::binary | std::ios::trunc);
  out.write(reinterpret_cast<const char*>(bytes.data()),
            static_cast<std::streamsize>(bytes.size()));
  out.close();
  if (!out) {
    std::cerr << "docuvane-mkindex: cannot write " << indexPath << "\n";
    return 1;
  }
  return 0;
}

std::string Clock(int seconds) {
  char text[32];
  snprintf(text, sizeof text, "%d:%02d", seconds / 60, seconds % 60);
  return text;
}

// --progress-lines is for the window: "progress DONE TOTAL SECONDS-LEFT"
// lines on standard output instead of a line redrawn on standard error.
int Scan(std::vector<std::string> args) {
  ScanOptions options;
  options.parallel = ProcessorCount();
  bool lines = false;
  std::vector<std::string> trees;
  for (std::size_t i = 0; i < args.size(); ++i) {
    if (args[i] == "--progress-lines") {
      lines = true;
    } else if (args[i] == "--jobs" && i + 1 < args.size()) {
      options.parallel = std::max(1, atoi(args[++i].c_str()));
    } else if (!args[i].empty() && args[i][0] == '-') {
      return Usage();
    } else {
      trees.push_back(args[i]);
    }
  }
  const char* texmf = getenv("TEXMF");
  if (trees.empty()) {
    if ((texmf == nullptr || *texmf == '\0') && InstalledTexTrees().empty()) {
      const char* text =
          "no TeX installation found (no kpsewhich and no TeX tree in the usual places); set "
          "TEXMF or name the trees to scan";
      if (lines) std::cout << "error " << text << std::endl;
      std::cerr << "docuvane-mkindex: " << text << "\n";
      return 1;
    }
    const char* value = TrovVar("TEXMF");
    std::string list = value ? value : "";
    for (std::size_t start = 0; start < list.size();) {
      std::size_t end = list.find(':', start);
      if (end == std::string::npos) end = list.size();
      if (end > start) trees.push_back(list.substr(start, end - start));
      start = end + 1;
    }
  }
  options.trees = trees;
  options.userTree = UserTexTree();
  const bool terminal = StandardErrorIsTerminal();
  bool drawn = false;
  options.progress = [&](const ScanProgress& p) {
    const std::string left = p.secondsLeft < 0 ? "" : ", about " + Clock(p.secondsLeft) + " left";
    if (lines) {
      std::cout << "progress " << p.done << " " << p.total << " " << p.secondsLeft << std::endl;
    } else if (terminal) {
      std::cerr << "\rScanning documents: " << p.done << " of " << p.total << left << "\033[K"
                << std::flush;
      drawn = true;
    }
    return true;
  };
  options.warn = [&](const std::string& text) {
    if (drawn) std::cerr << "\r\033[K";
    std::cerr << "docuvane-mkindex: warning: " << text << "\n";
  };
  const ScanResult result = Scan_Documentation(options);
  if (drawn) std::cerr << "\r\033[K";
  if (!result.ok) {
    if (lines) std::cout << "error " << result.error << std::endl;
    std::cerr << "docuvane-mkindex: " << result.error << "\n";
    return 1;
  }
  std::cerr << "docuvane-mkindex: " << result.documents << " documents (" << result.read
            << " read, " << result.cached << " unchanged, " << result.skipped << " skipped), "
            << result.words << " words, index " << result.indexBytes << " bytes in "
            << options.userTree << "\n";
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> args(argv + 1, argv + argc);
  if (args.size() == 2 && args[0] == "--dump") return Dump(args[1].c_str());
  if (!args.empty() && args[0] == "--scan")
    return Scan(std::vector<std::string>(args.begin() + 1, args.end()));
  bool longForm = false;
  if (!args.empty() && args[0] == "--long") {
    longForm = true;
    args.erase(args.begin());
  }
  if (args.size() != 2) return Usage();
  return Make(longForm, args[0].c_str(), args[1].c_str());
}
