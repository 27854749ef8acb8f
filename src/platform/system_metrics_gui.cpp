// GetSystemMetrics for the virtual screen: the bounding box of all monitors.
#include <wx/display.h>

#include "platform/winapi.h"

int GetSystemMetrics(int index) {
  wxRect box;
  const unsigned count = wxDisplay::GetCount();
  for (unsigned i = 0; i < count; ++i) box.Union(wxDisplay(i).GetGeometry());
  // Monitors left of or above the primary one give negative origins; the
  // frame is kept between 0 and the box's size all the same.
  wxSize size = box.GetSize();
  if (box.width <= 0 || box.height <= 0) size = wxGetDisplaySize();
  if (index == SM_CXVIRTUALSCREEN) return size.x;
  if (index == SM_CYVIRTUALSCREEN) return size.y;
  return 0;
}
