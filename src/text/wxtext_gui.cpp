// The one conversion between the program's 8-bit strings and wxString.
#include "text/wxtext_gui.h"

wxString ToWx(const std::string& text) {
  wxString shown(text.c_str(), wxConvLocal);
  if (shown.empty() && !text.empty()) shown = wxString(text.c_str(), wxConvISO8859_1);
  return shown;
}

std::string FromWx(const wxString& text) {
  const wxCharBuffer local = text.mb_str(wxConvLocal);
  if (local.data() != nullptr && (local.length() != 0 || text.empty()))
    return std::string(local.data(), local.length());
  const wxCharBuffer latin = text.mb_str(wxConvISO8859_1);
  if (latin.data() != nullptr && (latin.length() != 0 || text.empty()))
    return std::string(latin.data(), latin.length());
  const wxScopedCharBuffer utf8 = text.utf8_str();
  return std::string(utf8.data(), utf8.length());
}
