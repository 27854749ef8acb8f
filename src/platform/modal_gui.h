// Whether the toolkit shows a modal window, its own message boxes included
// (those run a loop of the toolkit's that the framework does not see).
#pragma once

bool ToolkitModalWindowShown();
