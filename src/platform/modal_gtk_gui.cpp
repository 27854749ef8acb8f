// Modal windows on GTK.  GTK is reached through the symbols the framework
// has already loaded, so that the program needs no GTK headers of its own.
#include <dlfcn.h>

#include "platform/modal_gui.h"

namespace {

struct GList {
  void* data;
  GList* next;
  GList* prev;
};

template <typename F>
F Symbol(const char* name) {
  return reinterpret_cast<F>(dlsym(RTLD_DEFAULT, name));
}

}  // namespace

bool ToolkitModalWindowShown() {
  static const auto listToplevels = Symbol<GList* (*)()>("gtk_window_list_toplevels");
  static const auto isModal = Symbol<int (*)(void*)>("gtk_window_get_modal");
  static const auto isVisible = Symbol<int (*)(void*)>("gtk_widget_get_visible");
  static const auto freeList = Symbol<void (*)(GList*)>("g_list_free");
  if (listToplevels == nullptr || isModal == nullptr || isVisible == nullptr || freeList == nullptr)
    return false;
  GList* windows = listToplevels();
  bool shown = false;
  for (GList* w = windows; w != nullptr && !shown; w = w->next)
    shown = isModal(w->data) && isVisible(w->data);
  freeList(windows);
  return shown;
}
