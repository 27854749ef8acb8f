// Opening a document: resolution, the document cache, the fetch from the
// documentation server and the three ways of starting a viewer.
#include "access/opendoc.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "access/services.h"
#include "access/template.h"
#include "platform/paths.h"
#include "platform/profile.h"
#include "text/text.h"
#include "base/settings.h"
#include "base/trace.h"
#include "trovlib/trovlib.h"

const char* DocumentServerURL = nullptr;
const char* const kDefaultDocumentServerURL = "https://docs.lomari.org";

namespace {

constexpr std::size_t kNameCapacity = 256;       // document name
constexpr std::size_t kPathCapacity = 260;       // local and reader paths
constexpr std::size_t kUrlCapacity = 512;        // server URL
constexpr std::size_t kExtensionCapacity = 32;
constexpr int kExpectedSize = 16777216;          // what counts as the whole progress range
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

bool Exists(const std::string& path) {
  struct stat st;
  return stat(path.c_str(), &st) == 0;
}

bool TooLong(const std::string& text, std::size_t capacity, const char* what) {
  if (text.size() < capacity) return false;
  TraceMessage(what, text.c_str());
  return true;
}

// The command of the Acrobat route: the reader gets the destination through
// its /A option, cut at the anchor's first blank.
TemplateCommand AcrobatCommand(const std::string& reader, const std::string& anchor,
                               const std::string& document) {
  std::string destination = anchor.substr(0, anchor.find(' '));
  TemplateCommand command;
  command.commandLine = "\"" + reader + "\" /A \"" + destination + "\" \"" + document + "\"";
  command.argv = {reader, "/A", destination, document};
  return command;
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
  struct stat st;
  if (path == nullptr || stat(path, &st) != 0) return false;
  FILE* file = std::fopen(path, "rb");
  if (file == nullptr) return false;
  bool ok = false;
  char head[6];
  if (std::fread(head, 1, sizeof head, file) == sizeof head && std::memcmp(head, "%PDF-1", 6) == 0) {
    long size = static_cast<long>(st.st_size);
    long n = size < 1024 ? size : 1024;
    char tail[1024];
    if (n >= 9 && std::fseek(file, size - n, SEEK_SET) == 0 &&
        std::fread(tail, 1, static_cast<std::size_t>(n), file) == static_cast<std::size_t>(n)) {
      for (long i = n - 9; i >= 0 && !ok; --i) ok = std::memcmp(tail + i, "startxref", 9) == 0;
    }
  }
  std::fclose(file);
  return ok;
}

int Make_Path(const char* directory) {
  if (directory == nullptr) return 1;
  std::string dir(directory);
  Fix_Slashes(dir);
  struct stat st;
  if (stat(dir.c_str(), &st) == 0 || mkdir(dir.c_str(), 0755) == 0) return 0;
  std::size_t cut = dir.rfind(kPathSeparator);
  if (cut == std::string::npos) return 1;
  if (Make_Path(dir.substr(0, cut).c_str()) != 0) return 1;
  if (mkdir(dir.c_str(), 0755) == 0) return 0;
  // Someone else may have made it meanwhile; that is just as good.
  return errno == EEXIST && stat(dir.c_str(), &st) == 0 && S_ISDIR(st.st_mode) ? 0 : 1;
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

int OpenDocumentFile(AccessServices& services, const char* fileName, const char* anchorArgument) {
  const std::string callerText = fileName ? fileName : "";
  std::string name = callerText;
  TraceMessage("Open document: ", name.c_str());

  // The anchor: the caller's, or what follows the first "#" of the name.
  bool hasAnchor = anchorArgument != nullptr;
  bool anchorFromName = false;
  std::string anchor = hasAnchor ? anchorArgument : "";
  if (!hasAnchor) {
    std::size_t hash = name.find('#');
    if (hash != std::string::npos) {
      anchor = name.substr(hash + 1);
      name.resize(hash);
      hasAnchor = anchorFromName = true;
    }
  }
  if (TooLong(name, kNameCapacity, "ERROR: document name too long: ")) return 0;

  std::size_t dot = name.rfind('.');
  if (dot == std::string::npos) {
    TraceMessage("ERROR: undefined type of file: ", callerText.c_str());
    return 0;
  }
  std::string extension = name.substr(dot + 1, kExtensionCapacity - 1);
  const std::string relativeName = name;

  if (!Is_Absolute_Path(name.c_str())) {
    const char* found = TrovSearch(kDocumentationCategory, relativeName.c_str());
    if (found != nullptr) {
      std::string path(found);
      if (access(path.c_str(), F_OK) != 0) {
        TraceMessage("ERROR: Not accessible the document: ", relativeName.c_str());
        return 0;
      }
      if (TooLong(path, kNameCapacity, "ERROR: document path too long: ")) return 0;
      name = Fix_Slashes(path);
      TraceMessage("Openning document file: ", name.c_str());
    } else {
      if (LeavesDirectory(relativeName)) {
        TraceMessage("ERROR: document name leaves the document cache: ", relativeName.c_str());
        return 0;
      }
      std::string cachePath = std::string(TrovFind(kCachePattern)) + relativeName;
      Fix_Slashes(cachePath);
      // The cache path becomes the document name, so it must fit that.
      if (TooLong(cachePath, kNameCapacity, "ERROR: document path too long: ")) return 0;

      if (!(Exists(cachePath) && Check_Loaded_PDF(cachePath.c_str()))) {
        TraceMessage("INFO: Loading file to ", cachePath.c_str());
        Get_Doc_Server();
        TraceMessage("INFO: Loading from Document Server: ", DocumentServerURL);
        std::string url = std::string(DocumentServerURL) + "/" + relativeName;
        if (TooLong(url, kUrlCapacity, "ERROR: document server URL too long: ")) return 0;
        TraceMessage("INFO: Loading: ", url.c_str());
        Make_File_Path(cachePath.c_str());

        TraceMessage("INFO: Start Loading ...");
        services.Download("Downloading " + relativeName + " ...", url, cachePath);
        TraceMessage("INFO: End Loading ...");
      }

      TraceMessage("INFO: Checking Loaded file ...");
      if (!(Exists(cachePath) && Check_Loaded_PDF(cachePath.c_str()))) {
        Get_Doc_Server();
        services.ShowError("Can't download document file '" + relativeName +
                               "'\nfrom document server '" + DocumentServerURL +
                               "'\n\nIt is probably internet error. Try later.",
                           "Lomari Docuvane Error");
        TraceMessage("ERROR: Not accessible the document: ", relativeName.c_str());
        return 0;
      }
      name = cachePath;
      TraceMessage("Openning document file: ", name.c_str());
    }
  }

  TraceMessage("Openning document type: ", extension.c_str());
  TemplateCommand command;
  bool haveCommand = false;

  if (hasAnchor && CompareIgnoringCase(extension.c_str(), "PDF") == 0) {
    std::string reader = services.FindExecutable(name);
    if (!reader.empty() && TooLong(reader, kPathCapacity, "ERROR: PDF reader path too long: "))
      reader.clear();
    if (!reader.empty()) {
      TraceMessage("PDF Reader: ", reader.c_str());
      if (ContainsIgnoringCase(reader, "acro")) {
        command = AcrobatCommand(reader, anchor, name);
        haveCommand = true;
      }
    }
  }

  if (!haveCommand) {
    char value[kTemplateCapacity] = "";
    GetPrivateProfileStringA("Extensions", extension.c_str(), "", value, sizeof value,
                             IniFilePath.c_str());
    std::string tmpl(value);
    if (!tmpl.empty()) {
      if (TraceMode) TraceMessage("INFO: template(*) ", tmpl.c_str());
      std::string expansion = ExpandTemplateRoot(tmpl, RootPath);
      if (TraceMode) TraceMessage("INFO: template(=) ", expansion.c_str());
      if (TooLong(expansion, kTemplateCapacity, "ERROR: opening template too long: ")) return 0;
      if (!expansion.empty()) {
        command = BuildTemplateCommand(
            expansion, name, hasAnchor ? anchor.c_str() : nullptr,
            [](const std::string& program) {
              const char* path = TrovSearch("Program", program.c_str());
              return std::string(path ? path : "");
            },
            TraceMode != 0);
        haveCommand = true;
      }
    }
  }

  if (!haveCommand) {
    TraceMessage("INFO: wxLaunchDefaultApplication ", name.c_str());
    if (!services.LaunchDefaultApplication(name)) {
      std::string shown = anchorFromName ? name + "#" + anchor : name;
      TraceMessage("ERROR: undefined method to open document file: ", shown.c_str());
    }
    return 0;
  }

  // A command that does not fit is not run at all: a cut one could name
  // another file or drop the document.
  if (TooLong(command.commandLine, kCommandLineCapacity, "ERROR: command line too long: ")) return 0;
  TraceMessage("Run: ", command.commandLine.c_str());
  long result = services.Execute(command.argv);
  if (result <= 0) {
    std::string code = std::to_string(result);
    TraceMessage("WARNING: execution failed with error code=", code.c_str());
  }
  return 1;
}
