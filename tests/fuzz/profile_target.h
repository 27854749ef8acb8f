// Fuzz target for the INI text parser, shared by the libFuzzer driver and the
// corpus replay.  The first and last bytes choose the section, the key and the
// buffer size; each run asks for a value, the section's keys and the sections.
#pragma once

#include <cstdint>
#include <cstring>
#include <vector>

#include "platform/profile.h"

inline void FuzzProfileLookup(const char* text, size_t length, const char* section, const char* key,
                              unsigned long size) {
  std::vector<char> buffer(size + 1, '\x5a');  // a guard byte past the size given
  unsigned long n = ProfileStringFromText(text, length, section, key, "dflt", buffer.data(), size);
  if (buffer[size] != '\x5a' || (size == 0 && n != 0)) __builtin_trap();
  if (size == 0) return;
  if (n >= size || buffer[n] != '\0') __builtin_trap();
  const bool list = key == nullptr || section == nullptr;
  if (!list && std::strlen(buffer.data()) != n) __builtin_trap();
  size_t at = 0;  // a list's names end in an empty one inside the buffer
  while (list && at < size && buffer[at] != '\0') {
    const void* end = std::memchr(buffer.data() + at, '\0', size - at);
    if (end == nullptr) __builtin_trap();
    at = static_cast<size_t>(static_cast<const char*>(end) - buffer.data()) + 1;
  }
  if (list && at >= size) __builtin_trap();
}

inline int FuzzProfileInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  static const char* const kSections[] = {"setup", "DOC", "", "a"};
  static const char* const kKeys[] = {"TRACE", "root", "a", ""};
  const char* text = reinterpret_cast<const char*>(data);
  const char* section = kSections[data[0] & 3];
  unsigned long buffer_size = (data[size - 1] & 0x20) ? 300 : data[size - 1] & 0x1f;
  FuzzProfileLookup(text, size, section, kKeys[(data[0] >> 2) & 3], buffer_size);
  FuzzProfileLookup(text, size, section, nullptr, buffer_size);
  FuzzProfileLookup(text, size, nullptr, nullptr, buffer_size);
  return 0;
}
