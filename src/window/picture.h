// Pictures from icon and logo files.
#pragma once

#include <wx/image.h>

#include <string>

// The image of the file, in any format the image handlers read; a ".bmp"
// file (any case) gets light grey (192, 192, 192) as its transparent colour.
// An unreadable file gives an invalid image.
wxImage LoadPicture(const std::string& path);
