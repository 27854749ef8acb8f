// libFuzzer driver for the word index file.
#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "wordindex_target.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  // Damaged files are the point here; their traces would only slow the run.
  setenv("TROVLIB_STDERR_LEVEL", "1000", 1);
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  return FuzzWordIndexInput(data, size);
}
