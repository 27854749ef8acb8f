// The main window built on a test tree: catalogue tree, word list, status
// line, geometry and sash kept in the configuration store, icon buttons and
// the About dialog.
#include <gtest/gtest.h>
#include <wx/bmpbuttn.h>
#include <wx/button.h>
#include <wx/image.h>
#include <wx/listbox.h>
#include <wx/srchctrl.h>
#include <wx/statbmp.h>
#include <wx/stattext.h>
#include <wx/statusbr.h>
#include <wx/treectrl.h>

#include <optional>

#include "gui_support.h"
#include "window/about.h"
#include "window/ids.h"
#include "wordindex/qlistbox_gui.h"

namespace gui_testing {
namespace {

// The tree as indented text, two blanks per level.
void Outline(wxTreeCtrl* tree, const wxTreeItemId& parent, int depth, std::string& out) {
  wxTreeItemIdValue cookie;
  for (wxTreeItemId child = tree->GetFirstChild(parent, cookie); child.IsOk();
       child = tree->GetNextChild(parent, cookie)) {
    out += std::string(2 * depth, ' ') + tree->GetItemText(child).utf8_string() + "\n";
    Outline(tree, child, depth + 1, out);
  }
}

std::string Outline(wxTreeCtrl* tree) {
  std::string out;
  Outline(tree, tree->GetRootItem(), 0, out);
  return out;
}

std::vector<std::string> Rows(QListBox* list) {
  std::vector<std::string> rows;
  for (size_t i = 0; i < list->GetItemCount(); ++i)
    rows.push_back(list->GetString(static_cast<int>(i)).utf8_string());
  return rows;
}

// True when the bitmap shows nothing at (x, y): masked out or fully clear.
bool TransparentAt(const wxBitmap& bitmap, int x, int y) {
  if (!bitmap.IsOk()) return true;
  const wxImage image = bitmap.ConvertToImage();
  if (image.HasAlpha() && image.GetAlpha(x, y) == 0) return true;
  return image.HasMask() && image.GetRed(x, y) == image.GetMaskRed() &&
         image.GetGreen(x, y) == image.GetMaskGreen() && image.GetBlue(x, y) == image.GetMaskBlue();
}

// A 16 x 16 light grey picture with a red square in its middle.
void WriteIcon(const std::string& path, wxBitmapType type) {
  wxImage image(16, 16);
  image.SetRGB(wxRect(0, 0, 16, 16), 192, 192, 192);
  image.SetRGB(wxRect(4, 4, 8, 8), 200, 0, 0);
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  ASSERT_TRUE(image.SaveFile(wxString::FromUTF8(path), type)) << path;
}

TEST_F(WindowTest, ShowsCatalogueTreeWordListAndCounts) {
  tree.BuildAll();
  MessageCapture messages;
  OpenFrame();
  Docuvane* p = panel();
  ASSERT_NE(p, nullptr);

  // Categories come from the names, in table order; labels follow the INI
  // documents under nodes named after their directories.
  EXPECT_EQ(Outline(p->m_tree),
            "Manuals\n  LaTeX\n    Guide\n    Reference\n  Fonts\n    Catalogue\n"
            "Help\n  Docuvane\n"
            "latex\n  base\n    sample.pdf\n"
            "fonts\n  fontguide.pdf\n"
            "math\n  amsldoc.pdf\n");

  // Sorted ignoring case and one leading backslash or brace; the '@' word
  // is left out with a warning.
  EXPECT_EQ(Rows(p->m_wordList), (std::vector<std::string>{"{align}", "\\alpha", "\\begin", "\\section",
                                                            "\\sectionmark", "tabular"}));
  EXPECT_TRUE(messages.Contains("WARNING: Skipped index word: \\@ifnextchar"));
  EXPECT_GT(p->m_wordList->RowHeight, 0);
  EXPECT_EQ(p->m_wordList->GetString(-1), "");
  EXPECT_EQ(p->m_wordList->GetString(6), "");

  EXPECT_EQ(frame->GetStatusBar()->GetStatusText(0),
            "There are 7 documents including 4 TeX commands and 1 LaTeX environments.");
  EXPECT_EQ(frame->GetTitle(), "Lomari Docuvane");
  EXPECT_EQ(frame->GetIcons().GetIconCount(), 5u) << "the compiled-in icon, 16 to 256 pixels";
  EXPECT_EQ(frame->GetFont().GetPointSize(), 10);

  // Nothing chosen yet: no locations, nothing to go to.
  EXPECT_FALSE(p->m_gotoButton->IsEnabled());
  EXPECT_EQ(p->m_gotoButton->GetLabel(), "&Go To");
  EXPECT_EQ(p->m_targetList->GetCount(), 0u);
  EXPECT_EQ(p->m_search->GetValue(), "");
  EXPECT_TRUE(p->IsSplit());
  EXPECT_EQ(p->GetWindow1(), p->m_tree);
  EXPECT_EQ(p->GetMinimumPaneSize(), 20);
}

TEST_F(WindowTest, WordListCanBeCreatedByClassName) {
  tree.BuildAll();
  Docuvane_Init();
  auto* list = wxDynamicCast(wxCreateDynamicObject("QListBox"), QListBox);
  ASSERT_NE(list, nullptr);
  EXPECT_EQ(list->WordCount, 0) << "nothing is read before Create";
  EXPECT_GT(list->RowHeight, 0);
  EXPECT_EQ(list->GetMargins(), wxPoint(8, 0));
  wxFrame* parent = new wxFrame(nullptr, wxID_ANY, "parent");
  ASSERT_TRUE(list->Create(parent, ID_WORD_LIST));
  EXPECT_EQ(list->WordCount, 6);
  EXPECT_EQ(list->GetItemCount(), 6u);
  EXPECT_EQ(FindWordInList(list, "sec", 0), 3);
  EXPECT_EQ(FindWordInList(nullptr, "sec", 0), -1);
  delete parent;
}

TEST_F(WindowTest, WithoutWordIndexTheListIsEmptyAndCountsAreZero) {
  tree.WriteIni();
  tree.WriteDocuments();
  OpenFrame();
  EXPECT_EQ(panel()->m_wordList->GetItemCount(), 0u);
  EXPECT_EQ(frame->GetStatusBar()->GetStatusText(0),
            "There are 4 documents including 0 TeX commands and 0 LaTeX environments.");
}

TEST_F(WindowTest, GeometryIsRestoredAndClampedToTheScreen) {
  ASSERT_EQ(VirtualScreenSize(), wxSize(1600, 1200)) << "the tests expect run-with-display's screen";
  struct Row {
    const char* what;
    std::optional<wxRect> stored;  // DIPs
    wxRect expected;
  };
  const Row rows[] = {
      {"first start: 50, 50 and 800 x 600", std::nullopt, {50, 50, 800, 600}},
      {"a stored size below the default opens at the default", wxRect(100, 120, 600, 500), {100, 120, 800, 600}},
      {"a stored geometry that fits is kept", wxRect(200, 100, 1000, 700), {200, 100, 1000, 700}},
      {"wider than the screen: as wide as the screen, at 0", wxRect(300, 40, 3000, 700), {0, 40, 1600, 700}},
      {"taller than the screen: as tall as the screen, at 0", wxRect(10, 400, 900, 5000), {10, 0, 900, 1200}},
      {"left of the screen moves to 0", wxRect(-200, -30, 900, 650), {0, 0, 900, 650}},
      {"past the right and bottom edges moves back", wxRect(1500, 1100, 800, 600), {800, 600, 800, 600}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    std::filesystem::remove_all(tree.home);
    std::filesystem::create_directories(tree.home);
    ReopenConfig();
    if (row.stored) {
      wxConfigBase* config = wxConfigBase::Get();
      config->Write("/MainWindow/x", static_cast<long>(row.stored->x));
      config->Write("/MainWindow/y", static_cast<long>(row.stored->y));
      config->Write("/MainWindow/w", static_cast<long>(row.stored->width));
      config->Write("/MainWindow/h", static_cast<long>(row.stored->height));
    }
    ResetProgramState();
    OpenFrame();
    EXPECT_EQ(frame->GetPosition(), frame->FromDIP(row.expected.GetPosition()));
    EXPECT_EQ(frame->GetSize(), frame->FromDIP(row.expected.GetSize()));
    CloseFrame();

    // Closing in normal state writes what the frame had, and Max = 0; the
    // values survive a new configuration object (they reached the file).
    ReopenConfig();
    wxConfigBase* config = wxConfigBase::Get();
    EXPECT_EQ(config->ReadLong("/MainWindow/x", -1), row.expected.x);
    EXPECT_EQ(config->ReadLong("/MainWindow/y", -1), row.expected.y);
    EXPECT_EQ(config->ReadLong("/MainWindow/w", -1), row.expected.width);
    EXPECT_EQ(config->ReadLong("/MainWindow/h", -1), row.expected.height);
    EXPECT_EQ(config->ReadLong("/MainWindow/Max", -1), 0);
  }
}

TEST_F(WindowTest, FrameCannotShrinkBelowMinimum) {
  OpenFrame();
  EXPECT_EQ(frame->GetMinSize(), frame->FromDIP(wxSize(512, 512)));
  frame->SetSize(300, 200);
  Flush();
  EXPECT_EQ(frame->GetSize(), frame->FromDIP(wxSize(512, 512)));
}

// Minimized and maximized states need a window manager, which the test
// display does not have; the rules are checked on the writer itself.
TEST_F(WindowTest, ClosingStateDecidesWhatIsWritten) {
  struct Row {
    const char* what;
    bool iconized, maximized;
    long x, w, max;  // what the store holds afterwards
  };
  const Row rows[] = {
      {"normal: the whole geometry and Max = 0", false, false, 70, 900, 0},
      {"maximized: only Max = 1", false, true, 11, 811, 1},
      {"minimized: nothing", true, false, 11, 811, 5},
      {"minimized and maximized: nothing", true, true, 11, 811, 5},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    wxConfigBase* config = wxConfigBase::Get();
    config->Write("/MainWindow/x", 11L);
    config->Write("/MainWindow/w", 811L);
    config->Write("/MainWindow/Max", 5L);
    WriteFrameGeometry(config, row.iconized, row.maximized, wxPoint(70, 80), wxSize(900, 700));
    EXPECT_EQ(config->ReadLong("/MainWindow/x", -1), row.x);
    EXPECT_EQ(config->ReadLong("/MainWindow/w", -1), row.w);
    EXPECT_EQ(config->ReadLong("/MainWindow/Max", -1), row.max);
  }
}

TEST_F(WindowTest, SashPositionIsRestoredTracedAndSavedInDips) {
  struct Row {
    const char* what;
    std::optional<long> stored;
    int expected;
  };
  const Row rows[] = {
      {"first start: 300", std::nullopt, 300},
      {"stored position", 250L, 250},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    if (row.stored) wxConfigBase::Get()->Write("/MainWindow/Splitter", *row.stored);
    ResetProgramState();
    OpenFrame();
    EXPECT_EQ(panel()->GetSashPosition(), panel()->FromDIP(row.expected));
    CloseFrame();
  }

  ResetProgramState();
  OpenFrame();
  Docuvane* p = panel();
  MessageCapture messages;
  wxUIActionSimulator sim;
  auto drag = [&](int toX) {
    const int y = p->GetClientSize().y / 2;
    const int grab = p->GetSashSize() / 2;
    int x = p->GetSashPosition() + grab;
    sim.MouseMove(p->ClientToScreen(wxPoint(x, y)));
    Flush();
    sim.MouseDown();
    Flush();
    // Live update moves the sash with the pointer; follow it step by step.
    const int target = std::max(toX - grab, p->GetMinimumPaneSize());
    while (x != toX) {
      x += std::max(-30, std::min(30, toX - x));
      sim.MouseMove(p->ClientToScreen(wxPoint(x, y)));
      Flush();
    }
    WaitFor([&] { return std::abs(p->GetSashPosition() - target) <= 2; }, 1000);
    sim.MouseUp();
  };
  auto sashTraces = [&] {
    std::vector<testing_support::CapturedMessage> found;
    for (const auto& m : messages.messages())
      if (m.prefix == "INFO: Docuvane::OnSashMOve ") found.push_back(m);
    return found;
  };

  const int start = p->GetSashPosition();
  drag(start + p->GetSashSize() / 2 + 120);
  ASSERT_TRUE(WaitFor([&] { return !sashTraces().empty(); })) << "no sash trace";
  Flush();
  auto traces = sashTraces();
  ASSERT_EQ(traces.size(), 1u) << "one trace per completed move";
  const wxSize w1 = p->GetWindow1()->GetSize(), w2 = p->GetWindow2()->GetSize();
  char expected[128];
  std::snprintf(expected, sizeof expected, "sash pos=%d, w1=%dx%d, w2=%dx%d", p->GetSashPosition(), w1.x,
                w1.y, w2.x, w2.y);
  EXPECT_EQ(traces[0].text, expected);
  EXPECT_EQ(traces[0].level, 3);
  EXPECT_NEAR(p->GetSashPosition(), start + 120, 2);

  // Not closer than the minimum pane size to either edge.
  messages.clear();
  drag(2);
  ASSERT_TRUE(WaitFor([&] { return !sashTraces().empty(); }));
  EXPECT_EQ(p->GetSashPosition(), 20);
  messages.clear();
  drag(p->GetClientSize().x - 2);
  ASSERT_TRUE(WaitFor([&] { return !sashTraces().empty(); }));
  EXPECT_EQ(p->GetClientSize().x - p->GetSashPosition() - p->GetSashSize(), 20);

  const int finalPosition = p->GetSashPosition();
  const int finalDip = p->ToDIP(finalPosition);
  CloseFrame();
  EXPECT_EQ(wxConfigBase::Get()->ReadLong("/MainWindow/Splitter", -1), finalDip);
}

TEST_F(WindowTest, HelpInternetAboutAreTextButtonsWithoutIcons) {
  OpenFrame();
  const struct {
    int id;
    const char* label;
    const char* tip;
  } rows[] = {
      {wxID_HELP, "&Help", "Help on using the program"},
      {ID_INTERNET, "&Internet", "Go to internet based document collection."},
      {wxID_ABOUT, "&About", "About Docuvane"},
      {ID_GOTO, "&Go To", "Go to the selected destination"},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.label);
    auto* button = wxDynamicCast(wxWindow::FindWindowById(row.id, frame), wxButton);
    ASSERT_NE(button, nullptr);
    EXPECT_EQ(wxDynamicCast(button, wxBitmapButton), nullptr);
    EXPECT_EQ(button->GetLabel(), row.label);
    EXPECT_EQ(button->GetToolTipText(), row.tip);
  }
}

TEST_F(WindowTest, IconFilesGiveSquarePictureButtons) {
  for (const char* name : {"help-contents", "internet-web-browser", "help-about"})
    WriteIcon(tree.texmf + "/Docuvane/icons/" + name + ".png", wxBITMAP_TYPE_PNG);
  OpenFrame();
  const int h = panel()->m_gotoButton->GetSize().y;
  for (int id : {int(wxID_HELP), int(ID_INTERNET), int(wxID_ABOUT)}) {
    SCOPED_TRACE(id);
    auto* button = wxDynamicCast(wxWindow::FindWindowById(id, frame), wxBitmapButton);
    ASSERT_NE(button, nullptr) << "a picture button";
    EXPECT_EQ(button->GetSize(), wxSize(h, h));
    EXPECT_FALSE(button->GetToolTipText().empty());
    EXPECT_TRUE(button->GetBitmapLabel().IsOk());
    // PNG pictures keep their grey.
    EXPECT_FALSE(TransparentAt(button->GetBitmapLabel(), 0, 0));
  }
}

TEST_F(WindowTest, MakeIconButtonMasksGreyOfBmpFilesOnly) {
  OpenFrame();
  const std::string icons = tree.texmf + "/Docuvane/icons/";
  WriteIcon(icons + "grey.png", wxBITMAP_TYPE_PNG);
  WriteIcon(icons + "grey.BMP", wxBITMAP_TYPE_BMP);
  WriteIcon(icons + "grey2.bmp", wxBITMAP_TYPE_BMP);
  tree.root.Write("texmf/Docuvane/icons/broken.png", "not a picture");
  TrovResetCaches();
  struct Row {
    const char* what;
    const char* icon;
    bool picture;      // a bitmap button
    bool hasBitmap;    // with a picture in it
    bool greyClear;    // the grey corner is transparent
  };
  const Row rows[] = {
      {"PNG: grey stays", "grey.png", true, true, false},
      {"upper-case .BMP: grey masked", "grey.BMP", true, true, true},
      {"lower-case .bmp: grey masked", "grey2.bmp", true, true, true},
      {"unreadable file: picture button without picture", "broken.png", true, false, true},
      {"no file: text button", "missing-icon", false, false, true},
  };
  wxWindow* parent = panel()->m_gotoButton->GetParent();
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    wxButton* button = Docuvane::MakeIconButton(parent, wxID_ANY, "&Label", row.icon, "tip", wxSize(30, 30));
    ASSERT_NE(button, nullptr);
    auto* picture = wxDynamicCast(button, wxBitmapButton);
    EXPECT_EQ(picture != nullptr, row.picture);
    EXPECT_EQ(button->GetToolTipText(), "tip");
    if (picture) {
      EXPECT_EQ(picture->GetBitmapLabel().IsOk(), row.hasBitmap);
      if (row.hasBitmap) {
        EXPECT_EQ(TransparentAt(picture->GetBitmapLabel(), 0, 0), row.greyClear);
        EXPECT_FALSE(TransparentAt(picture->GetBitmapLabel(), 8, 8));
      }
      EXPECT_EQ(button->GetSize(), wxSize(30, 30));
    } else {
      EXPECT_EQ(button->GetLabel(), "&Label");
    }
    button->Destroy();
  }
  // A NULL or empty tool tip sets none.
  for (const char* tip : {static_cast<const char*>(nullptr), ""}) {
    wxButton* button = Docuvane::MakeIconButton(parent, wxID_ANY, "&X", "missing-icon", tip, wxSize(30, 30));
    EXPECT_EQ(button->GetToolTip(), nullptr);
    button->Destroy();
  }
}

TEST_F(WindowTest, AboutDialogShowsTitleVersionAndOptionalLogo) {
  OpenFrame();
  for (bool logo : {false, true}) {
    SCOPED_TRACE(logo ? "with a logo" : "without a logo");
    if (logo) {
      WriteIcon(tree.texmf + "/Docuvane/Docuvane.png", wxBITMAP_TYPE_PNG);
      TrovResetCaches();
    }
    AboutDlg dialog(frame);
    EXPECT_EQ(dialog.GetTitle(), "About ...");
    std::vector<wxString> texts;
    wxStaticText* title = nullptr;
    int bitmaps = 0;
    for (wxWindow* child : dialog.GetChildren()) {
      if (auto* text = wxDynamicCast(child, wxStaticText)) {
        texts.push_back(text->GetLabel());
        if (!title) title = text;
      }
      if (wxDynamicCast(child, wxStaticBitmap)) ++bitmaps;
    }
    EXPECT_EQ(bitmaps, logo ? 1 : 0);
    ASSERT_GE(texts.size(), 4u);
    EXPECT_EQ(texts[0], "Lomari Docuvane");
    EXPECT_EQ(texts[1], "Lomari TeX Documentation Organizer");
    EXPECT_EQ(texts[2], "Version 5.0 (2011/03/17)");
    EXPECT_TRUE(texts[3].Contains("Copyright"));
    ASSERT_NE(title, nullptr);
    EXPECT_EQ(title->GetFont().GetWeight(), wxFONTWEIGHT_BOLD);
    EXPECT_EQ(title->GetForegroundColour(), wxColour(128, 0, 128));
    EXPECT_EQ(dialog.GetFont().GetPointSize(), 10);
    auto* close = wxDynamicCast(dialog.FindWindow(wxID_CANCEL), wxButton);
    ASSERT_NE(close, nullptr);
    EXPECT_EQ(close->GetLabel(), "Close");
  }
}

}  // namespace
}  // namespace gui_testing
