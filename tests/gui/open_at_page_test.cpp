// A double-click on a location opens its document where the location says:
// through the sample tree's PDF template and docuvane-open to a viewer.
#include <gtest/gtest.h>
#include <wx/listbox.h>
#include <wx/srchctrl.h>
#include <wx/uiaction.h>

#include "gui_support.h"

namespace gui_testing {
namespace {

TEST_F(WindowTest, DoubleClickOnALocationOpensTheViewerAtItsPlace) {
  char pdf[64];
  GetPrivateProfileStringA("Extensions", "pdf", "", pdf, sizeof pdf,
                           DOCUVANE_SHARE_SOURCE "/texmf/Docuvane/Docuvane.ini");
  root.Write("texmf/Docuvane/Docuvane.ini", std::string("[DOC]\nManuals>LaTeX>Guide=guide.pdf\n"
                                                        "[Extensions]\npdf=") +
                                                pdf + "\n");
  std::filesystem::create_symlink(DOCUVANE_OPEN, root / "bin/docuvane-open");
  const std::string record = root / "evince-record";
  std::filesystem::permissions(
      root.Write("bin/evince", "#!/bin/sh\nprintf '%s\\0' \"$@\" >'" + record + ".part'\nmv '" +
                                   record + ".part' '" + record + "'\n"),
      std::filesystem::perms::owner_all);
  env.emplace_back("DOCUVANE_VIEWER", "evince");
  OpenFrame();
  frame->Raise();
  panel()->m_search->SetValue("\\section");
  wxListBox* list = panel()->m_targetList;
  ASSERT_TRUE(WaitFor([&] { return list->GetCount() == 4; }));

  // Double-clicks a row of the Locations; what the viewer was started with.
  auto open = [&, sim = wxUIActionSimulator()](int row) mutable {
    int y = 1;
    while (y < list->GetClientSize().y && list->HitTest(wxPoint(20, y)) != row) ++y;
    sim.MouseMove(list->ClientToScreen(wxPoint(20, y + 3)));
    Flush();
    sim.MouseDblClick();
    WaitFor([&] { return std::filesystem::exists(record); }, 10000);
    std::ifstream in(record, std::ios::binary);
    Args words;
    for (std::string word; std::getline(in, word, '\0');) words.push_back(word);
    std::filesystem::remove(record);
    return words;
  };
  // The Locations: guide.pdf#sec:headings, guide.pdf#sec:section, sample.pdf#page=12 15 , ...
  EXPECT_EQ(open(2), (Args{"-i", "12", texmf + "/doc/latex/base/sample.pdf"}));
  EXPECT_EQ(open(1), (Args{"-n", "sec:section", texmf + "/doc/latex/guide/guide.pdf"}));
}

}  // namespace
}  // namespace gui_testing
