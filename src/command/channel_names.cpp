#include "command/channel_names.h"

#include "platform/paths.h"
#include "trovlib/trovlib.h"

const char* const kCommandService = "Lomari.DDE.Docuvane";
const char* const kCommandTopic = "CommandLine";

std::string CommandSocketPath() {
  std::string error;
  const std::string dir = RuntimeDirectory(&error);
  if (dir.empty()) {
    TrovMessage("ERROR: RuntimeDirectory ", error.c_str(), 5);
    return std::string();
  }
  return dir + "/" + kCommandService;
}
