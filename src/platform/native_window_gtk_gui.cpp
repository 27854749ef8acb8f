// The native handle of a toolkit window on GTK: its X11 window id.
#include <dlfcn.h>
#include <wx/window.h>

#include <string>

#include "platform/native_window_gui.h"

// The X11 id of a realised top-level window.  GTK is reached through the
// symbols the framework has already loaded, so that the program needs no
// GTK headers of its own; 0 when the window lives on another backend.
NativeWindow NativeWindowOf(wxWindow* window) {
  using Realize = void (*)(void*);
  using GetWindow = void* (*)(void*);
  using TypeName = const char* (*)(void*);
  using GetXid = unsigned long (*)(void*);
  static const auto realize = reinterpret_cast<Realize>(dlsym(RTLD_DEFAULT, "gtk_widget_realize"));
  static const auto getWindow =
      reinterpret_cast<GetWindow>(dlsym(RTLD_DEFAULT, "gtk_widget_get_window"));
  static const auto typeName =
      reinterpret_cast<TypeName>(dlsym(RTLD_DEFAULT, "g_type_name_from_instance"));
  static const auto getXid =
      reinterpret_cast<GetXid>(dlsym(RTLD_DEFAULT, "gdk_x11_window_get_xid"));
  void* widget = window != nullptr ? static_cast<void*>(window->GetHandle()) : nullptr;
  if (widget == nullptr || realize == nullptr || getWindow == nullptr || getXid == nullptr ||
      typeName == nullptr)
    return 0;
  realize(widget);
  void* gdkWindow = getWindow(widget);
  if (gdkWindow == nullptr) return 0;
  const char* type = typeName(gdkWindow);
  if (type == nullptr || std::string(type).find("X11") == std::string::npos) return 0;
  return getXid(gdkWindow);
}
