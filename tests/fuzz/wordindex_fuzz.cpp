// libFuzzer driver for the word index file.
#include <cstdlib>

#include "wordindex_target.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  return setenv("TROVLIB_STDERR_LEVEL", "1000", 1);  // damaged files trace a lot
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  return FuzzWordIndexInput(data, size);
}
