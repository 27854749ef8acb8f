// The build tree installed as a user installs it, into a DESTDIR: the files
// land where the desktop looks for them and pass its validators, and the
// installed program starts on its installed sample tree.
#include <gtest/gtest.h>

#include "e2e_support.h"

namespace {

using namespace e2e;

TEST(Install, PutsEverythingInPlaceAndTheProgramFindsItsTree) {
  testing_support::TempDir dir;
  const std::string dest = dir / "dest", prefix = dest + "/usr/local";
  ASSERT_EQ(
      std::system(
          ("DESTDIR='" + dest + "' cmake --install '" DOCUVANE_BUILD_DIR "' >/dev/null").c_str()),
      0);
  std::vector<std::string> files{"share/docuvane/texmf/Docuvane/Docuvane.ini",
                                 "share/docuvane/texmf/Update/command.Index",
                                 "share/docuvane/texmf/doc/latex/amsmath/amsldoc.pdf",
                                 "share/applications/org.lomari.Docuvane.desktop",
                                 "share/metainfo/org.lomari.Docuvane.metainfo.xml"};
  for (const char* program : {"docuvane", "docuvane-open", "docuvane-mkindex", "docuvane-mkpdf"}) {
    files.push_back(std::string("bin/") + program);
    files.push_back(std::string("share/man/man1/") + program + ".1");
  }
  for (const char* size : {"16x16", "32x32", "48x48", "128x128", "256x256"})
    files.push_back(std::string("share/icons/hicolor/") + size + "/apps/org.lomari.Docuvane.png");
  for (const std::string& file : files)
    EXPECT_TRUE(std::filesystem::is_regular_file(prefix + "/" + file)) << file;
  EXPECT_EQ(std::system(("desktop-file-validate '" + prefix +
                         "/share/applications/org.lomari.Docuvane.desktop'")
                            .c_str()),
            0);
  EXPECT_EQ(std::system(("appstreamcli validate --no-net '" + prefix +
                         "/share/metainfo/org.lomari.Docuvane.metainfo.xml' >/dev/null")
                            .c_str()),
            0);

  // No TEXMF: the program must find the tree installed beside it.
  const std::string home = dir / "home", run = dir / "run";
  std::filesystem::create_directories(home);
  std::filesystem::create_directories(run);
  chmod(run.c_str(), 0700);
  Process program;
  program.log = dir / "log";
  std::vector<std::string> env{
      "HOME=" + home,
      "XDG_RUNTIME_DIR=" + run,
      "XDG_CACHE_HOME=" + home + "/.cache",
      "TROVLIB_LOG=" + program.log,
      "PATH=" + prefix + "/bin:/usr/bin:/bin",
      "NO_AT_BRIDGE=1",
      "GDK_BACKEND=x11",
      "DISPLAY=" + std::string(std::getenv("DISPLAY") ? std::getenv("DISPLAY") : "")};
  const std::string binary = prefix + "/bin/docuvane";
  std::vector<char*> argv{const_cast<char*>(binary.c_str()), nullptr}, envp;
  for (auto& e : env) envp.push_back(e.data());
  envp.push_back(nullptr);
  ASSERT_EQ(posix_spawn(&program.pid, binary.c_str(), nullptr, nullptr, argv.data(), envp.data()),
            0);
  const std::string tree = prefix + "/share/docuvane/texmf";
  EXPECT_TRUE(WaitFor([&] {
    return HasPrefix(program.Lines(), "Docuvane: Docuvane::OnInit --- Parse");
  })) << Describe(program.Lines());
  EXPECT_EQ(
      Count(program.Lines(), "Docuvane: Private INI file: " + tree + "/Docuvane/Docuvane.ini"), 1)
      << Describe(program.Lines());
  EXPECT_EQ(Count(program.Lines(),
                  "Docuvane: Document Word Index File: " + tree + "/Update/command.Index"),
            1);
  program.Stop();
}

}  // namespace
