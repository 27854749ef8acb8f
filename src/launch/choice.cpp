// The order in which a viewer is chosen.
#include "launch/choice.h"

namespace {

constexpr const char* kLauncherName = "docuvane-open";

std::string BaseName(const std::string& path) { return path.substr(path.rfind('/') + 1); }

// Takes `exec` as the choice when its program is installed.
bool Accept(const ViewerSources& sources, const std::string& exec, const std::string& source,
            ViewerChoice& choice) {
  std::vector<std::string> words = SplitDesktopExec(exec);
  if (words.empty()) return false;
  const std::string found = sources.findProgram(words[0]);
  if (found.empty() || BaseName(found) == kLauncherName) {
    sources.warn(source +
                 (found.empty() ? " names a program that is not installed: "
                                : " names this launcher itself: ") +
                 words[0]);
    return false;
  }
  words[0] = found;
  choice.command.words = words;
  choice.source = source;
  return true;
}

}  // namespace

bool ChooseViewer(const ViewerSources& sources, ViewerChoice& choice) {
  choice = ViewerChoice();
  if (!sources.environmentChoice.empty() &&
      Accept(sources, sources.environmentChoice, "DOCUVANE_VIEWER", choice))
    return true;
  if (!sources.iniChoice.empty() &&
      Accept(sources, sources.iniChoice, "the Viewer key of " + sources.iniPath, choice))
    return true;
  DesktopEntry entry;
  if (sources.desktopDefault && sources.desktopDefault(entry) &&
      Accept(sources, entry.exec, "the desktop entry " + entry.path, choice)) {
    choice.command.name = entry.name;
    choice.command.icon = entry.icon;
    choice.command.entryPath = entry.path;
    return true;
  }
  for (const std::string& program : KnownViewerPrograms()) {
    const std::string found = sources.findProgram(program);
    if (found.empty()) continue;
    choice.command.words = {found};
    choice.source = "the known viewers";
    return true;
  }
  return false;
}
