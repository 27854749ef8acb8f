// Opening a document from the tree: a double click (or Enter) on its item,
// or the open command on the selected item.
#include <wx/treectrl.h>

#if __has_include("access/tree_activation.h") && __has_include("access/desktop_services_gui.h")
#include "access/desktop_services_gui.h"
#include "access/tree_activation.h"
#define DOCUVANE_HAVE_OPEN 1
#endif
#include "trovlib/trovlib.h"
#include "window/panel.h"

void Docuvane::OnTreeActivate(wxTreeEvent& event) {
  TrovMessage("INFO: Docuvane::OnTreeActivate ", "", 3);
  const wxTreeItemId item = event.GetItem();
  if (!item.IsOk()) {
    TrovMessage("ERROR: Docuvane::OnTreeActivate ", "invalid wxTreeItemId", 5);
    return;
  }
#ifdef DOCUVANE_HAVE_OPEN
  DesktopServices services(this);
  Open_Document(services, item.GetID());
#endif
}

void Docuvane::OnOpenDoc(wxCommandEvent&) {
  TrovMessage("INFO: Docuvane::OnOpenDoc ", "", 3);
  const wxTreeItemId item = m_tree ? m_tree->GetSelection() : wxTreeItemId();
  if (!item.IsOk()) {
    TrovMessage("ERROR: Docuvane::OnOpenDoc ", "invalid wxTreeItemId", 5);
    return;
  }
#ifdef DOCUVANE_HAVE_OPEN
  DesktopServices services(this);
  Open_Document(services, item.GetID());
#endif
}
