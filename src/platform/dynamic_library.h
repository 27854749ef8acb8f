// A shared library opened the first time it is needed: the HTTP and PDF
// stacks bring dozens of libraries with them that most runs never use, and
// loading them with the program would cost every start.
#pragma once

#include <string>
#include <vector>

class DynamicLibrary {
 public:
  DynamicLibrary() = default;
  ~DynamicLibrary();
  DynamicLibrary(const DynamicLibrary&) = delete;
  DynamicLibrary& operator=(const DynamicLibrary&) = delete;

  // Opens the first of `names` that loads; false with the reason otherwise.
  bool Open(const std::vector<std::string>& names, std::string* error);
  // The address of `name`, or nullptr.
  void* Symbol(const char* name) const;
  // Sets `function` to `name`; when it is missing, adds the name to
  // `missing` (", " between names).
  template <typename F>
  void Take(const char* name, F& function, std::string& missing) const {
    function = reinterpret_cast<F>(Symbol(name));
    if (function == nullptr) missing += (missing.empty() ? "" : ", ") + std::string(name);
  }

 private:
  void* handle_ = nullptr;
};
