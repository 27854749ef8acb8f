// Window activation on X11.
#include <X11/Xatom.h>
#include <X11/Xlib.h>
#include <X11/Xutil.h>

#include <cstdlib>

#include "platform/winapi.h"

namespace {

// The window registry may name a window of an instance that was killed:
// requests on it fail, and Xlib's default error handler would end the
// process.  Errors are ignored while we talk to the server.
int IgnoreXError(Display*, XErrorEvent*) { return 0; }

// One connection serves every call: a second start raises the window with
// three or four calls in a row, and each new connection costs a round of
// authentication.  It stays open until the process ends.
Display* SharedDisplay() {
  static Display* display = []() -> Display* {
    const char* name = std::getenv("DISPLAY");
    if (name == nullptr || *name == '\0') return nullptr;
    return XOpenDisplay(nullptr);
  }();
  return display;
}

// Our error handler while we talk to the server; the toolkit's own handler
// is put back afterwards.
class XSession {
 public:
  XSession() : display_(SharedDisplay()) {
    if (display_ != nullptr) previous_ = XSetErrorHandler(IgnoreXError);
  }
  ~XSession() {
    if (display_ == nullptr) return;
    XSync(display_, False);
    XSetErrorHandler(previous_);
  }
  XSession(const XSession&) = delete;
  XSession& operator=(const XSession&) = delete;

  Display* display() const { return display_; }

  // True when the window exists on this display.
  bool Exists(Window window) const {
    XWindowAttributes attributes;
    return window != 0 && XGetWindowAttributes(display_, window, &attributes) != 0;
  }

 private:
  Display* display_ = nullptr;
  XErrorHandler previous_ = nullptr;
};

bool HasNetWmState(Display* display, Window window, const char* stateName) {
  const Atom property = XInternAtom(display, "_NET_WM_STATE", False);
  const Atom wanted = XInternAtom(display, stateName, False);
  Atom type = None;
  int format = 0;
  unsigned long count = 0, after = 0;
  unsigned char* data = nullptr;
  bool found = false;
  if (XGetWindowProperty(display, window, property, 0, 64, False, XA_ATOM, &type, &format, &count,
                         &after, &data) == Success &&
      data != nullptr && format == 32) {
    const Atom* atoms = reinterpret_cast<const Atom*>(data);
    for (unsigned long i = 0; i < count; ++i)
      if (atoms[i] == wanted) found = true;
  }
  if (data != nullptr) XFree(data);
  return found;
}

bool HasIconicWmState(Display* display, Window window) {
  const Atom property = XInternAtom(display, "WM_STATE", False);
  Atom type = None;
  int format = 0;
  unsigned long count = 0, after = 0;
  unsigned char* data = nullptr;
  bool iconic = false;
  if (XGetWindowProperty(display, window, property, 0, 2, False, property, &type, &format, &count,
                         &after, &data) == Success &&
      data != nullptr && format == 32 && count >= 1) {
    iconic = reinterpret_cast<const long*>(data)[0] == IconicState;
  }
  if (data != nullptr) XFree(data);
  return iconic;
}

void SendActivation(Display* display, Window window) {
  XEvent event{};
  event.xclient.type = ClientMessage;
  event.xclient.window = window;
  event.xclient.message_type = XInternAtom(display, "_NET_ACTIVE_WINDOW", False);
  event.xclient.format = 32;
  event.xclient.data.l[0] = 2;  // source: a pager-like tool acting for the user
  event.xclient.data.l[1] = CurrentTime;
  event.xclient.data.l[2] = 0;
  const Window root = DefaultRootWindow(display);
  XSendEvent(display, root, False, SubstructureRedirectMask | SubstructureNotifyMask, &event);
}

}  // namespace

BOOL IsIconic(NativeWindow window) {
  XSession x;
  if (x.display() == nullptr || !x.Exists(window)) return false;
  return HasNetWmState(x.display(), window, "_NET_WM_STATE_HIDDEN") ||
         HasIconicWmState(x.display(), window);
}

BOOL OpenIcon(NativeWindow window) {
  XSession x;
  if (x.display() == nullptr || !x.Exists(window)) return 0;
  // Window managers de-iconify on activation; without one, mapping does it.
  SendActivation(x.display(), window);
  XMapRaised(x.display(), window);
  return 1;
}

BOOL BringWindowToTop(NativeWindow window) {
  XSession x;
  if (x.display() == nullptr || !x.Exists(window)) return 0;
  XRaiseWindow(x.display(), window);
  return 1;
}

BOOL SetForegroundWindow(NativeWindow window) {
  XSession x;
  if (x.display() == nullptr || !x.Exists(window)) return 0;
  SendActivation(x.display(), window);
  return 1;
}
