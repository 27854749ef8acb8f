// The help panel's controls, their layout and the remembered sash position.
#include "window/panel.h"

#include <wx/bmpbuttn.h>
#include <wx/button.h>
#include <wx/config.h>
#include <wx/image.h>
#include <wx/listbox.h>
#include <wx/panel.h>
#include <wx/settings.h>
#include <wx/sizer.h>
#include <wx/srchctrl.h>
#include <wx/stattext.h>
#include <wx/treectrl.h>

#include <cctype>
#include <cstdio>
#include <string>

#include "catalogue/documents.h"
#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"
#include "window/ids.h"
#include "window/picture.h"
#include "window/qlistbox.h"
#include "window/tree_nodes.h"

namespace {

constexpr long kDefaultSashDip = 300;
constexpr int kGap = 12;

}  // namespace

// clang-format off
wxBEGIN_EVENT_TABLE(Docuvane, wxSplitterWindow)
  EVT_TREE_ITEM_ACTIVATED(ID_TREE, Docuvane::OnTreeActivate)
  EVT_LISTBOX(ID_WORD_LIST, Docuvane::OnIndexChanged)
  EVT_BUTTON(ID_OPEN_DOC, Docuvane::OnOpenDoc)
  EVT_LISTBOX(ID_TARGET_LIST, Docuvane::OnTargetChanged)
  EVT_LISTBOX_DCLICK(ID_TARGET_LIST, Docuvane::OnTargetActivate)
  EVT_TEXT(ID_SEARCH, Docuvane::OnSearch)
  EVT_BUTTON(ID_GOTO, Docuvane::OnGotoTarget)
  EVT_SPLITTER_SASH_POS_CHANGED(ID_SPLITTER, Docuvane::OnSashMove)
wxEND_EVENT_TABLE()
// clang-format on

Docuvane::Docuvane(wxWindow* parent, const wxPoint& pos, const wxSize& size) {
  Create(parent, ID_SPLITTER, pos, size, wxSP_3DSASH | wxSP_LIVE_UPDATE, "splitter");
  const wxColour menuColour = wxSystemSettings::GetColour(wxSYS_COLOUR_MENU);

  wxConfigBase* config = wxConfigBase::Get();
  long sashDip = kDefaultSashDip;
  if (config) {
    config->SetPath("/MainWindow");
    sashDip = config->ReadLong("Splitter", kDefaultSashDip);
  }
  const int sashPosition = FromDIP(static_cast<int>(sashDip));
  m_splitter = this;

  m_tree = new wxTreeCtrl(
      this, ID_TREE, wxDefaultPosition, wxSize(100, 100),
      wxTR_HAS_BUTTONS | wxTR_LINES_AT_ROOT | wxTR_HIDE_ROOT | wxBORDER_STATIC | wxCLIP_CHILDREN,
      wxDefaultValidator, "treeCtrl");
  m_tree->SetBackgroundColour(menuColour);
  m_treeNodes.reset(new TreeNodes(m_tree));
  // A document's own title, where it has one, as the tool tip of its item.
  m_tree->Bind(wxEVT_TREE_ITEM_GETTOOLTIP, [this](wxTreeEvent& event) {
    const void* item = m_treeNodes->NodeOf(event.GetItem());
    for (int i = 0; item != nullptr && i < DocumentCount; ++i)
      if (DocumentTable[i].TreeItem == item) {
        const std::string title = DocumentTitle(DocumentTable[i]);
        if (!title.empty()) event.SetToolTip(ToWx(title));
        return;
      }
  });
  // The initial size would also become the tree's minimum width; the sash
  // is bounded by the splitter's minimum pane size alone.
  m_tree->SetMinSize(wxDefaultSize);

  wxPanel* pane = new wxPanel(m_splitter, wxID_ANY, wxDefaultPosition, wxDefaultSize,
                              wxBORDER_STATIC | wxTAB_TRAVERSAL);
  wxBoxSizer* column = new wxBoxSizer(wxVERTICAL);

  column->AddSpacer(kGap);
  wxStaticText* title =
      new wxStaticText(pane, wxID_ANY, "Index of (La)TeX Commands and Environments",
                       wxDefaultPosition, wxDefaultSize, wxALIGN_CENTRE_HORIZONTAL);
  title->SetFont(title->GetFont().Bold());
  title->SetForegroundColour(wxColour(0, 0, 100));
  column->Add(title, 0, wxEXPAND | wxALL, 0);
  column->AddSpacer(kGap);

  wxStaticText* wordPrompt =
      new wxStaticText(pane, wxID_ANY, "Type a &Word, or select one from the list.");
  column->Add(wordPrompt, 0, wxEXPAND | wxLEFT, kGap);

  m_search = new wxSearchCtrl(pane, ID_SEARCH, wxEmptyString);
  column->Add(m_search, 0, wxEXPAND | wxALL, kGap);

  m_wordList = new QListBox(pane, ID_WORD_LIST, wxDefaultPosition, wxDefaultSize);
  wxBoxSizer* wordRow = new wxBoxSizer(wxHORIZONTAL);
  wordRow->Add(m_wordList, 1, wxEXPAND | wxLEFT, 44);
  column->Add(wordRow, 1, wxEXPAND | wxRIGHT, kGap);
  column->AddSpacer(kGap);

  wxStaticText* targetPrompt =
      new wxStaticText(pane, wxID_ANY, "Then select a Location from the list.");
  column->Add(targetPrompt, 0, wxEXPAND | wxLEFT, kGap);

  m_targetList = new wxListBox(pane, ID_TARGET_LIST, wxDefaultPosition, wxDefaultSize, 0, nullptr,
                               wxLB_SINGLE | wxLB_ALWAYS_SB);
  column->Add(m_targetList, 1, wxEXPAND | wxALL, kGap);

  m_gotoButton = new wxButton(pane, ID_GOTO, "&Go To");
  m_gotoButton->SetToolTip("Go to the selected destination");
  const int h = m_gotoButton->GetSize().GetHeight();
  const wxSize iconSize(h, h);
  wxButton* help = MakeIconButton(pane, wxID_HELP, "&Help", "help-contents",
                                  "Help on using the program", iconSize);
  wxButton* internet = MakeIconButton(pane, ID_INTERNET, "&Internet", "internet-web-browser",
                                      "Go to internet based document collection.", iconSize);
  wxButton* about =
      MakeIconButton(pane, wxID_ABOUT, "&About", "help-about", "About Docuvane", iconSize);

  wxBoxSizer* buttonRow = new wxBoxSizer(wxHORIZONTAL);
  buttonRow->Add(help, 0, wxALIGN_CENTRE_VERTICAL);
  buttonRow->Add(internet, 0, wxALIGN_CENTRE_VERTICAL);
  buttonRow->Add(about, 0, wxALIGN_CENTRE_VERTICAL);
  buttonRow->AddStretchSpacer(1);
  buttonRow->Add(m_gotoButton, 0, wxALIGN_CENTRE_VERTICAL);
  // The row spans the width, so right alignment is implied by the stretch
  // spacer; wxALIGN_RIGHT together with wxEXPAND is refused by the sizer.
  column->Add(buttonRow, 0, wxEXPAND | wxALL, kGap);

  // Fit, without making the fitted size a minimum: the sash may then come
  // within the minimum pane size of either edge.
  pane->SetSizer(column);
  column->Fit(pane);

  SplitVertically(m_tree, pane);
  SetMinimumPaneSize(20);
  SetSashPosition(sashPosition, true);

  m_gotoButton->Disable();
}

Docuvane::~Docuvane() {
  wxConfigBase* config = wxConfigBase::Get();
  if (config && m_splitter)
    config->Write("/MainWindow/Splitter", static_cast<long>(ToDIP(m_splitter->GetSashPosition())));
}

wxButton* Docuvane::MakeIconButton(wxWindow* parent, int id, const char* label,
                                   const char* iconName, const char* toolTip, const wxSize& size) {
  wxButton* button = nullptr;
  const char* found = TrovSearch("Icon", iconName);
  if (found) {
    const wxImage image = LoadPicture(found);
    // An unreadable file still gives the picture button, just without a picture.
    wxBitmap bitmap;
    if (image.IsOk()) bitmap = wxBitmap(image);
    button = new wxBitmapButton(parent, id, bitmap, wxDefaultPosition, size, wxBU_AUTODRAW,
                                wxDefaultValidator, "button");
  } else {
    button = new wxButton(parent, id, ToWx(label), wxDefaultPosition, wxDefaultSize, 0,
                          wxDefaultValidator, "button");
  }
  if (button && toolTip && *toolTip) button->SetToolTip(ToWx(toolTip));
  return button;
}

void Docuvane::OnSashMove(wxSplitterEvent& event) {
  const int position = event.GetSashPosition();
  wxSize first(0, 0), second(0, 0);
  if (wxWindow* w = GetWindow1()) first = w->GetSize();
  if (wxWindow* w = GetWindow2()) second = w->GetSize();
  char text[128];
  std::snprintf(text, sizeof text, "sash pos=%d, w1=%dx%d, w2=%dx%d", position, first.x, first.y,
                second.x, second.y);
  TrovMessage("INFO: Docuvane::OnSashMOve ", text, 3);
}
