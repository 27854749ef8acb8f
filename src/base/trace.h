// The program's own free-form trace.
#pragma once

// Joins text and argument (argument may be NULL) within 511 characters,
// picks the level from the words of the message and hands it to the
// library with the prefix "Docuvane: ".
void TraceMessage(const char* text, const char* argument = nullptr);

// The level TraceMessage picks for a joined message.
int TraceLevelOf(const char* message);
