// The build tree installed into a DESTDIR: the files land where the desktop looks for
// them and pass its validators, and the installed program starts on its installed tree.
#include <gtest/gtest.h>

#include "e2e_support.h"

namespace {

using namespace e2e;

int Shell(const std::string& command) { return std::system(command.c_str()); }

TEST(Install, PutsEverythingInPlaceAndTheProgramFindsItsTree) {
  testing_support::TempDir dir;
  const std::string dest = dir / "dest", prefix = dest + "/usr/local", share = prefix + "/share/",
                    tree = share + "docuvane/texmf", id = "org.lomari.Docuvane";
  ASSERT_EQ(Shell("DESTDIR='" + dest + "' cmake --install '" DOCUVANE_BUILD_DIR "' >/dev/null"), 0);
  std::vector<std::string> files{tree + "/Docuvane/Docuvane.ini", tree + "/Update/command.Index",
                                 tree + "/doc/latex/amsmath/amsldoc.pdf"};
  for (const char* program : {"docuvane", "docuvane-open", "docuvane-mkindex", "docuvane-mkpdf"})
    files.insert(files.end(), {prefix + "/bin/" + program, share + "man/man1/" + program + ".1"});
  for (const char* size : {"16x16", "32x32", "48x48", "128x128", "256x256"})
    files.push_back(share + "icons/hicolor/" + size + "/apps/" + id + ".png");
  for (const std::string& file : files) EXPECT_TRUE(std::filesystem::is_regular_file(file)) << file;
  EXPECT_EQ(Shell("desktop-file-validate '" + share + "applications/" + id + ".desktop'"), 0);
  EXPECT_EQ(Shell("appstreamcli validate --no-net '" + share + "metainfo/" + id + ".metainfo.xml'"),
            0);

  // No TEXMF: the program must find the tree installed beside it.
  const std::string home = dir / "home", run = dir / "run";
  std::string binary = prefix + "/bin/docuvane";
  for (const std::string& d : {home, run}) std::filesystem::create_directories(d);
  chmod(run.c_str(), 0700);
  Process program{-1, dir / "log"};
  std::vector<std::string> env{"HOME=" + home,
                               "XDG_RUNTIME_DIR=" + run,
                               "XDG_CACHE_HOME=" + home,
                               "TROVLIB_LOG=" + program.log,
                               "PATH=" + prefix + "/bin:/usr/bin:/bin",
                               "NO_AT_BRIDGE=1",
                               "GDK_BACKEND=x11",
                               std::string("DISPLAY=") + std::getenv("DISPLAY")};
  std::vector<char*> argv{binary.data(), nullptr}, envp;
  for (auto& e : env) envp.push_back(e.data());
  envp.push_back(nullptr);
  ASSERT_EQ(posix_spawn(&program.pid, argv[0], nullptr, nullptr, argv.data(), envp.data()), 0);
  EXPECT_TRUE(
      WaitFor([&] { return HasPrefix(program.Lines(), "Docuvane: Docuvane::OnInit --- Parse"); }));
  const Log log = program.Lines();
  // On a machine with a TeX installation the installation's trees come
  // first and the sample tree is not used; the build tree never is.
  const bool tex = Shell("kpsewhich -var-value TEXMFDIST >/dev/null 2>&1") == 0 ||
                   std::filesystem::is_directory("/usr/share/texmf") ||
                   std::filesystem::is_directory("/usr/share/texlive");
  EXPECT_EQ(Count(log, "Docuvane: Private INI file: " + tree + "/Docuvane/Docuvane.ini"),
            tex ? 0 : 1)
      << Describe(log);
  EXPECT_EQ(Count(log, "Docuvane: Document Word Index File: " + tree + "/Update/command.Index"),
            tex ? 0 : 1);
  for (const LogLine& line : log)
    EXPECT_EQ(line.text.find(DOCUVANE_BUILD_DIR), std::string::npos) << line.text;
  program.Stop();
}

}  // namespace
