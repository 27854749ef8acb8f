// Where the command channel is found: the names both of its ends use.
#pragma once

#include <string>

// The service name that messages carry.
extern const char* const kCommandService;  // "Lomari.DDE.Docuvane"
extern const char* const kCommandTopic;    // "CommandLine"

// "<runtime directory>/Lomari.DDE.Docuvane", or empty (with an "ERROR: "
// message) when the runtime directory is refused: the channel is off.
std::string CommandSocketPath();
