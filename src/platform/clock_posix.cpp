// GetTickCount: a monotonic millisecond clock.
#include <ctime>

#include "platform/winapi.h"

DWORD GetTickCount() {
  timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<DWORD>(static_cast<unsigned long long>(now.tv_sec) * 1000ULL +
                            static_cast<unsigned long long>(now.tv_nsec / 1000000));
}
