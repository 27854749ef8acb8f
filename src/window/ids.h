// Identifiers of the controls and commands of the main window.  The
// framework's wxID_HELP, wxID_ABOUT, wxID_EXIT and wxID_CLOSE complete them.
#pragma once

enum {
  ID_SPLITTER = 6000,     // the help panel itself
  ID_TREE = 6001,         // the document tree
  ID_OPEN_DOC = 6003,     // no window: opens the tree's selected document
  ID_SEARCH = 6004,       // the search control
  ID_WORD_LIST = 6005,    // the word list
  ID_TARGET_LIST = 6006,  // the Locations list
  ID_GOTO = 6007,         // the "&Go To" button
  ID_INTERNET = 6008,     // the "&Internet" button
};
