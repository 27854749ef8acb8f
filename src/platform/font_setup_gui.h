// The system's font configuration, read ahead: the window's first text
// waits for it, and reading it takes a few milliseconds that can pass
// while the toolkit starts.
#pragma once

#include <thread>

class FontConfigurationPreload {
 public:
  // Starts reading the font configuration on a thread of its own.
  FontConfigurationPreload();
  // Waits for that thread.
  ~FontConfigurationPreload();

  FontConfigurationPreload(const FontConfigurationPreload&) = delete;
  FontConfigurationPreload& operator=(const FontConfigurationPreload&) = delete;

 private:
  std::thread thread_;
};
