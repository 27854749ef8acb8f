// Which viewer shows a document, and with what command: a table of rules
// tried in order, the first that takes the document wins.  The choice is a
// pure function: what the desktop knows comes in as lookups, and what it
// would trace goes out as notes for the caller to trace.
//
// A rule for another kind of viewer is one more row: a PDF launcher that
// opens at a page, for instance, goes before the template row, reads the
// page from the anchor and finds its program through `findProgram`.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "access/template.h"

constexpr std::size_t kReaderPathCapacity = 260;  // 259 characters and the NUL

// What a viewer is chosen from.
struct ViewerFacts {
  std::string document;               // the full local path
  std::string extension;              // behind the name's last ".", at most 31 characters
  std::optional<std::string> anchor;  // may be present and empty
  std::string openingTemplate;        // the [Extensions] value, "" for none
  std::string root;                   // the Root setting, for "%s" in templates
  bool traceTemplates = false;        // note every template step (TraceMode)
  // The program the desktop associates with the document, "" for none;
  // asked only by the rules that need it.
  std::function<std::string()> findReader;
  ProgramLookup findProgram;  // a program named in a template
};

enum class ViewerRoute {
  kRun,                 // start `command`
  kDefaultApplication,  // hand the document to the desktop
  kRefused,             // open nothing (the notes say why)
};

struct ViewerChoice {
  ViewerRoute route = ViewerRoute::kDefaultApplication;
  TemplateCommand command;
  TraceNotes notes;
};

// One row of the table.  `decide` takes the document (true, `choice`
// filled) or passes it on to the next row (false); either way it may add
// notes.
struct ViewerRule {
  const char* name;
  bool (*decide)(const ViewerFacts& facts, ViewerChoice& choice);
};

// The rows in force: an Acrobat-family reader given the destination through
// its /A option, the opening template, the desktop's default application.
const std::vector<ViewerRule>& ViewerRules();

// The first row that takes the document decides; when none does, the
// default application.
ViewerChoice ChooseViewer(const ViewerFacts& facts,
                          const std::vector<ViewerRule>& rules = ViewerRules());
