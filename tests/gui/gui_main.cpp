// Entry point of the GUI tests: the toolkit once, only its errors logged, its assertions failures.
#include <gtest/gtest.h>
#include <unistd.h>
#include <wx/app.h>
#include <wx/image.h>
#include <wx/init.h>
#include <wx/log.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

wxIMPLEMENT_APP_NO_MAIN(wxApp);

int main(int argc, char** argv) {
  if (!std::getenv("DOCUVANE_PRIVATE_DISPLAY")) {  // started by hand: never the desktop's display
    std::string wrapper = __FILE__;
    wrapper.replace(wrapper.rfind("/gui/"), std::string::npos, "/run-with-display.sh");
    std::vector<char*> args{const_cast<char*>("/bin/sh"), wrapper.data()};
    args.insert(args.end(), argv, argv + argc + 1);
    execv("/bin/sh", args.data());
    return 1;
  }
  testing::InitGoogleTest(&argc, argv);
  if (!wxEntryStart(argc, argv)) return 1;
  wxTheApp->SetAppName("Docuvane"), wxTheApp->SetVendorName("Lomari");
  delete wxLog::SetActiveTarget(new wxLogStderr);
  wxLog::SetLogLevel(wxLOG_Error);
  wxSetAssertHandler([](const wxString& file, int line, const wxString&, const wxString& cond,
                        const wxString& msg) {
    ADD_FAILURE_AT(file.utf8_str(), line) << "wx assertion " << cond << ": " << msg;
  });
  wxInitAllImageHandlers();
  const int result = RUN_ALL_TESTS();
  std::fflush(nullptr);  // no toolkit teardown: one stuck on the display server would hang ctest
  _exit(result);
}
