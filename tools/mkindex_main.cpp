// docuvane-mkindex: builds a word index file from a listing, or lists one.
//
//   docuvane-mkindex [--long] LISTING INDEX   ("-" reads the listing from stdin)
//   docuvane-mkindex --dump INDEX
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"

namespace {

int Usage() {
  std::cerr << "usage: docuvane-mkindex [--long] LISTING INDEX\n"
               "       docuvane-mkindex --dump INDEX\n";
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

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> args(argv + 1, argv + argc);
  if (args.size() == 2 && args[0] == "--dump") return Dump(args[1].c_str());
  bool longForm = false;
  if (!args.empty() && args[0] == "--long") {
    longForm = true;
    args.erase(args.begin());
  }
  if (args.size() != 2) return Usage();
  return Make(longForm, args[0].c_str(), args[1].c_str());
}
