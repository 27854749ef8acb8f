// Docuvane_Init: the private INI file's Setup section and the word index.
#include "base/settings.h"

#include <climits>
#include <cstdlib>
#include <cstring>
#include <string>

#include "base/trace.h"
#include "platform/paths.h"
#include "platform/profile.h"
#include "trovlib/trovlib.h"

std::string IniFilePath;
int TraceMode = 0;
std::string RootPath;

namespace {

constexpr unsigned long kSetupValueSize = 128;
constexpr std::size_t kRootLimit = 255;  // characters of the formatted Root

// atoi's reading (blanks, sign, digits up to the first other character),
// without its undefined behaviour on numbers beyond int: those saturate.
int ToInteger(const char* text) {
  long value = std::strtol(text, nullptr, 10);
  if (value > INT_MAX) return INT_MAX;
  if (value < INT_MIN) return INT_MIN;
  return static_cast<int>(value);
}

}  // namespace

std::string FormatRootValue(const char* value, const char* argument) {
  std::string out;
  if (value == nullptr) return out;
  if (argument == nullptr) argument = "";
  // The value is never handed to printf: only "%s" and "%%" mean anything,
  // and any other conversion has no argument to take, so it stays as text.
  for (const char* p = value; *p && out.size() < kRootLimit; ++p) {
    if (p[0] == '%' && p[1] == 's') {
      out += argument;
      ++p;
    } else if (p[0] == '%' && p[1] == '%') {
      out += '%';
      ++p;
    } else {
      out += *p;
    }
  }
  if (out.size() > kRootLimit) out.resize(kRootLimit);
  return out;
}

int Docuvane_Init(void (*openWordIndex)()) {
  TraceMessage("Docuvane_Init --- ", "Start");

  if (const char* found = TrovSearch("$TEXMF/Docuvane//", "Docuvane.ini")) {
    IniFilePath = found;
    Fix_Slashes(IniFilePath);
  } else {
    IniFilePath = "Docuvane.INI";
  }
  TraceMessage("Private INI file: ", IniFilePath.c_str());

  char value[kSetupValueSize];
  GetPrivateProfileStringA("Setup", "Trace", "0", value, sizeof value, IniFilePath.c_str());
  TraceMode = ToInteger(value);

  GetPrivateProfileStringA("Setup", "Root", "", value, sizeof value, IniFilePath.c_str());
  if (value[0] != '\0') RootPath = FormatRootValue(value, RootPath.c_str());

  if (openWordIndex != nullptr) openWordIndex();

  TraceMessage("Docuvane --- ", "End");
  return 1;
}
