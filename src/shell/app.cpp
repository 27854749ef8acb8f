// Start-up values shared with the window and the command channel.
#include "shell/app.h"

MyFrame* MainFrame = nullptr;
