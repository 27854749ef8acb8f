// Opening templates of the [Extensions] section: their expansion by the Root
// setting and the viewer command they describe.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <utility>
#include <vector>

constexpr std::size_t kTemplateCapacity = 64;      // 63 characters and the NUL
constexpr std::size_t kCommandLineCapacity = 256;  // 255 characters and the NUL
constexpr std::size_t kProgramNameCapacity = 32;   // 31 characters and the NUL

// Replaces the first and the second "%s" by `root` and "%%" by "%".  Every
// other character, a third "%s" and any other conversion included, is copied
// as it stands: the template is never used as a format.
std::string ExpandTemplateRoot(const std::string& tmpl, const std::string& root);

// A viewer command built from an expanded template.
struct TemplateCommand {
  // The command line as the "Run: " trace shows it: every inserted text and
  // every copied character joined, blanks and double quotes included.
  std::string commandLine;
  // What is started.  The template's own blanks separate arguments and its
  // own double quotes group them; text inserted for "^", "#" or a program
  // name always stays inside the argument being built, whatever it holds.
  std::vector<std::string> argv;
};

// Full path of a program named in a template, or "" when not found.
using ProgramLookup = std::function<std::string(const std::string& name)>;

// Trace lines kept for later, in order: text and argument of TraceMessage.
using TraceNotes = std::vector<std::pair<std::string, std::string>>;

// Reads `expansion` by the template grammar.  `document` is the full path of
// the document; `anchor` is null when there is none.  With `notes`, every
// step is noted as "INFO: templ-sp: " (rest of the template) and
// "INFO: templ-dp: " (command line so far).
TemplateCommand BuildTemplateCommand(const std::string& expansion, const std::string& document,
                                     const char* anchor, const ProgramLookup& findProgram,
                                     TraceNotes* notes);
