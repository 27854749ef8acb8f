// Marks stretches in which the program waits on the user or the network
// inside a handler (a message box, a modal dialog, a download).  Anything
// that arrives from outside meanwhile, a forwarded command above all, waits
// until they are over instead of running in the middle of them.
#pragma once

class BusyScope {
 public:
  BusyScope();
  ~BusyScope();
  BusyScope(const BusyScope&) = delete;
  BusyScope& operator=(const BusyScope&) = delete;
};

// True while some BusyScope lives.
bool ProgramBusy();
