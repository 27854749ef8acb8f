// The operating-system interfaces the program calls, under their Windows
// names and signatures.  A Windows build takes the real ones from
// <windows.h>; this Linux build has its own under the same names
// (profile.cpp, findexec_posix.cpp, clock_posix.cpp, process_posix.cpp,
// window_activation_x11.cpp, system_metrics_gui.cpp).
#pragma once

#ifdef _WIN32
#include <windows.h>
// shellapi.h makes FindExecutable a macro; the program names the A form.
#include <shellapi.h>
using NativeWindow = HWND;
#else
#include <cstdint>

using DWORD = std::uint32_t;
using BOOL = int;
using UINT_PTR = std::uintptr_t;
// An X11 window id; 0 is "no window".
using NativeWindow = unsigned long;

// The Windows profile API on INI files (see profile.h for the rules).
DWORD GetPrivateProfileStringA(const char* section, const char* key, const char* def, char* buffer,
                               DWORD size, const char* file);

// The program associated with `file`'s type, copied into `result` (at
// least 260 bytes).  Greater than 32 on success, as on Windows.
UINT_PTR FindExecutableA(const char* file, const char* directory, char* result);

// A monotonic millisecond clock (wraps after 49 days, as on Windows).
DWORD GetTickCount();

// Another process's top-level window: restore, raise, activate.
BOOL IsIconic(NativeWindow window);
BOOL OpenIcon(NativeWindow window);
BOOL BringWindowToTop(NativeWindow window);
BOOL SetForegroundWindow(NativeWindow window);

// The process environment, inherited by every program started later.
BOOL SetEnvironmentVariableA(const char* name, const char* value);

// Ends the process at once: no destructors, no toolkit teardown.
[[noreturn]] void ExitProcess(unsigned int status);

// The bounding box of all monitors.
constexpr int SM_CXVIRTUALSCREEN = 78;
constexpr int SM_CYVIRTUALSCREEN = 79;
int GetSystemMetrics(int index);
#endif
