// Start-up values shared with the window and the command channel.
#include "shell/app.h"

const char* AppTitle = "Lomari Docuvane";
MyFrame* MainFrame = nullptr;
