// The desktop's file-type association.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "platform/findexec.h"
#include "test_support.h"

namespace {

using testing_support::ScopedEnv;

TEST(FindExecutable, FollowsTheAssociation) {
  testing_support::TempDir dir;  // the desktop's MIME tool, programs and application entries
  chmod(dir.Write("bin/xdg-mime",
                  "#!/bin/sh\ncase \"$2\" in\n"
                  "  filetype) case \"$3\" in *.pdf) echo application/pdf;;"
                  " *.dvi) echo application/x-dvi;; *) exit 4;; esac;;\n"
                  "  default) case \"$3\" in application/pdf) echo acroreader.desktop;;"
                  " application/x-dvi) echo vendor-dviview.desktop;; esac;;\nesac\n")
            .c_str(),
        0755);
  for (const char* viewer : {"bin/acroread", "bin/dviview"})
    chmod(dir.Write(viewer, "#!/bin/sh\n").c_str(), 0755);
  dir.Write("data/applications/acroreader.desktop",
            "[Desktop Action New]\nExec=wrong\n[Desktop Entry]\nExec=env LANG=C acroread %U\n");
  dir.Write("data/applications/vendor/dviview.desktop",
            "[Desktop Entry]\nExec = \"dviview\" --page %f\n");
  ScopedEnv path("PATH", dir / "bin" + ":/usr/bin:/bin"), data("XDG_DATA_HOME", dir / "data"),
      dirs("XDG_DATA_DIRS", dir / "none");
  const std::pair<std::string, std::string> rows[] = {
      // file, program
      {dir.Write("a b.pdf", "x"), dir / "bin/acroread"},
      {dir.Write("-x.dvi", "x"), dir / "bin/dviview"},  // a vendor subdirectory, quoted
      {dir.Write("c.txt", "x"), ""},
      {dir / "missing.pdf", ""},
      {"", ""},
  };
  for (const auto& [file, program] : rows) EXPECT_EQ(FindExecutable(file), program) << file;
}

}  // namespace
