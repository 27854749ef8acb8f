// The main window on the test tree, driven as a user drives it: catalogue tree,
// word list and status line; typing fills the Locations list, a location is shown
// in the tree and opened, so is a tree item; the buttons reach the window that
// handles them; programs start with exactly their arguments.
#include <gtest/gtest.h>
#include <wx/button.h>
#include <wx/listbox.h>
#include <wx/srchctrl.h>
#include <wx/statbmp.h>
#include <wx/statusbr.h>
#include <wx/treectrl.h>
#include <wx/uiaction.h>

#include "access/desktop_services_gui.h"
#include "catalogue/tree.h"
#include "gui_support.h"
#include "window/about.h"
#include "window/ids.h"
#include "window/qlistbox.h"
#include "window/tree_nodes.h"

namespace gui_testing {
namespace {

class LookupTest : public WindowTest {
 protected:
  wxUIActionSimulator sim;
  Docuvane* p = nullptr;

  void SetUp() override {
    WindowTest::SetUp();
    if (HasFatalFailure()) return;
    OpenFrame();
    frame->Raise();
    p = panel();
  }
  // Clicks a point of `window` (client coordinates; by default its middle).
  void Click(wxWindow* window, wxPoint at = wxDefaultPosition, bool twice = false) {
    if (at == wxDefaultPosition)
      at = wxPoint(window->GetClientSize().x / 2, window->GetClientSize().y / 2);
    sim.MouseMove(window->ClientToScreen(at));
    Flush();
    twice ? sim.MouseDblClick() : sim.MouseClick();
    Flush();
  }
  void ClickLocation(int row, bool twice = false) {
    for (int y = 1; y < p->m_targetList->GetClientSize().y; ++y)
      if (p->m_targetList->HitTest(wxPoint(20, y)) == row)
        return Click(p->m_targetList, wxPoint(20, y + 3), twice);
    ADD_FAILURE() << "row " << row << " is not visible";
  }
  void DoubleClickItem(const std::string& text) {
    p->m_tree->EnsureVisible(Item(text));
    Flush();
    wxRect rect;
    ASSERT_TRUE(p->m_tree->GetBoundingRect(Item(text), rect, true)) << text;
    Click(p->m_tree, rect.GetPosition() + rect.GetSize() / 2, true);
  }
  Args Locations() {
    Args items;
    for (const wxString& s : p->m_targetList->GetStrings()) items.push_back(s.utf8_string());
    return items;
  }
  // The tree's items in outline order, with the text indented two blanks a
  // level; the items of branches never opened are made on the way.
  std::vector<std::pair<std::string, wxTreeItemId>> Items(wxTreeItemId parent = {}, int depth = 0) {
    std::vector<std::pair<std::string, wxTreeItemId>> items;
    wxTreeItemIdValue cookie;
    for (wxTreeItemId c =
             p->m_tree->GetFirstChild(parent.IsOk() ? parent : p->m_tree->GetRootItem(), cookie);
         c.IsOk(); c = p->m_tree->GetNextSibling(c)) {
      p->m_treeNodes->ItemOf(p->m_treeNodes->FirstChild(p->m_treeNodes->NodeOf(c)));
      items.emplace_back(std::string(2 * depth, ' ') + p->m_tree->GetItemText(c).utf8_string(), c);
      for (auto& below : Items(c, depth + 1)) items.push_back(below);
    }
    return items;
  }
  wxTreeItemId Item(const std::string& text) {
    for (const auto& [indented, id] : Items())
      if (indented.substr(indented.find_first_not_of(' ')) == text) return id;
    return {};
  }
  // Waits for a recorded start and gives its program name and arguments.
  Args Run() {
    WaitFor([&] { return !std::filesystem::is_empty(records); });
    Flush();
    Args run;
    for (const auto& entry : std::filesystem::directory_iterator(records)) {
      std::ifstream in(entry.path());
      for (std::string line; std::getline(in, line);) run.push_back(line);
      std::filesystem::remove(entry.path());
    }
    return run;
  }
  // What a start of the viewer on `doc` (under doc/) with these further arguments records.
  Args Viewer(const std::string& doc, Args more = {}) {
    more.insert(more.begin(), {"docuvane-test-viewer", texmf + "/doc/" + doc});
    return more;
  }
};

TEST_F(LookupTest, ShowsCatalogueTreeWordListAndCounts) {
  // At first only the first level has items; a branch gets its own when it
  // is opened.
  wxTreeItemIdValue cookie;
  const wxTreeItemId manuals = p->m_tree->GetFirstChild(p->m_tree->GetRootItem(), cookie);
  ASSERT_EQ(p->m_tree->GetItemText(manuals), "Manuals");
  EXPECT_TRUE(p->m_tree->ItemHasChildren(manuals));
  EXPECT_EQ(p->m_tree->GetChildrenCount(manuals, false), 0u);
  p->m_tree->Expand(manuals);
  EXPECT_EQ(p->m_tree->GetChildrenCount(manuals, false), 2u) << "LaTeX and Fonts";
  // Categories in table order; labels follow under nodes named after their directories.
  std::string outline;
  for (const auto& [indented, id] : Items()) outline += indented + "\n";
  EXPECT_EQ(outline,
            "Manuals\n  LaTeX\n    Guide\n    Reference\n  Fonts\n    Catalogue\nHelp\n  Docuvane\n"
            "latex\n  base\n    sample.pdf\nfonts\n  fontguide.pdf\nmath\n  amsldoc.pdf\n");
  // Sorted ignoring case and one leading backslash or brace; no '@' word.
  std::vector<std::string> rows;
  for (int i = -1; i <= static_cast<int>(p->m_wordList->GetItemCount()); ++i)
    rows.push_back(p->m_wordList->GetString(i).utf8_string());
  EXPECT_EQ(rows, (Args{"", "{align}", "\\alpha", "\\begin", "\\section", "\\sectionmark",
                        "tabular", ""}));
  EXPECT_EQ(frame->GetStatusBar()->GetStatusText(0),
            "There are 7 documents including 4 TeX commands and 1 LaTeX environments.");
  std::filesystem::remove(texmf + "/Update/command.Index");
  ReopenFrame();
  EXPECT_EQ(panel()->m_wordList->GetItemCount(), 0u) << "without a word index";
  EXPECT_EQ(frame->GetStatusBar()->GetStatusText(0),
            "There are 4 documents including 0 TeX commands and 0 LaTeX environments.");
}

TEST_F(LookupTest, TypingSelectsTheWordAndFillsLocations) {
  Click(p->m_search);
  ASSERT_TRUE(sim.Text("\\sec"));
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetCount() == 4; }));
  EXPECT_EQ(p->m_wordList->GetString(p->m_wordList->GetSelection()), "\\section");
  // Keyword targets first, newest first, then the index pages.
  const std::string guide = texmf + "/doc/latex/guide/guide.pdf";
  const Args section{guide + "#sec:headings", guide + "#sec:section",
                     "latex/base/sample.pdf#page=12 15 ", "fonts/fontguide.pdf#page=3 "};
  EXPECT_EQ(Locations(), section);
  EXPECT_FALSE(p->m_gotoButton->IsEnabled()) << "row 0 is selected by the program, not the user";
}

TEST_F(LookupTest, ALocationIsBoldedInTheTreeAndOpensThroughTheTemplate) {
  Show_Topic(p, "\\section", 0);
  Flush();
  auto select = [&](int row, const std::string& bold, const std::string& notBold) {
    ClickLocation(row);
    ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetSelection() == row; }));
    EXPECT_TRUE(p->m_gotoButton->IsEnabled());
    EXPECT_TRUE(p->m_tree->IsBold(Item(bold)));
    EXPECT_FALSE(p->m_tree->IsBold(Item(notBold)));
    EXPECT_EQ(p->m_tree->GetSelection(), Item(bold));
  };
  select(3, "fontguide.pdf", "Guide");  // an index location: its label's node
  Click(p->m_gotoButton);
  EXPECT_EQ(Run(), Viewer("fonts/fontguide.pdf", {"page=3 "}));
  select(1, "Guide", "fontguide.pdf");  // a keyword location: its document's node
  ClickLocation(1, true);
  EXPECT_EQ(Run(), Viewer("latex/guide/guide.pdf", {"sec:section"}));

  p->m_search->SetValue("\\alpha");  // a new word takes the bold away
  Flush();
  EXPECT_FALSE((HighlightedItem != nullptr) || p->m_tree->IsBold(Item("Guide")));
  EXPECT_FALSE(p->m_gotoButton->IsEnabled());
  HighlightDocument(p, "other.pdf#page=1");
  EXPECT_FALSE((HighlightedItem != nullptr)) << "a document the table does not know";
  HighlightDocument(p, "LATEX/Base/Sample.PDF");  // no '#': the whole text, case ignored
  ASSERT_EQ(HighlightedItem, p->m_treeNodes->NodeOf(Item("sample.pdf")));
  EXPECT_TRUE(p->m_tree->IsBold(Item("sample.pdf")));
  Fill_Tree(p);  // deletes the bold item: the next lookup must not touch it
  EXPECT_FALSE((HighlightedItem != nullptr));
  Show_Topic(p, "\\section", 0);
  EXPECT_EQ(p->m_targetList->GetCount(), 4u);
}

// A label the locale cannot read is shown byte for byte, and the row reads
// back as the very bytes it was made of: bolded and opened as that file.
TEST_F(LookupTest, ALabelTheLocaleCannotReadStaysItsOwnBytes) {
  root.Write("texmf/doc/latex/caf\xe9.pdf", "%PDF-1.4\n%%EOF\n");
  const std::string listing = root.Write(
      "accent.txt", "\\accent\tlatex/base/sample.pdf\t1\n\\accent\tlatex/caf\xe9.pdf\t3\n");
  ASSERT_EQ(
      std::system(
          (DOCUVANE_MKINDEX " '" + listing + "' '" + texmf + "/Update/command.Index'").c_str()),
      0);
  ReopenFrame();
  p = panel();
  Show_Topic(p, "\\accent", 0);
  Flush();
  ClickLocation(1);
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetSelection() == 1; }));
  EXPECT_TRUE(p->m_tree->IsBold(Item("caf\u00e9.pdf")));
  Click(p->m_gotoButton);
  EXPECT_EQ(Run(), Viewer("latex/caf\xe9.pdf", {"page=3 "}));
}

// A manual scanned by docuvane-mkindex --scan: typing a word it explains lists
// the physical pages its printed index links to; its title is its tool tip.
TEST_F(LookupTest, TypingAWordOfAScannedManualListsItsPages) {
  const std::string manual = texmf + "/doc/latex/demo/manual.pdf", scan = root / "scan";
  std::filesystem::create_directories(texmf + "/doc/latex/demo");
  ASSERT_EQ(std::system((DOCUVANE_MKPDF " --manual '" + manual + "'").c_str()), 0);
  ASSERT_EQ(std::system(("XDG_CACHE_HOME='" + scan + "' " DOCUVANE_MKINDEX " --scan '" + texmf +
                         "' 2>/dev/null")
                            .c_str()),
            0);
  std::filesystem::copy_file(scan + "/lomari/texmf/Update/command.Index",
                             texmf + "/Update/command.Index",
                             std::filesystem::copy_options::overwrite_existing);
  // The scan's settings after the tree's own (their [Titles] among them).
  std::ofstream(texmf + "/Docuvane/Docuvane.ini", std::ios::app)
      << testing_support::ReadAll(scan + "/lomari/texmf/Docuvane/Docuvane.ini");
  ReopenFrame();
  p = panel();
  Click(p->m_search);
  ASSERT_TRUE(sim.Text("\\sect"));
  ASSERT_TRUE(WaitFor([&] {
    const Args shown = Locations();
    return std::find(shown.begin(), shown.end(), "latex/demo/manual.pdf#page=3 4 ") != shown.end();
  })) << p->m_targetList->GetCount()
      << " locations";
  // A document's own title is its item's tool tip.
  wxTreeEvent tip(wxEVT_TREE_ITEM_GETTOOLTIP, p->m_tree, Item("manual.pdf"));
  p->m_tree->GetEventHandler()->ProcessEvent(tip);
  EXPECT_EQ(tip.GetToolTip(), "A manual for testing");
}

TEST_F(LookupTest, TreeItemsAndButtonsOpenWhatTheyShow) {
  MessageCapture messages;
  DoubleClickItem("Reference");
  EXPECT_EQ(Run(), Viewer("latex/reference.pdf"));
  DoubleClickItem("Manuals");  // a category opens nothing
  ASSERT_TRUE(WaitFor([&] { return messages.Contains("Not found clicked document"); }));
  EXPECT_TRUE(std::filesystem::is_empty(records));
  p->m_tree->SelectItem(Item("Catalogue"));
  wxCommandEvent open(wxEVT_BUTTON, ID_OPEN_DOC);
  p->GetEventHandler()->ProcessEvent(open);
  EXPECT_EQ(Run(), Viewer("fonts/fontcat.pdf"));

  Click(wxWindow::FindWindowById(wxID_HELP, frame));
  EXPECT_EQ(Run(), Viewer("docuvane/docuvane-help.pdf", {"help-start"}));
  EXPECT_TRUE(messages.Contains("INFO: MyFrame::OnHelp")) << "the frame handles the button";
}

// A logo found under an upper-case extension but unreadable still takes its
// place in the About dialog: the picture slot stays, empty.
TEST_F(LookupTest, AnUnreadableLogoKeepsItsSlot) {
  root.Write("texmf/Docuvane/Docuvane.BMP", "not a picture");
  TrovResetCaches();
  AboutDlg about(frame);
  int pictures = 0;
  for (wxWindow* child : about.GetChildren())
    pictures += wxDynamicCast(child, wxStaticBitmap) != nullptr;
  EXPECT_EQ(pictures, 1);
}

TEST(DesktopServices, ExecuteHandsOverEveryArgumentUnchanged) {
  TempDir dir;
  const std::string record = dir / "record", touch = "touch " + dir / "SENTINEL";
  const std::string recorder =
      dir.Write("recorder", "#!/bin/sh\nfor a in \"$@\"; do printf '%s\\0' \"$a\"; done > '" +
                                record + ".tmp'\nmv '" + record + ".tmp' '" + record + "'\n");
  std::filesystem::permissions(recorder, std::filesystem::perms::owner_all);
  // clang-format off
  const Args hostile = {"a\" --evil-opt=1 \"b", "$(" + touch + ")", "`" + touch + "`", ";" + touch,
                        "back\\slash", "-rf", "new\nline", "Gr\u00fc\u00dfe", "", "  blanks  "};
  // clang-format on
  DesktopAccessServices services(nullptr);
  Args argv{recorder};
  argv.insert(argv.end(), hostile.begin(), hostile.end());
  EXPECT_GT(services.Execute(argv), 0);
  ASSERT_TRUE(WaitFor([&] { return std::filesystem::exists(record); }));
  std::ifstream in(record, std::ios::binary);
  Args received;
  for (std::string arg; std::getline(in, arg, '\0');) received.push_back(arg);
  EXPECT_EQ(received, hostile);
  EXPECT_FALSE(std::filesystem::exists(dir / "SENTINEL"));
  EXPECT_EQ(services.Execute({""}), 0) << "a template whose program was not found";
  EXPECT_EQ(services.Execute({dir / "missing-viewer"}), 0);
}

}  // namespace
}  // namespace gui_testing
