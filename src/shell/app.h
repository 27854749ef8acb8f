// Values that start-up sets for the rest of the program.
#pragma once

class MyFrame;

// The one main frame; NULL before start-up builds it and after it is gone.
extern MyFrame* MainFrame;
