// The framework's log target and application traits.
#include "shell/log.h"

#include <string>

#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"

LogRoute RouteOfLogLevel(wxLogLevel level) {
  switch (level) {
    case wxLOG_FatalError:
    case wxLOG_Error:
      return {"WX-ERROR: ", 5};
    case wxLOG_Warning:
      return {"WX-WARNING: ", 4};
    default:
      return {"WX-INFO: ", 3};
  }
}

void MyLogGui::DoLogTextAtLevel(wxLogLevel level, const wxString& msg) {
  const LogRoute route = RouteOfLogLevel(level);
  const std::string prefix = std::string("Docuvane") + "-" + route.tag;
  TrovMessage(prefix.c_str(), FromWx(msg).c_str(), route.level);
}

wxLog* MyAppTraits::CreateLogTarget() { return new MyLogGui; }

bool MyAppTraits::ShowAssertDialog(const wxString& msg) {
  const std::string prefix = std::string("Docuvane") + "-Assert: ";
  TrovMessage(prefix.c_str(), FromWx(msg).c_str(), 260);
  // No dialog, and later assertions are not suppressed.
  return false;
}
