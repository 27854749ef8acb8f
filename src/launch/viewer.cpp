// Viewer rules and the command line of one opening.
#include "launch/viewer.h"

#include <iterator>

// How a viewer is told a place: not at all, by an option before the
// document, by a word after it, or behind a "#" on the document itself.
enum class Form { kNone, kOption, kTrailing, kFragment };

struct ViewerRule {
  const char* program;
  bool tried;  // one of the known viewers tried when nothing else is named
  Form page;
  const char* pageOption;
  Form destination;
  const char* destinationOption;
};

namespace {

// From each viewer's manual page in Debian 12.
constexpr ViewerRule kViewers[] = {
    {"evince", true, Form::kOption, "-i", Form::kOption, "-n"},
    {"okular", true, Form::kOption, "-p", Form::kFragment, nullptr},
    {"zathura", true, Form::kOption, "-P", Form::kNone, nullptr},
    {"mupdf", true, Form::kTrailing, nullptr, Form::kNone, nullptr},
    {"qpdfview", true, Form::kFragment, nullptr, Form::kNone, nullptr},
    {"atril", true, Form::kOption, "-i", Form::kNone, nullptr},
    // The programs behind Debian's mupdf alternative.
    {"mupdf-gl", false, Form::kTrailing, nullptr, Form::kNone, nullptr},
    {"mupdf-x11", false, Form::kTrailing, nullptr, Form::kNone, nullptr},
};

constexpr int kMaxPage = 999999999;

// The words that stand for the document on a command line.
struct DocumentWords {
  std::vector<std::string> before;
  std::string file;
  std::vector<std::string> after;
};

void Place(Form form, const char* option, const std::string& value, DocumentWords& words) {
  switch (form) {
    case Form::kOption:
      words.before = {option, value};
      break;
    case Form::kTrailing:
      words.after = {value};
      break;
    case Form::kFragment:
      words.file += "#" + value;
      break;
    case Form::kNone:
      break;
  }
}

DocumentWords WordsFor(const ViewerRule* viewer, const PdfAnchor& anchor, const std::string& file) {
  DocumentWords words{{}, file, {}};
  if (viewer == nullptr) return words;
  if (anchor.page > 0) {
    Place(viewer->page, viewer->pageOption, std::to_string(anchor.page), words);
  } else if (!anchor.destination.empty()) {
    Place(viewer->destination, viewer->destinationOption, anchor.destination, words);
  }
  return words;
}

bool IsFileCode(char c) { return c == 'f' || c == 'u' || c == 'F' || c == 'U'; }

}  // namespace

PdfAnchor ParseAnchor(const std::string& anchor) {
  PdfAnchor result;
  if (anchor.compare(0, 5, "page=") == 0) {
    long page = 0;
    std::size_t i = 5;
    for (; i < anchor.size() && anchor[i] >= '0' && anchor[i] <= '9' && page <= kMaxPage; ++i)
      page = page * 10 + (anchor[i] - '0');
    if (page >= 1 && page <= kMaxPage) result.page = static_cast<int>(page);
    return result;
  }
  if (anchor.compare(0, 10, "nameddest=") == 0) {
    const std::size_t end = anchor.find('&', 10);  // further open parameters follow
    result.destination = anchor.substr(10, end == std::string::npos ? end : end - 10);
    return result;
  }
  if (anchor.find_first_not_of(' ') != std::string::npos) result.destination = anchor;
  return result;
}

std::vector<std::string> KnownViewerPrograms() {
  std::vector<std::string> programs;
  for (const ViewerRule& viewer : kViewers)
    if (viewer.tried) programs.push_back(viewer.program);
  return programs;
}

const ViewerRule* IdentifyViewer(const std::vector<std::string>& command) {
  std::size_t first = 0;
  auto baseName = [&](std::size_t i) { return command[i].substr(command[i].rfind('/') + 1); };
  if (first < command.size() && baseName(first) == "env") {
    ++first;
    while (first < command.size() && command[first].find('=') != std::string::npos) ++first;
  }
  if (first >= command.size()) return nullptr;
  const std::string program = baseName(first);
  for (const ViewerRule& viewer : kViewers)
    if (program == viewer.program) return &viewer;
  return nullptr;
}

bool TakesNamedDestination(const ViewerRule* viewer) {
  return viewer != nullptr && viewer->destination != Form::kNone;
}

std::vector<std::string> ViewerArguments(const ViewerCommand& command, const PdfAnchor& anchor,
                                         const std::string& file) {
  const DocumentWords document = WordsFor(IdentifyViewer(command.words), anchor, file);
  std::vector<std::string> out;
  bool placed = false;
  // The first file code gets the anchor's words; any later one the bare document.
  auto putDocument = [&](const std::string& word) {
    if (!placed) out.insert(out.end(), document.before.begin(), document.before.end());
    out.push_back(word);
    if (!placed) out.insert(out.end(), document.after.begin(), document.after.end());
    placed = true;
  };
  for (std::size_t w = 0; w < command.words.size(); ++w) {
    const std::string& word = command.words[w];
    if (w == 0) {
      out.push_back(word);  // the program, already found
      continue;
    }
    if (word == "%i") {  // a word of its own, or nothing without an icon
      if (!command.icon.empty()) out.insert(out.end(), {"--icon", command.icon});
      continue;
    }
    std::string expanded;
    bool hasFile = false;
    for (std::size_t i = 0; i < word.size(); ++i) {
      if (word[i] != '%' || i + 1 == word.size()) {
        expanded += word[i];
        continue;
      }
      const char code = word[++i];
      if (IsFileCode(code)) {
        expanded += placed ? file : document.file;
        hasFile = true;
      } else if (code == '%') {
        expanded += '%';
      } else if (code == 'c') {
        expanded += command.name;
      } else if (code == 'k') {
        expanded += command.entryPath;
      }  // %d %D %n %N %v %m and unknown codes give nothing
    }
    // A word that was only a field code with nothing to give disappears.
    if (hasFile) {
      putDocument(expanded);
    } else if (!expanded.empty() || word.find('%') == std::string::npos) {
      out.push_back(expanded);
    }
  }
  if (!placed) putDocument(document.file);
  return out;
}
