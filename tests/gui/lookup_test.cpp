// The lookup driven as a user drives it: typing fills the Locations list, a
// location is shown in the tree and opened, so is a tree item; the buttons
// reach the window that handles them.
#include <gtest/gtest.h>
#include <wx/button.h>
#include <wx/listbox.h>
#include <wx/srchctrl.h>
#include <wx/timer.h>
#include <wx/treectrl.h>
#include <wx/uiaction.h>

#include "catalogue/tree.h"
#include "gui_support.h"
#include "window/about.h"
#include "window/ids.h"
#include "window/qlistbox.h"

namespace gui_testing {
namespace {

class LookupTest : public WindowTest {
 protected:
  wxUIActionSimulator sim;

  void SetUp() override {
    WindowTest::SetUp();
    if (HasFatalFailure()) return;
    OpenFrame();
    frame->Raise();
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
    wxListBox* list = panel()->m_targetList;
    for (int y = 1; y < list->GetClientSize().y; ++y)
      if (list->HitTest(wxPoint(20, y)) == row) return Click(list, wxPoint(20, y + 3), twice);
    ADD_FAILURE() << "row " << row << " is not visible";
  }

  void DoubleClickItem(const wxString& text) {
    panel()->m_tree->EnsureVisible(Item(text));
    Flush();
    wxRect rect;
    ASSERT_TRUE(panel()->m_tree->GetBoundingRect(Item(text), rect, true)) << text;
    Click(panel()->m_tree, rect.GetPosition() + rect.GetSize() / 2, true);
  }

  void TypeSection() {
    Click(panel()->m_search);
    ASSERT_TRUE(sim.Text("\\sec"));
    ASSERT_TRUE(WaitFor([&] { return panel()->m_targetList->GetCount() == 4; }));
  }

  std::string Word() {
    return panel()->m_wordList->GetString(panel()->m_wordList->GetSelection()).utf8_string();
  }

  std::vector<std::string> Locations() {
    std::vector<std::string> items;
    for (const wxString& s : panel()->m_targetList->GetStrings()) items.push_back(s.utf8_string());
    return items;
  }

  wxTreeItemId Item(const wxString& text, wxTreeItemId parent = wxTreeItemId()) {
    wxTreeCtrl* t = panel()->m_tree;
    wxTreeItemIdValue cookie;
    for (wxTreeItemId child = t->GetFirstChild(parent.IsOk() ? parent : t->GetRootItem(), cookie);
         child.IsOk(); child = t->GetNextSibling(child)) {
      if (t->GetItemText(child) == text) return child;
      if (const wxTreeItemId below = Item(text, child); below.IsOk()) return below;
    }
    return wxTreeItemId();
  }

  // Waits for recorded starts and returns them (program name, then arguments); forgets them.
  std::vector<Args> Runs() {
    WaitFor([&] { return !std::filesystem::is_empty(records); });
    Flush();
    std::vector<Args> runs;
    for (const auto& entry : std::filesystem::directory_iterator(records)) {
      std::ifstream in(entry.path());
      runs.emplace_back();
      for (std::string line; std::getline(in, line);) runs.back().push_back(line);
      std::filesystem::remove(entry.path());
    }
    return runs;
  }

  // What a start of the viewer on `doc` (under doc/) with these further arguments records.
  std::vector<Args> Viewer(const std::string& doc, Args more = {}) {
    more.insert(more.begin(), {"docuvane-test-viewer", texmf + "/doc/" + doc});
    return {more};
  }
};

TEST_F(LookupTest, TypingSelectsTheWordAndFillsLocations) {
  Docuvane* p = panel();
  TypeSection();
  EXPECT_EQ(Word(), "\\section");
  // Keyword targets first, newest first, then the index pages.
  const std::string guide = texmf + "/doc/latex/guide/guide.pdf";
  const std::vector<std::string> section{guide + "#sec:headings", guide + "#sec:section",
                                         "latex/base/sample.pdf#page=12 15 ",
                                         "fonts/fontguide.pdf#page=3 "};
  EXPECT_EQ(Locations(), section);
  EXPECT_EQ(p->m_targetList->GetSelection(), 0);
  EXPECT_FALSE(p->m_gotoButton->IsEnabled()) << "row 0 is selected by the program, not the user";

  const struct {
    const char *what, *text, *word;
    std::vector<std::string> locations;
  } rows[] = {
      {"a text no word starts with keeps the word", "\\secx", "\\section", section},
      {"an empty field keeps the word", "", "\\section", section},
      {"a leading backslash or brace is skipped", "al", "{align}", {"math/amsldoc.pdf#page=7 "}},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.what);
    p->m_search->SetValue(row.text);
    Flush();
    EXPECT_EQ(Word(), row.word);
    EXPECT_EQ(Locations(), row.locations);
  }

  // Clicking a word shows its locations too (rows have one height).
  QListBox* words = p->m_wordList;
  Click(words, wxPoint(30, words->RowHeight * 3 / 2));  // row 1: \alpha
  ASSERT_TRUE(WaitFor([&] { return words->GetSelection() == 1; }));
  EXPECT_EQ(Locations(), std::vector<std::string>{"math/amsldoc.pdf#page=2 "});
}

TEST_F(LookupTest, ALocationIsBoldedInTheTreeAndOpensThroughTheTemplate) {
  Docuvane* p = panel();
  TypeSection();
  bool frameSawGoTo = false;
  frame->Bind(
      wxEVT_BUTTON, [&](wxCommandEvent&) { frameSawGoTo = true; }, ID_GOTO);
  auto select = [&](int row, const wxString& bold, const wxString& notBold) {
    ClickLocation(row);
    ASSERT_TRUE(WaitFor([&] { return p->m_targetList->GetSelection() == row; }));
    EXPECT_TRUE(p->m_gotoButton->IsEnabled());
    EXPECT_TRUE(p->m_tree->IsBold(Item(bold)));
    EXPECT_FALSE(p->m_tree->IsBold(Item(notBold)));
    EXPECT_EQ(p->m_tree->GetSelection(), Item(bold));
  };
  // An index location: its label's node; "&Go To" opens the label at the pages.
  select(3, "fontguide.pdf", "Guide");
  Click(p->m_gotoButton);
  EXPECT_EQ(Runs(), Viewer("fonts/fontguide.pdf", {"page=3 "}));
  // A keyword location: its document's node; a double-click opens it at the anchor.
  select(1, "Guide", "fontguide.pdf");
  ClickLocation(1, true);
  EXPECT_EQ(Runs(), Viewer("latex/guide/guide.pdf", {"sec:section"}));
  EXPECT_FALSE(frameSawGoTo) << "the panel handles \"&Go To\"";
  // A new word takes the bold away and disables "&Go To" again.
  p->m_search->SetValue("\\alpha");
  Flush();
  EXPECT_FALSE(p->m_tree->IsBold(Item("Guide")));
  EXPECT_FALSE(p->m_gotoButton->IsEnabled());
}

TEST_F(LookupTest, HighlightIgnoresCaseAndSurvivesARebuild) {
  Docuvane* p = panel();
  HighlightDocument(p, "other.pdf#page=1");
  EXPECT_EQ(HighlightedItem, nullptr) << "a document the table does not know";
  HighlightDocument(p, "LATEX/Base/Sample.PDF");  // no '#': the whole text
  EXPECT_TRUE(p->m_tree->IsBold(Item("sample.pdf")));
  ASSERT_EQ(HighlightedItem, Item("sample.pdf").GetID());
  Fill_Tree(p);  // deletes the bold item: the next lookup must not touch it
  EXPECT_EQ(HighlightedItem, nullptr);
  Show_Topic(p, "\\section", 0);
  EXPECT_EQ(p->m_targetList->GetCount(), 4u);
}

TEST_F(LookupTest, TreeDoubleClickAndOpenCommandOpenTheDocument) {
  Docuvane* p = panel();
  MessageCapture messages;
  DoubleClickItem("Reference");
  EXPECT_EQ(Runs(), Viewer("latex/reference.pdf"));

  DoubleClickItem("Manuals");  // a category opens nothing
  ASSERT_TRUE(WaitFor([&] { return messages.Contains("Not found clicked document"); }));
  EXPECT_TRUE(std::filesystem::is_empty(records));

  p->m_tree->SelectItem(Item("Catalogue"));
  wxCommandEvent open(wxEVT_BUTTON, ID_OPEN_DOC);
  p->GetEventHandler()->ProcessEvent(open);
  EXPECT_EQ(Runs(), Viewer("fonts/fontcat.pdf"));
  EXPECT_EQ(p->Open_Document(wxTreeItemId()), 0);
}

// Ends the About dialog's modal loop from inside it, once it is up.
struct AboutCloser : wxTimer {
  bool shown = false;
  void Notify() override {
    for (wxWindow* w : wxTopLevelWindows)
      if (auto* about = dynamic_cast<AboutDlg*>(w); about && about->IsModal()) {
        shown = true;
        about->EndModal(wxID_CANCEL);
      }
  }
};

TEST_F(LookupTest, HelpInternetAboutReachTheFrame) {
  MessageCapture messages;
  Click(wxWindow::FindWindowById(wxID_HELP, frame));
  EXPECT_EQ(Runs(), Viewer("docuvane/docuvane-help.pdf", {"help-start"}));
  EXPECT_TRUE(messages.Contains("INFO: MyFrame::OnHelp"));

  Click(wxWindow::FindWindowById(ID_INTERNET, frame));
  EXPECT_EQ(Runs(), (std::vector<Args>{{"xdg-open", "http://127.0.0.1:9/docs/about.php"}}));
  EXPECT_TRUE(messages.Contains("INFO: MyFrame::OnInternet"));

  AboutCloser closer;
  closer.Start(50);
  Click(wxWindow::FindWindowById(wxID_ABOUT, frame));
  EXPECT_TRUE(WaitFor([&] { return closer.shown; }));
  closer.Stop();
  Flush();
  for (wxWindow* w : wxTopLevelWindows)
    EXPECT_EQ(dynamic_cast<AboutDlg*>(w), nullptr) << "destroyed";
}

}  // namespace
}  // namespace gui_testing
