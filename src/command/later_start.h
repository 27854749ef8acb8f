// One running instance per user: the lock that says who it is, and what a
// later start does (raise the instance's window, hand it the command line,
// end), with no toolkit loaded.
#pragma once

#include <memory>

#include "platform/instance_lock.h"

// The name the running instance's window is registered under.
constexpr const char* kInstanceWindowName = "Docuvane";

// The user's instance lock, taken (or found held by another process); what
// went wrong with it is reported when `report` is set.
std::unique_ptr<InstanceLock> TakeInstanceLock(bool report = true);

// Raises the running instance's window, hands it the command line and ends
// the process: 255 when the command was delivered, 1 when not, 2 when the
// command channel is off.
[[noreturn]] void ForwardAndEnd(int argc, const wchar_t* const* argv);

// The same from main's arguments, read as the toolkit would hand them over:
// wide strings in the user's locale (set here), an argument it cannot read
// as "".
[[noreturn]] void ForwardArgumentsAndEnd(int argc, char** argv);
