#include <dlfcn.h>

#include "platform/dynamic_library.h"

DynamicLibrary::~DynamicLibrary() {
  // Never closed: function pointers taken from it may still be in use.
}

bool DynamicLibrary::Open(const std::vector<std::string>& names, std::string* error) {
  std::string reasons;
  for (const std::string& name : names) {
    handle_ = dlopen(name.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle_ != nullptr) return true;
    const char* why = dlerror();
    reasons += (reasons.empty() ? "" : "; ") + std::string(why ? why : name.c_str());
  }
  if (error) *error = reasons;
  return false;
}

void* DynamicLibrary::Symbol(const char* name) const {
  return handle_ != nullptr ? dlsym(handle_, name) : nullptr;
}
