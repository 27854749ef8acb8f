// Where the framework's own log messages and failed assertions go: to the
// library's message call, like every other diagnostic of the program.
#pragma once

#include <wx/apptrait.h>
#include <wx/log.h>

#include <string>

class MyLogGui : public wxLog {
 protected:
  void DoLogTextAtLevel(wxLogLevel level, const wxString& msg) override;
};

class MyAppTraits : public wxGUIAppTraits {
 public:
  wxLog* CreateLogTarget() override;
  bool ShowAssertDialog(const wxString& msg) override;
};

// The tag and library level for a framework log level.
struct LogRoute {
  const char* tag;
  int level;
};
LogRoute RouteOfLogLevel(wxLogLevel level);
