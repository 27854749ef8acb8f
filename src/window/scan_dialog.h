// Building the user's word index from the installed documentation, from
// the window: the offer at start, the progress dialog, the reload.
#pragma once

class MyFrame;

// True when TEXMF is not set, a TeX installation exists and the user's
// tree has no word index yet.
bool ShouldOfferDocumentationScan();

// Asks whether to build the index; if so runs docuvane-mkindex --scan with
// a progress dialog that can cancel it, and on success shows the new
// catalogue and words.  Errors come as a dialog; the window goes on.
void OfferDocumentationScan(MyFrame* frame);

// Runs the scan without asking; true when a new index was loaded.
bool RunDocumentationScan(MyFrame* frame);
