#include "window/picture.h"

#include <wx/log.h>

#include <cctype>

namespace {

bool EndsWithBmp(const std::string& path) {
  if (path.size() < 4) return false;
  std::string tail = path.substr(path.size() - 4);
  for (char& c : tail) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return tail == ".bmp";
}

}  // namespace

wxImage LoadPicture(const std::string& path) {
  wxImage image(wxString(path.c_str(), wxConvLocal), wxBITMAP_TYPE_ANY, -1);
  if (image.IsOk() && EndsWithBmp(path)) image.SetMaskColour(192, 192, 192);
  return image;
}
