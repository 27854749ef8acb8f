// Opening a document, step by step: read the request (anchor, extension),
// resolve the file, make sure it is on the local disk (document cache,
// download), choose the viewer by the viewer rules, start it.
#include "access/opendoc.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <optional>
#include <string>

#include "access/download.h"
#include "access/services.h"
#include "access/template.h"
#include "access/viewer_rules.h"
#include "base/settings.h"
#include "base/trace.h"
#include "platform/files.h"
#include "platform/paths.h"
#include "platform/profile.h"
#include "trovlib/trovlib.h"

const char* DocumentServerURL = nullptr;
const char* const kDefaultDocumentServerURL = "https://docs.lomari.org";

namespace {

constexpr std::size_t kNameCapacity = 256;  // document name
constexpr std::size_t kPathCapacity = 260;  // local paths
constexpr std::size_t kUrlCapacity = 512;   // server URL
constexpr std::size_t kExtensionCapacity = 32;
constexpr const char* kCachePattern = "?<$VARTEX\\doc\\>";

std::string& ServerURLStorage() {
  static std::string storage;
  return storage;
}

// A relative name that climbs out of the directory it is appended to.
bool LeavesDirectory(const std::string& name) {
  std::size_t start = 0;
  while (start <= name.size()) {
    std::size_t end = name.find_first_of("/\\", start);
    if (end == std::string::npos) end = name.size();
    if (name.compare(start, end - start, "..") == 0 && end - start == 2) return true;
    start = end + 1;
  }
  return false;
}

bool TooLong(const std::string& text, std::size_t capacity, const char* what) {
  if (text.size() < capacity) return false;
  TraceMessage(what, text.c_str());
  return true;
}

// Whether the path leads somewhere, links followed.
bool Exists(const std::string& path) {
  FileStamp stamp;
  return StampOf(path, stamp);
}

bool IsLoadedCopy(const std::string& path) {
  return Exists(path) && Check_Loaded_PDF(path.c_str());
}

// One call of OpenDocumentFile.
struct Request {
  std::string callerText;             // as given, anchor and all
  std::string name;                   // without the anchor; the full path once resolved
  std::optional<std::string> anchor;  // the caller's, or behind the name's first "#"
  bool anchorFromName = false;
  std::string extension;
  std::string relativeName;  // the name before resolution
  std::string cachePath;     // where a document of the server is kept; "" for others
};

// The anchor and the extension.  False when the request cannot name a file.
bool ReadRequest(const char* fileName, const char* anchor, Request& request) {
  request.callerText = fileName ? fileName : "";
  request.name = request.callerText;
  TraceMessage("Open document: ", request.name.c_str());
  if (anchor != nullptr) {
    request.anchor = anchor;  // a "#" in the name then stays part of it
  } else if (std::size_t hash = request.name.find('#'); hash != std::string::npos) {
    request.anchor = request.name.substr(hash + 1);
    request.name.resize(hash);
    request.anchorFromName = true;
  }
  if (TooLong(request.name, kNameCapacity, "ERROR: document name too long: ")) return false;
  const std::size_t dot = request.name.rfind('.');
  if (dot == std::string::npos) {
    TraceMessage("ERROR: undefined type of file: ", request.callerText.c_str());
    return false;
  }
  request.extension = request.name.substr(dot + 1, kExtensionCapacity - 1);
  request.relativeName = request.name;
  return true;
}

// An absolute name as it is, else the installed copy, else the place in the
// document cache (`cachePath`).  False when the document cannot be had.
bool ResolveDocument(Request& request) {
  if (Is_Absolute_Path(request.name.c_str())) return true;
  const std::string& relative = request.relativeName;
  if (const char* found = TrovSearch(kDocumentationCategory, relative.c_str())) {
    std::string path(found);
    if (!Exists(path)) {
      TraceMessage("ERROR: Not accessible the document: ", relative.c_str());
      return false;
    }
    if (TooLong(path, kNameCapacity, "ERROR: document path too long: ")) return false;
    request.name = Fix_Slashes(path);
    TraceMessage("Openning document file: ", request.name.c_str());
    return true;
  }
  if (LeavesDirectory(relative)) {
    TraceMessage("ERROR: document name leaves the document cache: ", relative.c_str());
    return false;
  }
  std::string cachePath = std::string(TrovFind(kCachePattern)) + relative;
  Fix_Slashes(cachePath);
  // The cache path becomes the document name, so it must fit that.
  if (TooLong(cachePath, kNameCapacity, "ERROR: document path too long: ")) return false;
  request.cachePath = cachePath;
  return true;
}

// A complete copy in the document cache, fetched from the documentation
// server when there is none yet.  False, after telling the user, when none
// could be had.
bool MakeLocal(AccessServices& services, Request& request) {
  const std::string& relative = request.relativeName;
  const std::string& cachePath = request.cachePath;
  if (!IsLoadedCopy(cachePath)) {
    TraceMessage("INFO: Loading file to ", cachePath.c_str());
    Get_Doc_Server();
    TraceMessage("INFO: Loading from Document Server: ", DocumentServerURL);
    const std::string url = std::string(DocumentServerURL) + "/" + EscapeUrlPath(relative);
    if (TooLong(url, kUrlCapacity, "ERROR: document server URL too long: ")) return false;
    TraceMessage("INFO: Loading: ", url.c_str());
    Make_File_Path(cachePath.c_str());

    TraceMessage("INFO: Start Loading ...");
    services.Download("Downloading " + relative + " ...", url, cachePath);
    TraceMessage("INFO: End Loading ...");
  }

  TraceMessage("INFO: Checking Loaded file ...");
  if (!IsLoadedCopy(cachePath)) {
    Get_Doc_Server();
    services.ShowError("Can't download document file '" + relative + "'\nfrom document server '" +
                           DocumentServerURL + "'\n\nIt is probably internet error. Try later.",
                       "Lomari Docuvane Error");
    TraceMessage("ERROR: Not accessible the document: ", relative.c_str());
    return false;
  }
  request.name = cachePath;
  TraceMessage("Openning document file: ", request.name.c_str());
  return true;
}

ViewerFacts FactsFor(AccessServices& services, const Request& request) {
  ViewerFacts facts;
  facts.document = request.name;
  facts.extension = request.extension;
  facts.anchor = request.anchor;
  char value[kTemplateCapacity] = "";
  GetPrivateProfileStringA("Extensions", request.extension.c_str(), "", value, sizeof value,
                           IniFilePath.c_str());
  facts.openingTemplate = value;
  facts.root = RootPath;
  facts.traceTemplates = TraceMode != 0;
  facts.findReader = [&services, &request] { return services.FindExecutable(request.name); };
  facts.findProgram = [](const std::string& program) {
    const char* path = TrovSearch("Program", program.c_str());
    return std::string(path ? path : "");
  };
  return facts;
}

// 1 when a command line was started, whatever became of it.
int StartViewer(AccessServices& services, const Request& request, const ViewerChoice& choice) {
  for (const auto& [text, argument] : choice.notes) TraceMessage(text.c_str(), argument.c_str());
  switch (choice.route) {
    case ViewerRoute::kRefused:
      return 0;
    case ViewerRoute::kDefaultApplication:
      TraceMessage("INFO: wxLaunchDefaultApplication ", request.name.c_str());
      if (!services.LaunchDefaultApplication(request.name)) {
        const std::string shown =
            request.anchorFromName ? request.name + "#" + *request.anchor : request.name;
        TraceMessage("ERROR: undefined method to open document file: ", shown.c_str());
      }
      return 0;
    case ViewerRoute::kRun:
      break;
  }
  // A command that does not fit is not run at all: a cut one could name
  // another file or drop the document.
  const std::string& line = choice.command.commandLine;
  if (TooLong(line, kCommandLineCapacity, "ERROR: command line too long: ")) return 0;
  TraceMessage("Run: ", line.c_str());
  const long result = services.Execute(choice.command.argv);
  if (result <= 0) {
    const std::string code = std::to_string(result);
    TraceMessage("WARNING: execution failed with error code=", code.c_str());
  }
  return 1;
}

}  // namespace

void Get_Doc_Server() {
  if (DocumentServerURL != nullptr) return;
  const char* value = TrovVar("DOCSERVER");
  ServerURLStorage() = value != nullptr ? value : kDefaultDocumentServerURL;
  DocumentServerURL = ServerURLStorage().c_str();
}

bool Is_Absolute_Path(const char* name) {
  if (name == nullptr) return false;
  unsigned char first = static_cast<unsigned char>(name[0]);
  if (((first >= 'A' && first <= 'Z') || (first >= 'a' && first <= 'z')) && name[1] == ':')
    return true;
  if (name[0] == '/') return true;
  return name[0] == '\\' && name[1] == '\\';
}

bool Check_Loaded_PDF(const char* path) {
  FileStamp stamp;
  RandomAccessFile file;
  if (path == nullptr || !StampOf(path, stamp) || !file.Open(path)) return false;
  char head[6];
  if (!file.ReadAt(0, head, sizeof head) || std::memcmp(head, "%PDF-1", 6) != 0) return false;
  const std::int64_t size = stamp.size;
  const std::int64_t n = std::min<std::int64_t>(size, 1024);
  char tail[1024];
  if (n < 9 || !file.ReadAt(size - n, tail, static_cast<std::size_t>(n))) return false;
  for (std::int64_t i = n - 9; i >= 0; --i)
    if (std::memcmp(tail + i, "startxref", 9) == 0) return true;
  return false;
}

int Make_Path(const char* directory) {
  if (directory == nullptr) return 1;
  std::string dir(directory);
  Fix_Slashes(dir);
  FileStamp stamp;
  if (StampOf(dir, stamp) || MakeDirectory(dir)) return 0;
  std::size_t cut = dir.rfind(kPathSeparator);
  if (cut == std::string::npos) return 1;
  if (Make_Path(dir.substr(0, cut).c_str()) != 0) return 1;
  return MakeDirectory(dir) ? 0 : 1;
}

int Make_File_Path(const char* filePath) {
  if (filePath == nullptr) return 1;
  std::string path(filePath);
  if (path.size() >= kPathCapacity) {
    TraceMessage("ERROR: path too long: ", filePath);
    return 1;
  }
  Fix_Slashes(path);
  std::size_t cut = path.rfind(kPathSeparator);
  if (cut == std::string::npos) return 1;
  return Make_Path(path.substr(0, cut).c_str());
}

int OpenDocumentFile(AccessServices& services, const char* fileName, const char* anchor) {
  Request request;
  if (!ReadRequest(fileName, anchor, request) || !ResolveDocument(request)) return 0;
  if (!request.cachePath.empty() && !MakeLocal(services, request)) return 0;
  TraceMessage("Openning document type: ", request.extension.c_str());
  return StartViewer(services, request, ChooseViewer(FactsFor(services, request)));
}
