// The GUI tests' fixture: a TeX tree, an isolated environment, the real
// frame, and bounded waits for the event loop.
#pragma once

#include <gtest/gtest.h>
#include <wx/config.h>
#include <wx/utils.h>

#include <chrono>
#include <functional>
#include <list>
#include <thread>

#include "base/settings.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "catalogue/tables.h"
#include "platform/profile.h"
#include "test_support.h"  // also filesystem, fstream, optional, string, vector
#include "window/frame.h"
#include "window/panel.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

namespace gui_testing {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;
using Args = std::vector<std::string>;

// Runs the event loop until `done` holds or `ms` have passed.
inline bool WaitFor(const std::function<bool()>& done, int ms = 5000) {
  for (int i = 0; i < ms / 5;
       ++i, wxYield(), std::this_thread::sleep_for(std::chrono::milliseconds(5)))
    if (done()) return true;
  return false;
}

inline void Flush() {
  for (int i = 0; i < 5; ++i) wxYield();
}

// Documents Manuals>LaTeX>Guide (keyword \section, two anchors),
// Manuals>LaTeX>Reference, Manuals>Fonts>Catalogue, Help>Docuvane; index
// labels latex/base/sample.pdf, fonts/fontguide.pdf, math/amsldoc.pdf.  PDFs
// open through a template; the viewer and xdg-open record their arguments.
class WindowTest : public ::testing::Test {
 protected:
  TempDir root;
  const std::string texmf = root / "texmf", home = root / "home", records = root / "records";
  std::list<ScopedEnv> env;
  MyFrame* frame = nullptr;

  void SetUp() override {
    // clang-format off
    const std::pair<const char*, std::optional<std::string>> vars[] = {
        {"HOME", home}, {"TEXMF", texmf}, {"TEXDIR", std::nullopt}, {"TROVLIB_LOG", std::nullopt},
        {"XDG_RUNTIME_DIR", root / "run"}, {"XDG_CACHE_HOME", root / "cache"},
        {"XDG_CONFIG_HOME", home + "/.config"}, {"XDG_DATA_HOME", root / "data"},
        {"XDG_DATA_DIRS", root / "data:/usr/local/share:/usr/share"},
        {"PATH", root / "bin:/usr/bin:/bin"}, {"TROVLIB_ICON_THEMES", ""},
        {"DOCSERVER", "http://127.0.0.1:9/docs"}};
    for (const auto& [name, value] : vars) env.emplace_back(name, value);
    for (const char* doc : {"latex/guide/guide.pdf", "latex/reference.pdf", "fonts/fontcat.pdf",
                            "docuvane/docuvane-help.pdf", "latex/base/sample.pdf",
                            "fonts/fontguide.pdf", "math/amsldoc.pdf"})
      root.Write(std::string("texmf/doc/") + doc, "%PDF-1.4\n%%EOF\n");
    root.Write("texmf/Docuvane/Docuvane.ini", "[Setup]\nTrace=0\n[DOC]\n"
               "Manuals>LaTeX>Guide=guide.pdf\nManuals>LaTeX>Reference=reference.pdf\n"
               "Manuals>Fonts>Catalogue=fontcat.pdf\nHelp>Docuvane=docuvane-help.pdf\n"
               "[Extensions]\npdf=<docuvane-test-viewer> ^.pdf #\n");
    root.Write("texmf/doc/latex/guide/guide.ddf", "[Keywords]\n\\section=sec:section#sec:headings");
    root.Write("texmf/doc/docuvane/docuvane-help.ddf", "[Keywords]\n.LMR.Help=help-start\n");
    const std::string listing = root.Write("listing.txt",
        "\\section\tlatex/base/sample.pdf\t12 15\n" "\\section\tfonts/fontguide.pdf\t3\n"
        "\\sectionmark\tlatex/base/sample.pdf\t20\n" "{align}\tmath/amsldoc.pdf\t7\n"
        "\\alpha\tmath/amsldoc.pdf\t2\n" "\\@ifnextchar\tlatex/base/sample.pdf\t4\n"
        "\\begin\tlatex/base/sample.pdf\t1\n" "tabular\tlatex/base/sample.pdf\t9\n");
    std::filesystem::create_directories(texmf + "/Update");
    ASSERT_EQ(std::system((DOCUVANE_MKINDEX " '" + listing + "' '" + texmf +
                           "/Update/command.Index'").c_str()), 0);
    for (const std::string name : {"docuvane-test-viewer", "xdg-open"})
      std::filesystem::permissions(root.Write("bin/" + name,
          "#!/bin/sh\nf='" + root.path() + "/" + name + "-'$$\nprintf '%s\\n' " + name +
          " \"$@\" > \"$f\"\nmv \"$f\" '" + records + "'\n"), std::filesystem::perms::owner_all);
    // clang-format on
    std::filesystem::create_directories(home), std::filesystem::create_directories(records);
    ResetProgramState(), ReopenConfig();
  }
  void TearDown() override { CloseFrame(), ReopenConfig(), ResetProgramState(); }
  // Empties the process-wide tables an earlier frame filled; the configuration is read afresh.
  static void ResetProgramState() {
    Clear_Tables();
    ProfileCacheClear();
  }

  static void ReopenConfig() { delete wxConfigBase::Set(nullptr); }
  void OpenFrame() {  // as start-up does
    Docuvane_Init(OpenInstalledWordIndex);
    frame = new MyFrame("Lomari Docuvane");
    frame->Show();
    WaitFor([this] { return frame->IsShownOnScreen(); });
    Flush();
  }
  void CloseFrame() { delete frame, frame = nullptr, Flush(); }
  void ReopenFrame() { TearDown(), OpenFrame(); }
  Docuvane* panel() const { return frame->m_helpPanel; }
};

}  // namespace gui_testing
