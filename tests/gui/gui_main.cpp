// Entry point of the GUI tests: the toolkit is initialised once, its log is
// kept quiet, and a failed assertion of the toolkit fails the running test.
#include <gtest/gtest.h>
#include <wx/app.h>
#include <wx/image.h>
#include <wx/init.h>
#include <wx/log.h>

#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

class GuiTestApp : public wxApp {
 public:
  bool OnInit() override { return true; }
};

// Collects the toolkit's log instead of showing it; errors are echoed so a
// failing test says why.
class QuietLog : public wxLog {
 protected:
  void DoLogTextAtLevel(wxLogLevel level, const wxString& msg) override {
    if (level <= wxLOG_Error) std::fprintf(stderr, "wx log: %s\n", static_cast<const char*>(msg.utf8_str()));
  }
};

void FailOnAssert(const wxString& file, int line, const wxString& func, const wxString& cond,
                  const wxString& msg) {
  ADD_FAILURE_AT(static_cast<const char*>(file.utf8_str()), line)
      << "wx assertion in " << func.utf8_str() << ": " << cond.utf8_str() << " " << msg.utf8_str();
}

// Every test process gets a display of its own, so that tests can run side by
// side without sharing the pointer or the keyboard focus.  When nothing
// started us on one (ctest of this CMake version registers the tests without
// their display wrapper), start again under the wrapper.
void EnsurePrivateDisplay(char** argv) {
  if (std::getenv("DOCUVANE_PRIVATE_DISPLAY")) return;
  setenv("DOCUVANE_PRIVATE_DISPLAY", "1", 1);
  std::string wrapper = __FILE__;
  wrapper = wrapper.substr(0, wrapper.rfind('/'));
  wrapper = wrapper.substr(0, wrapper.rfind('/')) + "/run-with-display.sh";
  std::vector<char*> args{const_cast<char*>("/bin/sh"), wrapper.data()};
  for (char** a = argv; *a; ++a) args.push_back(*a);
  args.push_back(nullptr);
  execv("/bin/sh", args.data());
  std::perror("gui_tests: cannot start run-with-display.sh");
}

}  // namespace

wxIMPLEMENT_APP_NO_MAIN(GuiTestApp);

int main(int argc, char** argv) {
  std::vector<char*> original(argv, argv + argc);  // InitGoogleTest takes its flags out
  original.push_back(nullptr);
  testing::InitGoogleTest(&argc, argv);
  // Listing the tests (as the build does to register them) needs no display.
  if (GTEST_FLAG_GET(list_tests)) return RUN_ALL_TESTS();
  EnsurePrivateDisplay(original.data());
  if (!wxEntryStart(argc, argv)) {
    std::fprintf(stderr, "gui_tests: cannot initialise the toolkit (no display?)\n");
    return 1;
  }
  wxTheApp->SetAppName("Docuvane");
  wxTheApp->SetVendorName("Lomari");
  wxTheApp->CallOnInit();
  delete wxLog::SetActiveTarget(new QuietLog);
  wxSetAssertHandler(FailOnAssert);
  wxInitAllImageHandlers();
  const int result = RUN_ALL_TESTS();
  wxTheApp->OnExit();
  wxEntryCleanup();
  return result;
}
