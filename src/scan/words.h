// What counts as a word of the index in a document's text: TeX commands
// (\section, and the \cs_new:Npn / \l_tmpa_tl kind), environments
// ("{align}" for \begin{align}), and the heads of printed index entries.
#pragma once

#include <string>
#include <vector>

// The words of `text` in order, one per occurrence: every command, and
// "{name}" for every \begin{name}.  Text is UTF-8; the backslash may also
// come as the "set minus" sign some fonts map it to.
// With `described`, one flag per word: true where the word is shown with
// its arguments as meta-variables ("\\scalebox{⟨h-scale⟩}"), as manuals
// show what they explain.
std::vector<std::string> WordsOfText(const std::string& text,
                                     std::vector<bool>* described = nullptr);

// The word that a printed index line stands for, from the text before its
// first page number: "\section . . ." gives "\section", "align
// (environment)" and "{align}" give "{align}", "geometry (package)" gives
// "geometry".  "" when the line does not look like an index entry (running
// text, a plain sub-entry).
std::string IndexEntryHead(const std::string& lineStart);

// True when `text` holds nothing but what stands between page numbers of an
// index entry: blanks, leader dots, commas, dashes and digits.
bool IsPageListFiller(const std::string& text);

// False for words the index format cannot hold or no user would type.
bool IsUsableWord(const std::string& word);
