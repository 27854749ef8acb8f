// The toolkit finds its fonts through fontconfig, whose configuration and
// caches are loaded once per process; whoever asks first loads them and the
// others wait.  Asking on a thread while the toolkit starts has them ready
// when the first text is laid out.
#include <fontconfig/fontconfig.h>

#include "platform/font_setup_gui.h"

FontConfigurationPreload::FontConfigurationPreload() : thread_([] { FcInit(); }) {}

FontConfigurationPreload::~FontConfigurationPreload() {
  if (thread_.joinable()) thread_.join();
}
