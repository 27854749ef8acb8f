// The program's only top-level window: it restores its geometry, holds the
// help panel, has the catalogue collected and shows the counts.
#pragma once

#include <wx/frame.h>
#include <wx/gdicmn.h>

// "Lomari Docuvane": the main frame's title, shown by the About dialog too.
extern const char* AppTitle;

class Docuvane;
class wxConfigBase;

class MyFrame : public wxFrame {
 public:
  explicit MyFrame(const wxString& title);
  ~MyFrame() override;

  Docuvane* m_helpPanel = nullptr;

  void OnQuit(wxCommandEvent& event);
  void OnAbout(wxCommandEvent& event);
  void OnHelp(wxCommandEvent& event);
  void OnInternet(wxCommandEvent& event);

  // Loads the settings, the word index and the catalogue again and shows
  // them, as after a start (a scan has just replaced them).
  void Reload_Catalogue();

 private:
  // "There are ... documents ..." in the status bar.
  void ShowCounts();

  wxDECLARE_EVENT_TABLE();
};

// The size of the bounding box of all monitors.
wxSize VirtualScreenSize();

// Where a frame with the stored geometry (pixels) opens on a screen of the
// given size: at least the default size, at most the screen, moved inside it.
wxRect ClampFrameGeometry(const wxRect& stored, const wxSize& defaultSize, const wxSize& screen);

// What closing stores under "/MainWindow" (position and size in DIPs):
// nothing when minimized, only Max = 1 when maximized, else x, y, w, h and
// Max = 0.
void WriteFrameGeometry(wxConfigBase* config, bool iconized, bool maximized,
                        const wxPoint& position, const wxSize& size);
