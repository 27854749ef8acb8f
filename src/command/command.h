// The command: what a start of the program, a forwarded start or the Help
// button asks the running window to show.
#pragma once

#include <string>

// Joins the arguments after the program name into one command (quoting an
// argument that holds a blank).  The result stays valid for the process.
const char* Command_Line(int argc, const wchar_t* const* argv);

// What ProcessCommand needs of the help panel; the panel hands in an adapter.
class CommandPanel {
 public:
  virtual ~CommandPanel() = default;
  virtual bool HasSearchControl() = 0;
  virtual void SetSearchValue(const std::string& text) = 0;  // emits the text event
  virtual bool HasWordList() = 0;
  virtual int FindWord(const char* text, int exact) = 0;  // FindWordInList
  virtual void SelectWord(int row) = 0;
  virtual std::string GetWord(int row) = 0;
  virtual void ShowTopic(const char* word, int openIfSingle) = 0;
  virtual int OpenDocument(const char* path, const char* anchor) = 0;
};

int ProcessCommand(CommandPanel& panel, const char* command, int exact);
