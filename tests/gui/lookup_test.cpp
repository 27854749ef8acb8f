// The lookup driven as a user drives it: typing selects a word and fills the
// Locations list, a location is shown in the tree and opened, a tree item is
// opened; the buttons reach the handlers they belong to.
#include <gtest/gtest.h>
#include <wx/button.h>
#include <wx/dialog.h>
#include <wx/listbox.h>
#include <wx/srchctrl.h>
#include <wx/timer.h>
#include <wx/treectrl.h>

#include "gui_support.h"
#include "window/about.h"
#include "window/ids.h"
#include "wordindex/qlistbox_gui.h"

namespace gui_testing {
namespace {

class LookupTest : public WindowTest {
 protected:
  wxUIActionSimulator sim;

  void SetUp() override {
    WindowTest::SetUp();
    tree.BuildAll();
    OpenFrame();
    frame->Raise();
    Flush();
  }

  void ClickAt(const wxPoint& screen, bool twice = false) {
    sim.MouseMove(screen);
    Flush();
    if (twice) sim.MouseDblClick();
    else sim.MouseClick();
    Flush();
  }

  void Click(wxWindow* window, bool twice = false) {
    const wxSize size = window->GetSize();
    ClickAt(window->GetScreenPosition() + wxPoint(size.x / 2, size.y / 2), twice);
  }

  void Type(const char* text) {
    Click(panel()->m_search);
    ASSERT_TRUE(sim.Text(text));
    Flush();
  }

  std::vector<std::string> Locations() {
    std::vector<std::string> items;
    for (unsigned i = 0; i < panel()->m_targetList->GetCount(); ++i)
      items.push_back(panel()->m_targetList->GetString(i).utf8_string());
    return items;
  }

  // Clicks row `row` of the Locations list.
  void ClickLocation(int row, bool twice = false) {
    wxListBox* list = panel()->m_targetList;
    for (int y = 1; y < list->GetClientSize().y; ++y) {
      if (list->HitTest(wxPoint(20, y)) == row) {
        ClickAt(list->ClientToScreen(wxPoint(20, y + 3)), twice);
        return;
      }
    }
    ADD_FAILURE() << "row " << row << " is not visible";
  }

  wxTreeItemId FindItem(const wxTreeItemId& parent, const wxString& text) {
    wxTreeCtrl* t = panel()->m_tree;
    wxTreeItemIdValue cookie;
    for (wxTreeItemId child = t->GetFirstChild(parent, cookie); child.IsOk();
         child = t->GetNextChild(parent, cookie)) {
      if (t->GetItemText(child) == text) return child;
      const wxTreeItemId below = FindItem(child, text);
      if (below.IsOk()) return below;
    }
    return wxTreeItemId();
  }

  std::string Doc(const std::string& rel) const { return tree.texmf + "/doc/" + rel; }

  // Waits for the n-th start of `program` and returns its arguments.
  std::vector<std::string> WaitForRun(const std::string& program, size_t n = 1) {
    WaitFor([&] { return tree.Records(program).size() >= n; });
    auto runs = tree.Records(program);
    if (runs.size() != n) {
      ADD_FAILURE() << program << " started " << runs.size() << " times, expected " << n;
      return {};
    }
    tree.ClearRecords();
    return runs[0];
  }
};

TEST_F(LookupTest, TypingSelectsTheWordAndFillsLocations) {
  Docuvane* p = panel();
  MessageCapture messages;
  Type("\\sec");
  ASSERT_TRUE(WaitFor([&] { return p->m_search->GetValue() == "\\sec"; })) << p->m_search->GetValue();
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetCount() == 4; }));

  EXPECT_EQ(p->m_wordList->GetString(p->m_wordList->GetSelection()), "\\section");
  // Keyword targets first, newest first, then the index pages.
  const std::string guide = Doc("latex/guide/guide.pdf");
  EXPECT_EQ(Locations(), (std::vector<std::string>{guide + "#sec:headings", guide + "#sec:section",
                                                   "latex/base/sample.pdf#page=12 15 ",
                                                   "fonts/fontguide.pdf#page=3 "}));
  EXPECT_EQ(p->m_targetList->GetSelection(), 0);
  EXPECT_FALSE(p->m_gotoButton->IsEnabled()) << "row 0 is selected by the program, not the user";
  EXPECT_EQ(messages.LevelOf("INFO: Docuvane::Show_Topic \\section"), 3);
  EXPECT_EQ(messages.LevelOf("INFO: Docuvane::OnSearch of \\sec"), 3);

  // A text no word starts with keeps the word and its locations.
  ASSERT_TRUE(sim.Text("x"));
  ASSERT_TRUE(WaitFor([&] { return p->m_search->GetValue() == "\\secx"; }));
  Flush();
  EXPECT_EQ(p->m_wordList->GetString(p->m_wordList->GetSelection()), "\\section");
  EXPECT_EQ(p->m_targetList->GetCount(), 4u);

  // Clearing the field keeps the word and its locations.
  p->m_search->SetValue("");
  Flush();
  EXPECT_EQ(p->m_wordList->GetString(p->m_wordList->GetSelection()), "\\section");
  EXPECT_EQ(p->m_targetList->GetCount(), 4u);

  // Without the backslash the prefix search ignores it and the brace.
  p->m_search->SetValue("al");
  Flush();
  EXPECT_EQ(p->m_wordList->GetString(p->m_wordList->GetSelection()), "{align}");
  EXPECT_EQ(Locations(), std::vector<std::string>{"math/amsldoc.pdf#page=7 "});
}

TEST_F(LookupTest, ClickingAWordShowsItsLocations) {
  Docuvane* p = panel();
  QListBox* words = p->m_wordList;
  MessageCapture messages;
  // Row 1 is \alpha; rows have one height and the list starts at row 0.
  const int row = 1;
  ClickAt(words->ClientToScreen(wxPoint(30, row * words->RowHeight + words->RowHeight / 2)));
  ASSERT_TRUE(WaitFor([&] { return words->GetSelection() == row; }));
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetCount() == 1; }));
  EXPECT_EQ(Locations(), std::vector<std::string>{"math/amsldoc.pdf#page=2 "});
  EXPECT_EQ(messages.LevelOf("INFO: Docuvane::OnIndexChanged to \\alpha"), 3);
  EXPECT_FALSE(p->m_gotoButton->IsEnabled());
}

TEST_F(LookupTest, CommandsRunOnThePanel) {
  Docuvane* p = panel();
  struct Row {
    const char* what;
    const char* command;
    int exact;
    const char* word;  // selected afterwards
    std::vector<std::string> locations;
  };
  const std::string guide = Doc("latex/guide/guide.pdf");
  const Row rows[] = {
      {"a word is searched and shown", "\\alpha", 0, "\\alpha", {"math/amsldoc.pdf#page=2 "}},
      {"a prefix selects the first word", "\\sectionm", 0, "\\sectionmark",
       {"latex/base/sample.pdf#page=20 "}},
      {"an unlisted keyword keeps the word and lists its target", "\\chapter", 1, "\\sectionmark",
       {guide + "#chap"}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    ProcessCommand(p, row.command, row.exact);
    Flush();
    EXPECT_EQ(p->m_wordList->GetString(p->m_wordList->GetSelection()), row.word);
    EXPECT_EQ(Locations(), row.locations);
  }
  // Its single target opened at once, as a command asks.
  EXPECT_EQ(WaitForRun("docuvane-test-viewer"), (std::vector<std::string>{guide, "chap"}));
  ProcessCommand(static_cast<Docuvane*>(nullptr), "\\alpha", 0);  // no panel: nothing to do
}

TEST_F(LookupTest, HighlightFollowsTheDocumentPartAndSurvivesARebuild) {
  Docuvane* p = panel();
  const wxTreeItemId sample = FindItem(p->m_tree->GetRootItem(), "sample.pdf");
  struct Row {
    const char* what;
    std::string text;
    bool bold;
  };
  const Row rows[] = {
      {"a text without '#' is matched whole", "latex/base/sample.pdf", true},
      {"case is ignored", "LATEX/Base/Sample.PDF#page=1 ", true},
      {"a document the table does not know leaves the tree alone", "other.pdf#page=1", false},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    Show_Topic(p, "tabular", 0);  // clears the bold
    HighlightDocument(p, row.text.c_str());
    EXPECT_EQ(p->m_tree->IsBold(sample), row.bold);
    EXPECT_EQ(HighlightedItem.IsOk(), row.bold);
  }
  // Rebuilding the tree deletes the bold item; the next lookup must not
  // touch it.
  HighlightDocument(p, "latex/base/sample.pdf");
  ASSERT_TRUE(HighlightedItem.IsOk());
  Fill_Tree(p);
  EXPECT_FALSE(HighlightedItem.IsOk());
  Show_Topic(p, "\\section", 0);
  EXPECT_EQ(p->m_targetList->GetCount(), 4u);
}

TEST_F(LookupTest, SelectingLocationsBoldsTheirDocumentAndEnablesGoTo) {
  Docuvane* p = panel();
  Type("\\section");
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetCount() == 4; }));
  const wxTreeItemId guide = FindItem(p->m_tree->GetRootItem(), "Guide");
  const wxTreeItemId sample = FindItem(p->m_tree->GetRootItem(), "sample.pdf");
  ASSERT_TRUE(guide.IsOk() && sample.IsOk());

  struct Row {
    const char* what;
    int location;
    wxTreeItemId bold, notBold;
  };
  const Row rows[] = {
      {"an index location bolds its label's node", 2, sample, guide},
      {"a keyword location moves the bold to its document", 1, guide, sample},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    ClickLocation(row.location);
    ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetSelection() == row.location; }));
    ASSERT_TRUE(WaitFor([&] { return p->m_gotoButton->IsEnabled(); }));
    EXPECT_TRUE(p->m_tree->IsBold(row.bold));
    EXPECT_FALSE(p->m_tree->IsBold(row.notBold));
    EXPECT_EQ(p->m_tree->GetSelection(), row.bold);
    EXPECT_EQ(HighlightedItem, row.bold);
  }

  // A new word takes the bold away and disables "&Go To" again.
  p->m_search->SetValue("\\alpha");
  Flush();
  EXPECT_FALSE(p->m_tree->IsBold(guide));
  EXPECT_FALSE(HighlightedItem.IsOk());
  EXPECT_FALSE(p->m_gotoButton->IsEnabled());
}

TEST_F(LookupTest, GoToAndDoubleClickOpenTheLocationThroughTheTemplate) {
  Docuvane* p = panel();
  Type("\\section");
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetCount() == 4; }));

  // "&Go To" on an index location: the label found in the tree, the pages
  // as the anchor.
  ClickLocation(3);
  ASSERT_TRUE(WaitFor([&] { return p->m_gotoButton->IsEnabled(); }));
  bool frameSawGoTo = false;
  frame->Bind(wxEVT_BUTTON, [&](wxCommandEvent&) { frameSawGoTo = true; }, ID_GOTO);
  MessageCapture messages;
  Click(p->m_gotoButton);
  EXPECT_EQ(WaitForRun("docuvane-test-viewer"),
            (std::vector<std::string>{Doc("fonts/fontguide.pdf"), "page=3 "}));
  EXPECT_TRUE(messages.Contains("INFO: Docuvane::OnGotoTarget fonts/fontguide.pdf#page=3 "));
  EXPECT_FALSE(frameSawGoTo) << "the panel handles \"&Go To\"";

  // A double-click on a keyword location opens the document at its anchor.
  ClickLocation(1);
  ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetSelection() == 1; }));
  ClickLocation(1, true);
  EXPECT_EQ(WaitForRun("docuvane-test-viewer"),
            (std::vector<std::string>{Doc("latex/guide/guide.pdf"), "sec:section"}));
  EXPECT_TRUE(messages.Contains("INFO: Docuvane::OnTargetActivate "));
}

TEST_F(LookupTest, DoubleClickInTheTreeOpensTheDocument) {
  Docuvane* p = panel();
  const wxTreeItemId reference = FindItem(p->m_tree->GetRootItem(), "Reference");
  ASSERT_TRUE(reference.IsOk());
  p->m_tree->EnsureVisible(reference);
  Flush();
  wxRect rect;
  ASSERT_TRUE(p->m_tree->GetBoundingRect(reference, rect, true));
  MessageCapture messages;
  ClickAt(p->m_tree->ClientToScreen(rect.GetPosition() + wxPoint(rect.width / 2, rect.height / 2)), true);
  const auto args = WaitForRun("docuvane-test-viewer");
  ASSERT_FALSE(args.empty());
  EXPECT_EQ(args[0], Doc("latex/reference.pdf"));
  EXPECT_TRUE(messages.Contains("INFO: Docuvane::OnTreeActivate "));
  EXPECT_TRUE(messages.Contains("Label='Manuals>LaTeX>Reference'"));

  // A category opens nothing.
  messages.clear();
  const wxTreeItemId manuals = FindItem(p->m_tree->GetRootItem(), "Manuals");
  ASSERT_TRUE(p->m_tree->GetBoundingRect(manuals, rect, true));
  ClickAt(p->m_tree->ClientToScreen(rect.GetPosition() + wxPoint(rect.width / 2, rect.height / 2)), true);
  ASSERT_TRUE(WaitFor([&] { return messages.Contains("Not found clicked document"); }));
  EXPECT_TRUE(tree.Records("docuvane-test-viewer").empty());
}

TEST_F(LookupTest, OpenCommandOpensTheSelectedTreeDocument) {
  Docuvane* p = panel();
  MessageCapture messages;
  auto send = [&] {
    wxCommandEvent open(wxEVT_BUTTON, ID_OPEN_DOC);
    p->GetEventHandler()->ProcessEvent(open);
  };
  p->m_tree->SelectItem(FindItem(p->m_tree->GetRootItem(), "Catalogue"));
  send();
  const auto args = WaitForRun("docuvane-test-viewer");
  ASSERT_FALSE(args.empty());
  EXPECT_EQ(args[0], Doc("fonts/fontcat.pdf"));
  EXPECT_EQ(p->Open_Document(wxTreeItemId()), 0);
  EXPECT_EQ(messages.LevelOf("ERROR: Docuvane::Open_Document invalid wxTreeItemId"), 5);
}

TEST_F(LookupTest, HelpAndInternetButtonsReachTheFrame) {
  MessageCapture messages;
  Click(wxWindow::FindWindowById(wxID_HELP, frame));
  EXPECT_EQ(WaitForRun("docuvane-test-viewer"),
            (std::vector<std::string>{Doc("docuvane/docuvane-help.pdf"), "help-start"}));
  EXPECT_EQ(messages.LevelOf("INFO: MyFrame::OnHelp"), 2);

  Click(wxWindow::FindWindowById(ID_INTERNET, frame));
  EXPECT_EQ(WaitForRun("xdg-open"), std::vector<std::string>{"http://127.0.0.1:9/docs/about.php"});
  EXPECT_EQ(messages.LevelOf("INFO: MyFrame::OnInternet"), 2);
}

// Ends the About dialog's modal loop from inside it, once it is up.
class AboutCloser : public wxTimer {
 public:
  bool shown = false;
  void Notify() override {
    for (wxWindow* w : wxTopLevelWindows) {
      auto* about = dynamic_cast<AboutDlg*>(w);
      if (about && about->IsModal()) {
        shown = true;
        about->EndModal(wxID_CANCEL);
        Stop();
      }
    }
  }
};

TEST_F(LookupTest, AboutButtonShowsTheModalDialog) {
  AboutCloser closer;
  closer.Start(50);
  Click(wxWindow::FindWindowById(wxID_ABOUT, frame));
  EXPECT_TRUE(WaitFor([&] { return closer.shown; }));
  closer.Stop();
  Flush();
  for (wxWindow* w : wxTopLevelWindows) EXPECT_EQ(dynamic_cast<AboutDlg*>(w), nullptr) << "destroyed";
}

}  // namespace
}  // namespace gui_testing
