// Shared pieces of the GUI tests: a TeX tree built in a temporary directory
// with the project's tools, an isolated environment, and bounded waits for
// what the event loop delivers.
#pragma once

#include <gtest/gtest.h>
#include <wx/app.h>
#include <wx/config.h>
#include <wx/uiaction.h>
#include <wx/utils.h>
#include <wx/window.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "platform/profile.h"
#include "shell/settings.h"
#include "test_support.h"
#include "window/frame.h"
#include "window/panel.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

namespace gui_testing {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

// Runs the event loop until `done` holds or `ms` milliseconds have passed.
inline bool WaitFor(const std::function<bool()>& done, int ms = 5000) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(ms);
  while (!done()) {
    if (std::chrono::steady_clock::now() > end) return false;
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  return true;
}

// Lets pending events through (a few passes, no waiting).
inline void Flush() {
  for (int i = 0; i < 5; ++i) wxYield();
}

inline void Run(const std::string& command) {
  ASSERT_EQ(std::system(command.c_str()), 0) << command;
}

inline std::string Quote(const std::string& s) {
  std::string out = "'";
  for (char c : s) {
    if (c == '\'') out += "'\\''";
    else out += c;
  }
  return out + "'";
}

// The test TeX tree.  Documents of the private INI file:
//   Manuals>LaTeX>Guide      doc/latex/guide/guide.pdf   keywords \section (two anchors)
//   Manuals>LaTeX>Reference  doc/latex/reference.pdf
//   Manuals>Fonts>Catalogue  doc/fonts/fontcat.pdf
//   Help>Docuvane            doc/docuvane/docuvane-help.pdf  keyword .LMR.Help
// and the word index labels latex/base/sample.pdf, fonts/fontguide.pdf,
// math/amsldoc.pdf (all installed under doc/).  PDF documents open through
// a template whose program records its arguments in `records`.
class TestTree {
 public:
  TempDir root;
  std::string texmf, home, runtime, cache, bin, records, data;

  TestTree() {
    texmf = root / "texmf";
    home = root / "home";
    runtime = root / "run";
    cache = root / "cache";
    bin = root / "bin";
    records = root / "records";
    data = root / "xdgdata";
    for (const std::string& d : {texmf, home, runtime, cache, bin, records, data})
      std::filesystem::create_directories(d);
    std::filesystem::permissions(runtime, std::filesystem::perms::owner_all,
                                 std::filesystem::perm_options::replace);
  }

  void WriteIni(const std::string& extra = "") {
    root.Write("texmf/Docuvane/Docuvane.ini",
               "[Setup]\nTrace=0\n\n[DOC]\n"
               "Manuals>LaTeX>Guide=guide.pdf\n"
               "Manuals>LaTeX>Reference=reference.pdf\n"
               "Manuals>Fonts>Catalogue=fontcat.pdf\n"
               "Help>Docuvane=docuvane-help.pdf\n\n"
               "[Extensions]\npdf=<docuvane-test-viewer> ^.pdf #\n" +
                   extra);
  }

  void WriteDocuments() {
    const char* pdfs[][2] = {
        {"doc/latex/guide/guide.pdf", "Guide"},
        {"doc/latex/reference.pdf", "Reference"},
        {"doc/fonts/fontcat.pdf", "Font catalogue"},
        {"doc/docuvane/docuvane-help.pdf", "Docuvane help"},
        {"doc/latex/base/sample.pdf", "Sample"},
        {"doc/fonts/fontguide.pdf", "Font guide"},
        {"doc/math/amsldoc.pdf", "AMS"},
    };
    for (const auto& pdf : pdfs) {
      const std::string path = texmf + "/" + pdf[0];
      std::filesystem::create_directories(std::filesystem::path(path).parent_path());
      Run(std::string(DOCUVANE_MKPDF) + " " + Quote(path) + " " + Quote(pdf[1]) + " 3");
    }
    root.Write("texmf/doc/latex/guide/guide.ddf",
               "[Keywords]\n\\section=sec:section#sec:headings\n\\chapter=chap\n");
    root.Write("texmf/doc/docuvane/docuvane-help.ddf", "[Keywords]\n.LMR.Help=help-start\n");
  }

  // Index words; the '@' word must never be listed.
  void WriteIndex(const std::string& listing = DefaultListing()) {
    const std::string list = root.Write("listing.txt", listing);
    std::filesystem::create_directories(texmf + "/Update");
    Run(std::string(DOCUVANE_MKINDEX) + " " + Quote(list) + " " + Quote(texmf + "/Update/command.Index"));
  }

  static std::string DefaultListing() {
    return "\\section\tlatex/base/sample.pdf\t12 15\n"
           "\\section\tfonts/fontguide.pdf\t3\n"
           "\\sectionmark\tlatex/base/sample.pdf\t20\n"
           "{align}\tmath/amsldoc.pdf\t7\n"
           "\\alpha\tmath/amsldoc.pdf\t2\n"
           "\\@ifnextchar\tlatex/base/sample.pdf\t4\n"
           "\\begin\tlatex/base/sample.pdf\t1\n"
           "tabular\tlatex/base/sample.pdf\t9\n";
  }

  // The viewer named by the template, and a stand-in for the desktop's
  // opener: both record their arguments, one file per start.
  void WriteViewers() {
    for (const char* name : {"docuvane-test-viewer", "xdg-open"}) {
      const std::string script = root.Write(
          std::string("bin/") + name,
          "#!/bin/sh\nf=" + Quote(records) + "/" + name + "-$$\nprintf '%s\\n' \"$@\" > \"$f.tmp\"\nmv \"$f.tmp\" \"$f\"\n");
      std::filesystem::permissions(script, std::filesystem::perms::owner_all);
    }
  }

  void BuildAll() {
    WriteIni();
    WriteDocuments();
    WriteIndex();
    WriteViewers();
  }

  // Argument lists recorded by `program`, in no particular order.
  std::vector<std::vector<std::string>> Records(const std::string& program) const {
    std::vector<std::vector<std::string>> all;
    for (const auto& entry : std::filesystem::directory_iterator(records)) {
      const std::string name = entry.path().filename().string();
      if (name.rfind(program + "-", 0) != 0 || (name.size() > 4 && name.substr(name.size() - 4) == ".tmp"))
        continue;
      std::ifstream in(entry.path());
      std::vector<std::string> args;
      for (std::string line; std::getline(in, line);) args.push_back(line);
      all.push_back(args);
    }
    return all;
  }

  void ClearRecords() const {
    for (const auto& entry : std::filesystem::directory_iterator(records))
      std::filesystem::remove(entry.path());
  }
};

// Empties what an earlier test of the same process left in the program's
// process-wide tables, so tests also pass when run in one process.
inline void ResetProgramState() {
  CloseWordIndex();
  WordIndexPath.clear();
  KeywordListReset();
  PoolReset();
  CommandWordCount = 0;
  EnvironmentWordCount = 0;
  HighlightedItem.Unset();
  ProfileCacheClear();
}

// A fresh configuration store in the current $HOME.
inline void ReopenConfig() {
  delete wxConfigBase::Set(nullptr);
  wxConfigBase::Get();
}

class WindowTest : public ::testing::Test {
 protected:
  TestTree tree;
  std::vector<std::unique_ptr<ScopedEnv>> env;
  MyFrame* frame = nullptr;

  void SetUp() override {
    const std::string path = tree.bin + ":/usr/bin:/bin";
    const std::pair<const char*, std::string> vars[] = {
        {"HOME", tree.home},           {"TEXMF", tree.texmf},
        {"XDG_RUNTIME_DIR", tree.runtime}, {"XDG_CACHE_HOME", tree.cache},
        {"XDG_CONFIG_HOME", tree.home + "/.config"}, {"XDG_DATA_HOME", tree.data},
        {"XDG_DATA_DIRS", tree.data + ":/usr/local/share:/usr/share"}, {"PATH", path},
        {"TROVLIB_ICON_THEMES", ""},   {"DOCSERVER", "http://127.0.0.1:9/docs"},
    };
    for (const auto& v : vars) env.push_back(std::make_unique<ScopedEnv>(v.first, v.second));
    env.push_back(std::make_unique<ScopedEnv>("TEXDIR", std::nullopt));
    env.push_back(std::make_unique<ScopedEnv>("TROVLIB_LOG", std::nullopt));
    ResetProgramState();
    ReopenConfig();
  }

  void TearDown() override {
    CloseFrame();
    delete wxConfigBase::Set(nullptr);
    ResetProgramState();
  }

  // Builds the frame as start-up does and shows it.
  MyFrame* OpenFrame() {
    Docuvane_Init();
    frame = new MyFrame("Lomari Docuvane");
    frame->Show();
    WaitFor([this] { return frame->IsShownOnScreen(); });
    Flush();
    return frame;
  }

  void CloseFrame() {
    if (!frame) return;
    delete frame;
    frame = nullptr;
    Flush();
  }

  Docuvane* panel() const { return frame ? frame->m_helpPanel : nullptr; }

  // Screen position of the centre of a window's rectangle (client coordinates).
  static wxPoint ScreenPoint(wxWindow* window, const wxPoint& client) {
    return window->ClientToScreen(client);
  }
};

}  // namespace gui_testing
