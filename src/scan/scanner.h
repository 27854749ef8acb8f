// Building the user's word index and catalogue from the documentation of
// the installed TeX trees.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

struct ScanProgress {
  std::size_t done = 0;   // documents read or taken from the cache
  std::size_t total = 0;  // documents to read or take
  int secondsLeft = -1;   // -1 until there is something to go by
};

struct ScanOptions {
  std::vector<std::string> trees;  // TeX trees whose doc/ is read
  std::string userTree;            // where Update/command.Index and Docuvane/ go
  int parallel = 1;
  int timeoutMs = 120000;                          // per document
  std::size_t memoryBytes = 1536u << 20;           // per reading process
  std::size_t largestFile = std::size_t{1} << 30;  // larger documents are not read
  // Called now and then; false cancels the scan (nothing is replaced).
  std::function<bool(const ScanProgress&)> progress;
  // One line per document skipped or problem met; the scan goes on.
  std::function<void(const std::string&)> warn;
};

struct ScanResult {
  bool ok = false;
  std::string error;  // one line, when !ok
  std::size_t documents = 0, read = 0, cached = 0, skipped = 0, words = 0;
  std::size_t indexBytes = 0;
};

// Reads every PDF (each in a process of its own, at most `parallel` at a
// time; results of unchanged files come from the cache in the user's
// tree), lists every PDF and HTML document, and replaces the index and the
// settings file in the user's tree only when both are complete.
ScanResult Scan_Documentation(const ScanOptions& options);

// The file names the scan writes, relative to the user's tree.
extern const char* const kScanIndexFile;  // "Update/command.Index"
extern const char* const kScanIniFile;    // "Docuvane/Docuvane.ini"
extern const char* const kScanCacheFile;  // "Docuvane/scan.cache"
