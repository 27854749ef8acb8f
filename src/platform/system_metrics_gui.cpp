// The virtual screen: the bounding box of all monitors.
#include <wx/display.h>

#include "window/frame.h"

wxSize VirtualScreenSize() {
  wxRect box;
  const unsigned count = wxDisplay::GetCount();
  for (unsigned i = 0; i < count; ++i) box.Union(wxDisplay(i).GetGeometry());
  // Monitors left of or above the primary one give negative origins; the
  // frame is kept between 0 and the box's size all the same.
  if (box.width <= 0 || box.height <= 0) return wxGetDisplaySize();
  return box.GetSize();
}

wxRect ClampFrameGeometry(const wxRect& stored, const wxSize& defaultSize, const wxSize& screen) {
  wxRect r = stored;
  // The lower bound is the default size, not the minimum size.
  r.width = stored.width < defaultSize.x ? defaultSize.x : std::min(stored.width, screen.x);
  r.height = stored.height < defaultSize.y ? defaultSize.y : std::min(stored.height, screen.y);
  if (r.x < 0) r.x = 0;
  else if (r.x + r.width > screen.x) r.x = screen.x - r.width;
  if (r.y < 0) r.y = 0;
  else if (r.y + r.height > screen.y) r.y = screen.y - r.height;
  return r;
}
