// The native handle of one of the program's own windows.
#pragma once

#include "platform/winapi.h"

class wxWindow;

// The handle other processes use to raise `window`; 0 when it has none.
NativeWindow NativeWindowOf(wxWindow* window);
