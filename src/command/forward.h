// A later start's end of the command channel: hands the command line to the
// running instance in the framework's conversation (connect with the topic,
// execute the command as UTF-8 text, end) and needs no toolkit for it.
#pragma once

#include <string>

// Sends `command` (8-bit, as Command_Line made it) over the channel at
// `socketPath`.  1 when a conversation was made (whatever the execute gave),
// 0 when no server answered.  `delivered`, when given, tells whether the
// instance took the command.
int ForwardCommand(const char* command, const std::string& socketPath, bool* delivered = nullptr);
