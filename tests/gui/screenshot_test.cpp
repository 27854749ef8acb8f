// A picture of the real window on the sample tree, for looking at by eye.
// Runs only when DOCUVANE_SCREENSHOT names the PNG file to write.
#include <gtest/gtest.h>
#include <wx/dcmemory.h>
#include <wx/dcscreen.h>
#include <wx/srchctrl.h>

#include "gui_support.h"

namespace gui_testing {
namespace {

TEST(Screenshot, SampleTree) {
  const char* out = std::getenv("DOCUVANE_SCREENSHOT");
  if (!out) GTEST_SKIP() << "set DOCUVANE_SCREENSHOT to the PNG file to write";
  TempDir home;
  ScopedEnv homeEnv("HOME", home.path());
  ScopedEnv texmf("TEXMF", std::string(DOCUVANE_SAMPLE_TEXMF));
  ScopedEnv cache("XDG_CACHE_HOME", home / "cache");
  ResetProgramState();
  ReopenConfig();
  Docuvane_Init();
  MyFrame* frame = new MyFrame("Lomari Docuvane");
  frame->Show();
  WaitFor([&] { return frame->IsShownOnScreen(); });
  frame->m_helpPanel->m_search->SetValue(std::getenv("DOCUVANE_SCREENSHOT_WORD") ? std::getenv("DOCUVANE_SCREENSHOT_WORD") : "\\sec");
  WaitFor([] { return false; }, 500);  // let it paint

  const wxRect area(0, 0, frame->GetPosition().x + frame->GetSize().x + 50,
                    frame->GetPosition().y + frame->GetSize().y + 50);
  wxScreenDC screen;
  wxBitmap shot(area.width, area.height);
  {
    wxMemoryDC memory(shot);
    memory.Blit(0, 0, area.width, area.height, &screen, 0, 0);
  }
  EXPECT_TRUE(shot.SaveFile(out, wxBITMAP_TYPE_PNG));
  delete frame;
  delete wxConfigBase::Set(nullptr);
}

}  // namespace
}  // namespace gui_testing
