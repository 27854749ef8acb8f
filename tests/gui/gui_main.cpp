// Entry point of the GUI tests: the toolkit is initialised once, only its
// errors are logged, and a failed assertion of the toolkit fails the test.
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
  // Never on the desktop's display: started by hand, the program starts again
  // under run-with-display.sh, which gives it a display of its own.
  if (!std::getenv("DOCUVANE_PRIVATE_DISPLAY")) {
    std::string wrapper = __FILE__;
    wrapper.replace(wrapper.rfind("/gui/"), std::string::npos, "/run-with-display.sh");
    std::vector<char*> args{const_cast<char*>("/bin/sh"), wrapper.data()};
    args.insert(args.end(), argv, argv + argc + 1);
    execv("/bin/sh", args.data());
    std::perror("gui_tests: cannot start run-with-display.sh");
    return 1;
  }
  testing::InitGoogleTest(&argc, argv);
  if (!wxEntryStart(argc, argv)) {
    std::fprintf(stderr, "gui_tests: cannot initialise the toolkit (no display?)\n");
    return 1;
  }
  wxTheApp->SetAppName("Docuvane");
  wxTheApp->SetVendorName("Lomari");
  delete wxLog::SetActiveTarget(new wxLogStderr);
  wxLog::SetLogLevel(wxLOG_Error);
  wxSetAssertHandler([](const wxString& file, int line, const wxString& func, const wxString& cond,
                        const wxString& msg) {
    ADD_FAILURE_AT(static_cast<const char*>(file.utf8_str()), line)
        << "wx assertion in " << func.utf8_str() << ": " << cond.utf8_str() << " "
        << msg.utf8_str();
  });
  wxInitAllImageHandlers();
  const int result = RUN_ALL_TESTS();
  // Leave without the toolkit's teardown: the tests have nothing left to
  // save, and a teardown stuck on the display server would keep the test
  // runner waiting long after every test passed.
  std::fflush(stdout);
  std::fflush(stderr);
  _exit(result);
}
