// Values that start-up sets for the rest of the program.
#pragma once

class MyFrame;

// "Lomari Docuvane": the main frame's title, shown by the About dialog too.
extern const char* AppTitle;

// The one main frame; NULL before start-up builds it and after it is gone.
extern MyFrame* MainFrame;
