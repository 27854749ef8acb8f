// The process environment and the immediate end of the process.
#include <unistd.h>

#include <cstdlib>

#include "platform/winapi.h"

BOOL SetEnvironmentVariableA(const char* name, const char* value) {
  if (name == nullptr) return 0;
  return (value == nullptr ? unsetenv(name) : setenv(name, value, 1)) == 0;
}

void ExitProcess(unsigned int status) { _exit(static_cast<int>(status)); }
