#include "window/picture.h"

#include <wx/log.h>

#include "text/text.h"
#include "text/wxtext_gui.h"

wxImage LoadPicture(const std::string& path) {
  wxImage image(ToWx(path), wxBITMAP_TYPE_ANY, -1);
  if (image.IsOk() && EndsWithIgnoringCase(path, ".bmp")) image.SetMaskColour(192, 192, 192);
  return image;
}
