// The main window on a test tree: catalogue tree, word list, status line,
// geometry and sash kept in the configuration store, icon buttons.
#include <gtest/gtest.h>
#include <wx/bmpbuttn.h>
#include <wx/image.h>
#include <wx/listbox.h>
#include <wx/statusbr.h>
#include <wx/treectrl.h>

#include "gui_support.h"
#include "window/ids.h"
#include "window/qlistbox.h"

namespace gui_testing {
namespace {

// The tree as indented text, two blanks per level.
std::string Outline(wxTreeCtrl* tree, const wxTreeItemId& parent, int depth = 0) {
  std::string out;
  wxTreeItemIdValue cookie;
  for (wxTreeItemId child = tree->GetFirstChild(parent, cookie); child.IsOk();
       child = tree->GetNextSibling(child))
    out += std::string(2 * depth, ' ') + tree->GetItemText(child).utf8_string() + "\n" +
           Outline(tree, child, depth + 1);
  return out;
}

TEST_F(WindowTest, ShowsCatalogueTreeWordListAndCounts) {
  MessageCapture messages;
  OpenFrame();
  Docuvane* p = panel();
  // Categories in table order; labels follow under nodes named after their directories.
  EXPECT_EQ(Outline(p->m_tree, p->m_tree->GetRootItem()),
            "Manuals\n  LaTeX\n    Guide\n    Reference\n  Fonts\n    Catalogue\nHelp\n  Docuvane\n"
            "latex\n  base\n    sample.pdf\nfonts\n  fontguide.pdf\nmath\n  amsldoc.pdf\n");
  // Sorted ignoring case and one leading backslash or brace; no '@' word.
  std::vector<std::string> rows;
  for (int i = -1; i <= static_cast<int>(p->m_wordList->GetItemCount()); ++i)
    rows.push_back(p->m_wordList->GetString(i).utf8_string());
  EXPECT_EQ(rows, (Args{"", "{align}", "\\alpha", "\\begin", "\\section", "\\sectionmark",
                        "tabular", ""}));
  EXPECT_TRUE(messages.Contains("WARNING: Skipped index word: \\@ifnextchar"));
  EXPECT_EQ(frame->GetStatusBar()->GetStatusText(0),
            "There are 7 documents including 4 TeX commands and 1 LaTeX environments.");
  EXPECT_EQ(frame->GetIcons().GetIconCount(), 5u) << "the compiled-in icon, 16 to 256 pixels";
  EXPECT_FALSE(p->m_gotoButton->IsEnabled());
  EXPECT_EQ(p->m_targetList->GetCount(), 0u);

  std::filesystem::remove(texmf + "/Update/command.Index");
  ReopenFrame();
  EXPECT_EQ(panel()->m_wordList->GetItemCount(), 0u) << "without a word index";
  EXPECT_EQ(frame->GetStatusBar()->GetStatusText(0),
            "There are 4 documents including 0 TeX commands and 0 LaTeX environments.");
}

TEST_F(WindowTest, GeometryIsRestoredClampedToTheScreenAndSaved) {
  ASSERT_EQ(VirtualScreenSize(), wxSize(1600, 1200))
      << "the tests expect run-with-display's screen";
  const struct {
    const char* what;
    std::optional<wxRect> stored;  // DIPs
    wxRect expected;
  } rows[] = {
      // clang-format off
      {"first start: 50, 50, 800 x 600", std::nullopt, {50, 50, 800, 600}},
      {"smaller than the default: the default", wxRect(100, 120, 600, 500), {100, 120, 800, 600}},
      {"fits: kept", wxRect(200, 100, 1000, 700), {200, 100, 1000, 700}},
      {"too wide: as wide as the screen, at 0", wxRect(300, 40, 3000, 700), {0, 40, 1600, 700}},
      {"too tall: as tall as the screen, at 0", wxRect(10, 400, 900, 5000), {10, 0, 900, 1200}},
      {"left of and above the screen: moved to 0", wxRect(-200, -30, 900, 650), {0, 0, 900, 650}},
      {"past right and bottom: moved back", wxRect(1500, 1100, 800, 600), {800, 600, 800, 600}},
      // clang-format on
  };
  const char* const keys[] = {"/MainWindow/x", "/MainWindow/y", "/MainWindow/w", "/MainWindow/h",
                              "/MainWindow/Max"};
  auto parts = [](const wxRect& r) { return std::vector<long>{r.x, r.y, r.width, r.height, 0}; };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.what);
    for (int i = 0; row.stored && i < 4; ++i)
      wxConfigBase::Get()->Write(keys[i], parts(*row.stored)[i]);
    ResetProgramState();
    OpenFrame();
    EXPECT_EQ(frame->GetRect(), wxRect(frame->FromDIP(row.expected.GetPosition()),
                                       frame->FromDIP(row.expected.GetSize())));
    CloseFrame();
    ReopenConfig();  // what closing wrote reached the file; the next row overwrites it
    std::vector<long> saved;
    for (const char* key : keys) saved.push_back(wxConfigBase::Get()->ReadLong(key, -1));
    EXPECT_EQ(saved, parts(row.expected));
  }
}

// Minimized and maximized need a window manager, which the test display lacks.
TEST_F(WindowTest, ClosingStateDecidesWhatIsWritten) {
  const struct {
    const char* what;
    bool iconized, maximized;
    std::vector<long> stored;  // x, w and Max afterwards
  } rows[] = {
      {"normal: the whole geometry and Max = 0", false, false, {70, 900, 0}},
      {"maximized: only Max = 1", false, true, {11, 811, 1}},
      {"minimized: nothing", true, false, {11, 811, 5}},
      {"minimized and maximized: nothing", true, true, {11, 811, 5}},
  };
  const char* const keys[] = {"/MainWindow/x", "/MainWindow/w", "/MainWindow/Max"};
  const long before[] = {11, 811, 5};
  wxConfigBase* config = wxConfigBase::Get();
  for (const auto& row : rows) {
    SCOPED_TRACE(row.what);
    for (int i = 0; i < 3; ++i) config->Write(keys[i], before[i]);
    WriteFrameGeometry(config, row.iconized, row.maximized, wxPoint(70, 80), wxSize(900, 700));
    std::vector<long> stored;
    for (const char* key : keys) stored.push_back(config->ReadLong(key, -1));
    EXPECT_EQ(stored, row.stored);
  }
}

TEST_F(WindowTest, SashPositionIsSavedAndRestoredInDips) {
  OpenFrame();
  EXPECT_EQ(panel()->GetSashPosition(), panel()->FromDIP(300)) << "first start";
  panel()->SetSashPosition(panel()->FromDIP(420));
  ReopenFrame();
  EXPECT_EQ(wxConfigBase::Get()->ReadLong("/MainWindow/Splitter", -1), 420);
  EXPECT_EQ(panel()->GetSashPosition(), panel()->FromDIP(420));
}

TEST_F(WindowTest, IconFilesMakeSquarePictureButtons) {
  const struct {
    int id;
    const char *label, *file;  // the icon file of the second start
    bool picture, greyClear;   // a picture in the file; its light grey masked out
  } buttons[] = {
      {wxID_HELP, "&Help", "help-contents.png", true, false},
      {ID_INTERNET, "&Internet", "internet-web-browser.bmp", true, true},
      {wxID_ABOUT, "&About", "help-about.png", false, false},
  };
  wxImage image(16, 16);  // light grey with a red square in the middle
  image.SetRGB(wxRect(0, 0, 16, 16), 192, 192, 192);
  image.SetRGB(wxRect(4, 4, 8, 8), 200, 0, 0);
  for (bool installed : {false, true}) {
    SCOPED_TRACE(installed ? "with icon files" : "without icon files");
    for (const auto& b : buttons) {
      if (!installed) continue;
      const std::string path =
          root.Write("texmf/Docuvane/icons/" + std::string(b.file), "not a picture");
      if (b.picture) { ASSERT_TRUE(image.SaveFile(path)); }
    }
    ReopenFrame();
    const int h = panel()->m_gotoButton->GetSize().y;
    for (const auto& b : buttons) {
      SCOPED_TRACE(b.file);
      auto* button = wxDynamicCast(wxWindow::FindWindowById(b.id, frame), wxButton);
      ASSERT_NE(button, nullptr);
      EXPECT_FALSE(button->GetToolTipText().empty());
      auto* picture = wxDynamicCast(button, wxBitmapButton);
      ASSERT_EQ(picture != nullptr, installed) << "a picture button exactly when the file exists";
      if (!picture) {
        EXPECT_EQ(button->GetLabel(), b.label);
        continue;
      }
      EXPECT_EQ(button->GetSize(), wxSize(h, h));
      const wxBitmap bitmap = picture->GetBitmapLabel();
      ASSERT_EQ(bitmap.IsOk(), b.picture);
      if (!b.picture) continue;
      EXPECT_EQ(bitmap.ConvertToImage().IsTransparent(0, 0), b.greyClear) << "only BMP lose grey";
      EXPECT_FALSE(bitmap.ConvertToImage().IsTransparent(8, 8));
    }
  }
}

}  // namespace
}  // namespace gui_testing
