// The program as it is started.  A later start hands its command line to
// the running instance and ends without loading the toolkit and the eighty
// libraries that come with it; a first start becomes the window program
// installed beside this one, with the same arguments.
#include <memory>
#include <string>
#include <vector>

#include "base/trace.h"
#include "command/later_start.h"
#include "platform/exec.h"
#include "platform/program_dir.h"
#include "trovlib/trovlib.h"

namespace {

constexpr const char* kWindowProgram = "docuvane-window";

}  // namespace

int main(int argc, char** argv) {
  {
    // Asked without a word: the window program, which takes the lock for
    // good, reports what goes wrong with it.
    std::unique_ptr<InstanceLock> lock = TakeInstanceLock(false);
    if (lock->IsAnotherRunning()) {
      TraceMessage("Docuvane::OnInit --- ", "Start");
      ForwardArgumentsAndEnd(argc, argv);
    }
  }
  // The lock is free again for the window program.  Should another start
  // take it first, the window program finds it taken and forwards instead:
  // whoever holds the lock is the instance.
  std::vector<std::string> args(argv, argv + argc);
  args[0] = ProgramDirectory() + "/" + kWindowProgram;
  const std::string why = ReplaceProcess(args);
  TrovMessage("ERROR: Docuvane ", ("cannot start " + args[0] + ": " + why).c_str(), 5);
  return 127;
}
