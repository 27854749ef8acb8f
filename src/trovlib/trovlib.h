// The TeX system's path-search and message library, as the program sees it.
//
// Strings are 8-bit and NUL-terminated.  A string result belongs to the
// library and stays valid until the same thread's next search call
// (TrovSearch, TrovFind, TrovVar, TrovINIFile); a TrovMessage call in
// between leaves it intact.
// Callers copy what they keep and never free it.
#pragma once

#include <functional>
#include <string>
#include <vector>

// The search category of installed documents, ".ddf" files and the word index.
constexpr const char* kDocumentationCategory = "TeX system documentation";

// Full path of `name` found through `spec` (a category name or a path
// pattern), or NULL.
const char* TrovSearch(const char* spec, const char* name);

// "?<...>" names a directory: its variables expanded, with a trailing
// separator.  Never NULL.
const char* TrovFind(const char* pattern);

// Value of a library variable (environment first, then built-in defaults),
// or NULL.
const char* TrovVar(const char* name);

// Path of one of the TeX system's INI files; kind 1 is the system's own.
const char* TrovINIFile(int kind);

// Per-user registry of top-level windows by name (native handle: the X11
// window id).  TrovLookupWindow gives 0 when nothing is registered.
void TrovPublishWindow(const char* name, unsigned long handle);
unsigned long TrovLookupWindow(const char* name);

// One diagnostic line: prefix then text, at the given level.
void TrovMessage(const char* prefix, const char* text, int level);

// --- Not part of the library's call contract: seams for tests and tools. ---

// Receives every message in-process (besides stderr and TROVLIB_LOG).
// Pass an empty function to remove it.
using TrovMessageSink = std::function<void(const char* prefix, const char* text, int level)>;
void TrovSetMessageSink(TrovMessageSink sink);

// Messages of the calling thread are kept in `held`, in their order, while
// it is set (nullptr: written again); TrovReplayMessages writes them as if
// they were given now.  Work done ahead on a thread of its own thus reports
// where it would have reported had it been done in its place.
struct TrovHeldMessage {
  std::string prefix, text;
  int level;
};
void TrovHoldMessages(std::vector<TrovHeldMessage>* held);
void TrovReplayMessages(const std::vector<TrovHeldMessage>& held);

// Forgets every cached file-name index and variable lookup, so that a test
// can change the environment or the trees and search again.
void TrovResetCaches();
