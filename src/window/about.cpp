// The About dialog.  It has no handlers: wxID_CANCEL closes it.
#include "window/about.h"

#include <wx/button.h>
#include <wx/image.h>
#include <wx/sizer.h>
#include <wx/statbmp.h>
#include <wx/stattext.h>

#include <cctype>
#include <string>

#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"
#include "window/picture.h"

namespace {

constexpr int kGap = 12;

wxStaticText* CentredText(wxWindow* parent, const wxString& text) {
  return new wxStaticText(parent, wxID_ANY, text, wxDefaultPosition, wxDefaultSize,
                          wxALIGN_CENTRE_HORIZONTAL);
}

}  // namespace

AboutDlg::AboutDlg(wxWindow* parent)
    : wxDialog(parent, wxID_ANY, "About ...", wxDefaultPosition, wxDefaultSize,
               wxDEFAULT_DIALOG_STYLE) {
  SetFont(wxFont(10, wxFONTFAMILY_DEFAULT, wxFONTSTYLE_NORMAL, wxFONTWEIGHT_NORMAL, false,
                 wxEmptyString, wxFONTENCODING_DEFAULT));
  wxBoxSizer* column = new wxBoxSizer(wxVERTICAL);

  if (const char* found = TrovSearch("Logo", "Docuvane")) {
    // An unreadable logo still takes its place: the spacer and an empty
    // picture, so the dialog keeps its shape.
    const wxImage image = LoadPicture(found);
    column->AddSpacer(kGap);
    column->Add(new wxStaticBitmap(this, wxID_ANY, image.IsOk() ? wxBitmap(image) : wxBitmap()), 0,
                wxALIGN_CENTRE_HORIZONTAL);
  }
  column->AddSpacer(kGap);

  wxStaticText* title = CentredText(this, ToWx(AppTitle));
  title->SetFont(GetFont().Bold());
  title->SetForegroundColour(wxColour(128, 0, 128));
  column->Add(title, 0, wxALIGN_CENTRE_HORIZONTAL);
  column->Add(CentredText(this, "Lomari TeX Documentation Organizer"), 0,
              wxALIGN_CENTRE_HORIZONTAL);
  column->AddSpacer(kGap);
  column->Add(CentredText(this, "Version 5.0 (2011/03/17)"), 0, wxALIGN_CENTRE_HORIZONTAL);
  column->AddSpacer(kGap);
  column->Add(
      CentredText(this, wxString::FromUTF8("Copyright \xC2\xA9 2011 Lomari. All rights reserved.")),
      0, wxALIGN_CENTRE_HORIZONTAL);

  column->AddSpacer(2 * kGap);
  column->Add(new wxButton(this, wxID_CANCEL, "Close"), 0, wxALIGN_CENTRE_HORIZONTAL);
  column->AddSpacer(kGap);

  wxBoxSizer* row = new wxBoxSizer(wxHORIZONTAL);
  row->AddSpacer(kGap);
  row->Add(column, 0, wxEXPAND | wxALL, kGap);
  row->AddSpacer(kGap);
  SetSizerAndFit(row);
  Centre(wxBOTH);
}

AboutDlg::~AboutDlg() = default;
