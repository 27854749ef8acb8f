// The main frame: geometry kept between runs, the help panel, the catalogue
// and the counts in the status bar.
#include "window/frame.h"

#include <wx/config.h>
#include <wx/iconbndl.h>
#include <wx/image.h>
#include <wx/listbox.h>
#include <wx/mstream.h>
#include <wx/treectrl.h>

#include <cstdio>

#include "access/desktop_services_gui.h"
#include "access/start_page.h"
#include "base/settings.h"
#include "base/trace.h"
#include "catalogue/documents.h"
#include "catalogue/tables.h"
#include "docuvane_icons.h"
#include "platform/winapi.h"
#include "trovlib/trovlib.h"
#include "window/about.h"
#include "window/ids.h"
#include "window/panel.h"
#include "window/qlistbox.h"
#include "window/scan_dialog.h"
#include "window/tree_nodes.h"
#include "wordindex/locate.h"
#include "wordindex/wordlist.h"

const char* AppTitle = "Lomari Docuvane";

namespace {

constexpr long kDefaultX = 50, kDefaultY = 50, kDefaultW = 800, kDefaultH = 600;
constexpr int kMinimumDip = 512;

// The icon images compiled in from res/.
wxIconBundle ApplicationIcons() {
  if (!wxImage::FindHandler(wxBITMAP_TYPE_PNG)) wxImage::AddHandler(new wxPNGHandler);
  wxIconBundle icons;
  for (const EmbeddedImage& embedded : kDocuvaneIconImages) {
    wxMemoryInputStream stream(embedded.data, embedded.size);
    wxImage image;
    if (!image.LoadFile(stream, wxBITMAP_TYPE_PNG)) continue;
    wxIcon icon;
    icon.CopyFromBitmap(wxBitmap(image));
    icons.AddIcon(icon);
  }
  return icons;
}

}  // namespace

// clang-format off
wxBEGIN_EVENT_TABLE(MyFrame, wxFrame)
  EVT_MENU(wxID_EXIT, MyFrame::OnQuit)
  EVT_MENU(wxID_CLOSE, MyFrame::OnQuit)
  EVT_MENU(wxID_ABOUT, MyFrame::OnAbout)
  EVT_MENU(ID_INTERNET, MyFrame::OnInternet)
  EVT_MENU(wxID_HELP, MyFrame::OnHelp)
  EVT_BUTTON(wxID_ABOUT, MyFrame::OnAbout)
  EVT_BUTTON(ID_INTERNET, MyFrame::OnInternet)
  EVT_BUTTON(wxID_HELP, MyFrame::OnHelp)
wxEND_EVENT_TABLE()
// clang-format on

MyFrame::MyFrame(const wxString& title)
    : wxFrame(nullptr, wxID_ANY, title, wxDefaultPosition, wxDefaultSize, wxDEFAULT_FRAME_STYLE,
              wxFrameNameStr) {
  long x = kDefaultX, y = kDefaultY, w = kDefaultW, h = kDefaultH;
  if (wxConfigBase* config = wxConfigBase::Get()) {
    config->SetPath("/MainWindow");
    x = config->ReadLong("x", kDefaultX);
    y = config->ReadLong("y", kDefaultY);
    w = config->ReadLong("w", kDefaultW);
    h = config->ReadLong("h", kDefaultH);
  }
  const wxPoint storedPosition = FromDIP(wxPoint(static_cast<int>(x), static_cast<int>(y)));
  const wxSize storedSize = FromDIP(wxSize(static_cast<int>(w), static_cast<int>(h)));
  const wxSize screen = VirtualScreenSize();
  SetMinSize(FromDIP(wxSize(kMinimumDip, kMinimumDip)));
  const wxRect geometry = ClampFrameGeometry(wxRect(storedPosition, storedSize),
                                             FromDIP(wxSize(kDefaultW, kDefaultH)), screen);
  Move(geometry.GetPosition());
  SetSize(geometry.GetSize());

  const wxIconBundle icons = ApplicationIcons();
  if (icons.GetIconCount() > 0) SetIcons(icons);
  SetFont(wxFont(10, wxFONTFAMILY_DEFAULT, wxFONTSTYLE_NORMAL, wxFONTWEIGHT_NORMAL, false,
                 wxEmptyString, wxFONTENCODING_DEFAULT));

  CreateStatusBar(1);
  SetStatusText("There are # documents including # TeX commands and # LaTeX environments.", 0);

  TraceMessage("Docuvane::Frame --- ", "Creating Helper ...");
  // Created at the size the frame gives its only child anyway: split at its
  // sash position inside a default-sized window, GTK would be asked to lay
  // out the panes at negative sizes.
  m_helpPanel = new Docuvane(this, wxDefaultPosition, GetClientSize());
  TraceMessage("Docuvane::Frame --- ", "Collect_Documents ...");
  Collect_Documents();
  TraceMessage("Docuvane::Frame --- ", "Fill_Tree ...");
  Fill_Tree(m_helpPanel);
  TraceMessage("Docuvane::Frame --- ", "Fill_WordIndex ...");
  TraceMessage("Docuvane::Frame --- ", "Post.");
  ShowCounts();
  TraceMessage("Docuvane::Frame --- ", "End.");
  // Once the window is up: a TeX installation without the user's index
  // yet gets the offer to build it.
  CallAfter([this] {
    if (ShouldOfferDocumentationScan()) OfferDocumentationScan(this);
  });
}

void MyFrame::ShowCounts() {
  char summary[160];
  std::snprintf(summary, sizeof summary,
                "There are %d documents including %d TeX commands and %d LaTeX environments.",
                DocumentCount, CommandWordCount, EnvironmentWordCount);
  SetStatusText(summary, 0);
}

void MyFrame::Reload_Catalogue() {
  // The windows point into the tables: empty them first.
  Docuvane* panel = m_helpPanel;
  if (panel->m_targetList) panel->m_targetList->Clear();
  if (panel->m_treeNodes) panel->m_treeNodes->Clear();
  if (panel->m_wordList) panel->m_wordList->SetItemCount(0);
  Clear_Tables();
  Docuvane_Init(OpenInstalledWordIndex);
  if (panel->m_wordList) panel->m_wordList->Refill();
  Collect_Documents();
  Fill_Tree(panel);
  ShowCounts();
}

wxSize VirtualScreenSize() {
  return wxSize(GetSystemMetrics(SM_CXVIRTUALSCREEN), GetSystemMetrics(SM_CYVIRTUALSCREEN));
}

wxRect ClampFrameGeometry(const wxRect& stored, const wxSize& defaultSize, const wxSize& screen) {
  wxRect r = stored;
  // The lower bound is the default size, not the minimum size.
  r.width = stored.width < defaultSize.x ? defaultSize.x : std::min(stored.width, screen.x);
  r.height = stored.height < defaultSize.y ? defaultSize.y : std::min(stored.height, screen.y);
  if (r.x < 0)
    r.x = 0;
  else if (r.x + r.width > screen.x)
    r.x = screen.x - r.width;
  if (r.y < 0)
    r.y = 0;
  else if (r.y + r.height > screen.y)
    r.y = screen.y - r.height;
  return r;
}

MyFrame::~MyFrame() {
  WriteFrameGeometry(wxConfigBase::Get(), IsIconized(), IsMaximized(), ToDIP(GetPosition()),
                     ToDIP(GetSize()));
}

void WriteFrameGeometry(wxConfigBase* config, bool iconized, bool maximized,
                        const wxPoint& position, const wxSize& size) {
  // A minimized frame has no geometry worth keeping; a maximized one keeps
  // the last normal geometry for the next start.
  if (!config || iconized) return;
  if (maximized) {
    config->Write("/MainWindow/Max", 1L);
    return;
  }
  config->Write("/MainWindow/x", static_cast<long>(position.x));
  config->Write("/MainWindow/y", static_cast<long>(position.y));
  config->Write("/MainWindow/w", static_cast<long>(size.x));
  config->Write("/MainWindow/h", static_cast<long>(size.y));
  config->Write("/MainWindow/Max", 0L);
}

void MyFrame::OnQuit(wxCommandEvent&) { Close(true); }

void MyFrame::OnAbout(wxCommandEvent&) {
  AboutDlg dialog(this);
  dialog.ShowModal();
}

void MyFrame::OnHelp(wxCommandEvent&) {
  TrovMessage("INFO: MyFrame::OnHelp", "", 2);
  ::ProcessCommand(m_helpPanel, ".LMR.Help", 1);
}

void MyFrame::OnInternet(wxCommandEvent&) {
  TrovMessage("INFO: MyFrame::OnInternet", "", 2);
  DesktopAccessServices services(this);
  OpenStartPage(services);
}
