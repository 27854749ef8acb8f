// Opening a document from the tree: a double click (or Enter) on its item,
// or the open command on the selected item.
#include <wx/treectrl.h>

#include "access/desktop_services_gui.h"
#include "access/tree_activation.h"
#include "trovlib/trovlib.h"
#include "window/panel.h"
#include "window/tree_nodes.h"

void Docuvane::OnTreeActivate(wxTreeEvent& event) {
  TrovMessage("INFO: Docuvane::OnTreeActivate ", "", 3);
  const wxTreeItemId item = event.GetItem();
  if (!item.IsOk()) {
    TrovMessage("ERROR: Docuvane::OnTreeActivate ", "invalid wxTreeItemId", 5);
    return;
  }
  Open_Document(item);
}

void Docuvane::OnOpenDoc(wxCommandEvent&) {
  TrovMessage("INFO: Docuvane::OnOpenDoc ", "", 3);
  const wxTreeItemId item = m_tree ? m_tree->GetSelection() : wxTreeItemId();
  if (!item.IsOk()) {
    TrovMessage("ERROR: Docuvane::OnOpenDoc ", "invalid wxTreeItemId", 5);
    return;
  }
  Open_Document(item);
}

int Docuvane::Open_Document(const wxTreeItemId& item) {
  // The table lookup, the traces and the opening live in OpenTreeDocument,
  // which refuses an invalid item with its own message.
  DesktopAccessServices services(this);
  return OpenTreeDocument(services,
                          item.IsOk() && m_treeNodes ? m_treeNodes->NodeOf(item) : nullptr);
}
