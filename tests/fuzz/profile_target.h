// Fuzz target for the INI text parser: every way the program reads a value
// or a key list, with buffers from empty to roomy.  Shared by the libFuzzer
// driver and the corpus replay in the unit tests.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include "platform/profile.h"

inline int FuzzProfileInput(const uint8_t* data, size_t size) {
  const char* text = reinterpret_cast<const char*>(data);
  // Names the seeds use (in other cases), an empty one, and NULL for the
  // name lists; sizes around the edges of every cut.
  static const char* const kSections[] = {"setup", "DOC", "", nullptr};
  static const char* const kKeys[] = {"TRACE", "root", "a", nullptr};
  static const unsigned long kSizes[] = {0, 1, 2, 3, 9, 300};

  for (const char* section : kSections) {
    for (const char* key : kKeys) {
      for (unsigned long buffer_size : kSizes) {
        // One guard byte past the end catches any write beyond the size given.
        std::vector<char> buffer(buffer_size + 1, '\x5a');
        unsigned long n = ProfileStringFromText(text, size, section, key, "dflt", buffer.data(),
                                                buffer_size);
        if (buffer[buffer_size] != '\x5a') __builtin_trap();
        if (buffer_size == 0) {
          if (n != 0) __builtin_trap();
          continue;
        }
        if (n >= buffer_size) __builtin_trap();
        if (key != nullptr && section != nullptr) {
          // A value: NUL-terminated at the count returned.
          if (buffer[n] != '\0' || std::strlen(buffer.data()) != n) __builtin_trap();
        } else {
          // A list: names read one after another must reach the empty one
          // inside the buffer, as every caller walks it.
          if (buffer[n] != '\0') __builtin_trap();
          size_t at = 0;
          while (at < buffer_size && buffer[at] != '\0') {
            const void* end = std::memchr(buffer.data() + at, '\0', buffer_size - at);
            if (end == nullptr) __builtin_trap();
            at = static_cast<size_t>(static_cast<const char*>(end) - buffer.data()) + 1;
          }
          if (at >= buffer_size) __builtin_trap();
        }
      }
    }
  }
  return 0;
}
