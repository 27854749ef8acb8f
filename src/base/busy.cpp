// Busy stretches of the GUI thread.
#include "base/busy.h"

namespace {
int g_depth = 0;  // only the GUI thread opens scopes
}  // namespace

BusyScope::BusyScope() { ++g_depth; }
BusyScope::~BusyScope() { --g_depth; }

bool ProgramBusy() { return g_depth > 0; }
