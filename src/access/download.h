// Fetching one document from the documentation server into a local file,
// with a progress window the user can abort.
#pragma once

#include <string>

// What the transfer needs of its progress window.  The desktop gives it a
// progress dialog; tests give it a recorder.
class DownloadProgress {
 public:
  virtual ~DownloadProgress() = default;
  // Shows `value`, and `message` unless it is empty (the message stays).
  // False when the user asked to stop.
  virtual bool Update(int value, const std::string& message) = 0;
  // Takes the window out of its stopped state after the user changed mind.
  virtual void Resume() = 0;
  // "Are you really want to abort downloading of the module ?": true for Yes.
  virtual bool AskAbortQuestion() = 0;
  // Called about ten times a second while no data arrives, so that the
  // window keeps handling its input during a stalled transfer.  False has
  // the same meaning as for Update.
  virtual bool KeepAlive(int value) { return Update(value, std::string()); }
};

// Copies `url` into `path`.  Progress runs from `first` to `last`, where
// `expected` bytes count as the whole range.  Returns the number of bytes
// received, also after an abort; 0 when the address, the connection or the
// file cannot be set up.
//
// Redirections (301, 302, 303, 307, 308) are followed, at most ten in one
// call and only to http or https.  The document is written to a part file
// beside `path` and renamed into place only when the transfer is complete:
// HTTP 200 (or a scheme other than HTTP), no transfer error (without a
// Content-Length, the connection ended cleanly), as many bytes as the
// Content-Length announced, and for a `path` ending in ".pdf" a whole PDF
// file.  Otherwise the part file is removed and an older copy under `path`
// stays.  Part files beside `path` that killed transfers left are removed
// first.
int wxGet(DownloadProgress& dialog, int first, int last, const char* url, const char* path,
          int expected);

// A document name as the path of a URL: "#", "?" and "%" are characters of
// the name there, not the URL's fragment, query or escapes.  Every other
// byte that may not stand in a URL wxGet escapes itself.
std::string EscapeUrlPath(const std::string& name);

// Time limits of a transfer.  Tests shorten them.
struct DownloadLimits {
  long connectTimeoutMs = 30000;  // setting up the connection
  long stallTimeoutS = 60;        // no byte received for this long ends the transfer
};
void SetDownloadLimits(const DownloadLimits& limits);
DownloadLimits GetDownloadLimits();
