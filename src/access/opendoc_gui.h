// Opening a document from GUI code: OpenDocumentFile with the desktop's
// services, the progress dialog parented by `parent`.
#pragma once

class wxWindow;

int OpenDocumentFile(wxWindow* parent, const char* fileName, const char* anchor);
