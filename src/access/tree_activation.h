// Opening the document that a tree item shows.
#pragma once

class AccessServices;

// Finds the first entry of DocumentTable whose TreeItem is `treeItem`,
// traces what it opens and hands its Path to OpenDocumentFile without an
// anchor.  Returns OpenDocumentFile's result, 0 for a null item or an item
// that shows no document.  The panel's Open_Document calls it.
int OpenTreeDocument(AccessServices& services, void* treeItem);
