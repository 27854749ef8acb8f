// Replacing the process image.
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "platform/exec.h"

std::string ReplaceProcess(const std::vector<std::string>& argv) {
  if (argv.empty()) return "no program";
  std::vector<char*> args;
  args.reserve(argv.size() + 1);
  for (const std::string& arg : argv) args.push_back(const_cast<char*>(arg.c_str()));
  args.push_back(nullptr);
  execv(args[0], args.data());
  return std::strerror(errno);
}
