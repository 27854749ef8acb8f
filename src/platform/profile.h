// Reading of INI files with the semantics of the Windows profile API.
#pragma once

#include <cstddef>

#include "platform/winapi.h"

// GetPrivateProfileStringA (declared in winapi.h) copies the value of [section] key from `file`
// into `buffer` (at most size - 1 characters and a NUL) and returns the number of characters
// copied, without the NUL.  A NULL key lists every key line of the section
// in file order (duplicates included), each NUL-terminated, the list ended
// by an extra NUL, cut to fit; a value lookup takes the first of duplicate
// keys.  A missing file, section or key yields `def`.  A bare file name is
// looked up in /etc/lomari/.

// Parsed files are cached by path and modification time; tests that rewrite
// a file within the same second call this.
void ProfileCacheClear();

// While one lives on a thread, each file that thread reads is checked
// against the disk once: a batch of thousands of lookups (the catalogue's
// start-up) then costs one status call per file instead of one per lookup.
// Outside such a scope every lookup sees the file as it is now.
class ProfileBatch {
 public:
  ProfileBatch();
  ~ProfileBatch();
  ProfileBatch(const ProfileBatch&) = delete;
  ProfileBatch& operator=(const ProfileBatch&) = delete;

 private:
  bool outermost_;
};

// Parses INI text held in memory (used by the fuzz target and its replay).
// Looks the key up as GetPrivateProfileStringA would.
unsigned long ProfileStringFromText(const char* text, std::size_t length, const char* section,
                                    const char* key, const char* def, char* buffer,
                                    unsigned long size);

// Where bare file names are looked up (default /etc/lomari); NULL restores
// the default.  For tests, which cannot write the real one.
void ProfileSetSystemDirectory(const char* dir);
