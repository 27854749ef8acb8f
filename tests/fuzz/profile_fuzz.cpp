// libFuzzer driver for the INI text parser.
#include "profile_target.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  return FuzzProfileInput(data, size);
}
