// A scanned tree in the real program: a manual made by the project's PDF
// maker is scanned, and the window started on its index looks a word up.
#include <gtest/gtest.h>

#include <cstdio>

#include "e2e_support.h"

namespace {

using namespace e2e;
namespace fs = std::filesystem;

std::string Output(const std::string& command) {
  std::string out;
  if (FILE* pipe = popen(command.c_str(), "r")) {
    char buffer[4096];
    for (std::size_t n; (n = fread(buffer, 1, sizeof buffer, pipe)) > 0;) out.append(buffer, n);
    pclose(pipe);
  }
  return out;
}

TEST(ScannedTree, TheWindowLooksUpAWordOfTheScannedManual) {
  Sandbox box;
  // The sandbox's TEXMF becomes a tree with one manual and nothing else.
  const fs::path tree = fs::path(box.root()) / "texmf", scan = fs::path(box.root()) / "scan";
  fs::remove_all(tree);
  fs::create_directories(tree / "doc/latex/demo");
  ASSERT_EQ(std::system((std::string(DOCUVANE_MKPDF) + " --manual " +
                         (tree / "doc/latex/demo/manual.pdf").string())
                            .c_str()),
            0);
  ASSERT_EQ(std::system(("XDG_CACHE_HOME=" + scan.string() + " " + DOCUVANE_MKINDEX + " --scan " +
                         tree.string() + " 2>/dev/null")
                            .c_str()),
            0);
  for (const char* file : {"Update/command.Index", "Docuvane/Docuvane.ini"}) {
    fs::create_directories((tree / file).parent_path());
    fs::copy_file(scan / "lomari/texmf" / file, tree / file);
  }
  // The window lists what this file holds: the physical pages 3 and 4 of
  // the printed pages 1 and 2 the manual's index links to.
  const std::string listed =
      Output(std::string(DOCUVANE_MKINDEX) + " --dump " + (tree / "Update/command.Index").string());
  EXPECT_NE(listed.find("\\section\tlatex/demo/manual.pdf\t3 4\n"), std::string::npos) << listed;

  Process first = box.StartInstance();
  ASSERT_TRUE(first.Running());
  EXPECT_EQ(box.Run({"\\section"}).status, 255);  // a word given to the running window
  ASSERT_TRUE(WaitFor([&] {
    return Count(first.Lines(), "INFO: Docuvane::Show_Topic \\section") > 0;
  })) << Describe(first.Lines());
  const Log log = first.Lines();
  EXPECT_FALSE(HasPrefix(log, "Docuvane: ERROR: Can't open Word Index")) << Describe(log);
  EXPECT_TRUE(first.Running());
  first.Stop();
}

}  // namespace
