// Restoring and raising another process's top-level window, given its X11
// window id, through the window manager's conventions (EWMH).  Without an
// X11 display, or for a window that no longer exists, each call does
// nothing (and IsIconic says false).
#pragma once

bool IsIconic(unsigned long window);
void OpenIcon(unsigned long window);
void BringWindowToTop(unsigned long window);
void SetForegroundWindow(unsigned long window);
