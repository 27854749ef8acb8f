// The About dialog: logo, title, product line, version, rights, "Close".
#pragma once

#include <wx/dialog.h>

class AboutDlg : public wxDialog {
 public:
  explicit AboutDlg(wxWindow* parent);
  ~AboutDlg() override;
};
