// The documentation server's start page in the desktop's browser.
#pragma once

class AccessServices;

// Sets DocumentServerURL when still unset (as Get_Doc_Server does), opens
// DocumentServerURL + "/about.php" in a new browser window and, when that
// fails, shows the user an error box.  True when the browser was started.
// The frame's OnInternet calls it after its own "INFO: " message.
bool OpenStartPage(AccessServices& services);
