// Opening documents: anchor and extension, resolution, the document cache,
// the three viewer routes and hostile names through each of them.
#include "access/opendoc.h"

#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <fstream>
#include <memory>
#include <optional>
#include <sstream>
#include <string>
#include <tuple>
#include <vector>

#include "base/settings.h"
#include "fake_access_services.h"
#include "platform/profile.h"
#include "test_support.h"

extern char** environ;

namespace {

using testing_support::FakeAccessServices;
using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;
using Args = std::vector<std::string>;

const char kCompletePdf[] = "%PDF-1.4\n1 0 obj << >> endobj\nstartxref\n9\n%%EOF\n";
const char kServer[] = "http://docs.test";
const char kAcrobat[] = "/opt/Acrobat Reader/bin/acroread";

bool Exists(const std::string& path) {
  struct stat st;
  return stat(path.c_str(), &st) == 0;
}

class OpenDocTest : public ::testing::Test {
 protected:
  void SetUp() override {
    root_.Write("texmf/doc/latex/base/installed.pdf", "not even a PDF");
    chmod(root_.Write("bin/viewer", "#!/bin/sh\n").c_str(), 0755);
    texmf_ = std::make_unique<ScopedEnv>("TEXMF", root_ / "texmf");
    vartex_ = std::make_unique<ScopedEnv>("VARTEX", root_ / "var");
    path_ = std::make_unique<ScopedEnv>("PATH", root_ / "bin" + ":" + std::getenv("PATH"));
    saved_ = {IniFilePath, RootPath};
    RootPath.clear();
    WriteExtensions("");
    DocumentServerURL = kServer;
  }
  void TearDown() override {
    std::tie(IniFilePath, RootPath) = saved_;
    DocumentServerURL = nullptr;
    ProfileCacheClear();
  }
  void WriteExtensions(const std::string& lines) {
    IniFilePath = root_.Write("Docuvane.ini", "[Extensions]\n" + lines);
    ProfileCacheClear();
  }
  std::string Cache(std::string rel) const {
    for (char& c : rel)
      if (c == '\\') c = '/';
    return root_ / "var/doc/" + rel;
  }
  std::string Viewer() const { return root_ / "bin/viewer"; }
  // A download that leaves `content` where it was asked to.
  static std::function<int(const FakeAccessServices::DownloadCall&)> Leaves(std::string content) {
    return [content](const FakeAccessServices::DownloadCall& call) {
      if (!content.empty()) std::ofstream(call.path, std::ios::binary) << content;
      return static_cast<int>(content.size());
    };
  }

  TempDir root_;
  std::unique_ptr<ScopedEnv> texmf_, vartex_, path_;
  std::pair<std::string, std::string> saved_;
};

TEST(OpenDocPaths, IsAbsolutePath) {
  for (const char* name : {"C:\\docs\\a.pdf", "c:a.pdf", "/docs/a.pdf", "\\\\server\\a.pdf"})
    EXPECT_TRUE(Is_Absolute_Path(name)) << name;
  for (const char* name : {"\\docs\\a.pdf", "docs/a.pdf", "1:\\a.pdf", ":a.pdf", "", "\xc3\xa4:x",
                           "C", static_cast<const char*>(nullptr)})
    EXPECT_FALSE(Is_Absolute_Path(name)) << (name ? name : "null");
}

TEST(OpenDocPaths, CheckLoadedPdf) {
  TempDir dir;
  const std::string padding(2000, 'x');
  auto check = [&](const std::string& content) {
    return Check_Loaded_PDF(dir.Write("f.pdf", content).c_str());
  };
  EXPECT_TRUE(check(kCompletePdf));
  EXPECT_TRUE(check("%PDF-1.7\n" + padding + "startxref\n12\n%%EOF")) << "in the last 1024";
  EXPECT_TRUE(check("%PDF-1.5 startxref")) << "ending exactly at the end";
  EXPECT_FALSE(check("%PDF-1.7\nstartxref\n" + padding)) << "only before the last 1024";
  EXPECT_FALSE(check("%PDF-1.7\nstartxref" + std::string(1021, 'y'))) << "across the boundary";
  EXPECT_FALSE(check("%PDF-2.0 startxref")) << "wrong magic";
  EXPECT_FALSE(check("<html>startxref</html>"));
  EXPECT_FALSE(check("%PDF-1.4")) << "shorter than nine bytes";
  EXPECT_FALSE(Check_Loaded_PDF((dir / "missing.pdf").c_str()));
  EXPECT_FALSE(Check_Loaded_PDF(dir.path().c_str())) << "a directory";
  EXPECT_FALSE(Check_Loaded_PDF(nullptr));
}

TEST(OpenDocPaths, MakePathAndMakeFilePath) {
  TempDir dir;
  dir.Write("file", "x");
  EXPECT_EQ(Make_Path((dir / "a/b/c").c_str()), 0);
  EXPECT_EQ(Make_Path((dir / "a/b/c").c_str()), 0) << "existing directory";
  EXPECT_EQ(Make_Path((dir.path() + "\\w\\x\\y").c_str()), 0) << "backslashes";
  EXPECT_TRUE(Exists(dir / "a/b/c") && Exists(dir / "w/x/y"));
  EXPECT_NE(Make_Path((dir / "file/sub").c_str()), 0) << "a file in the way";

  EXPECT_EQ(Make_File_Path((dir / "p/q/doc.pdf").c_str()), 0);
  EXPECT_TRUE(Exists(dir / "p/q") && !Exists(dir / "p/q/doc.pdf"));
  EXPECT_NE(Make_File_Path("doc.pdf"), 0) << "no separator";
  EXPECT_NE(Make_File_Path((dir / (std::string(300, 'd') + "/x.pdf")).c_str()), 0);
  EXPECT_FALSE(Exists(dir / std::string(300, 'd'))) << "nothing made for a refused path";
}

TEST_F(OpenDocTest, ResolutionAndTheDocumentCache) {
  const std::string installed = root_ / "texmf/doc/latex/base/installed.pdf";
  struct Row {
    const char* what;
    const char* name;
    std::string cached;      // copy in the cache before; "" for none
    std::string downloaded;  // what the transfer leaves; "" for nothing
    bool fetches;
    std::string opened;  // "" when refused
  } rows[] = {
      {"installed copy used as found", "latex\\base\\installed.pdf", "", "", false, installed},
      {"fetched into the cache", "latex/guide.pdf#page=2", "", kCompletePdf, true,
       Cache("latex/guide.pdf")},
      {"complete cached copy used", "a/cached.pdf", kCompletePdf, "", false, Cache("a/cached.pdf")},
      {"incomplete copy fetched again", "a/part.pdf", "%PDF-1.4 cut", kCompletePdf, true,
       Cache("a/part.pdf")},
      {"backslashes: cache path fixed", "b\\c\\d.pdf", "", kCompletePdf, true, Cache("b/c/d.pdf")},
      {"nothing arrives", "a/missing.pdf", "", "", true, ""},
      {"an error page is no document", "a/page.pdf", "", "<html>404</html>", true, ""},
      {"html never passes the check", "a/guide.html", "", "<html>startxref</html>", true, ""},
      {"dots inside names are fine", "a..b/..c.pdf", "", kCompletePdf, true, Cache("a..b/..c.pdf")},
      {"leaves the cache", "../evil.pdf", "", kCompletePdf, false, ""},
      {"leaves it deeper", "a/../../evil.pdf", "", kCompletePdf, false, ""},
      {"leaves it by backslashes", "..\\..\\evil.pdf", "", kCompletePdf, false, ""},
      {"ends by leaving", "a/..", "", kCompletePdf, false, ""},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    const std::string rel = std::string(row.name).substr(0, std::string(row.name).find('#'));
    if (!row.cached.empty()) root_.Write("var/doc/" + rel, row.cached);
    FakeAccessServices services;
    services.onDownload = Leaves(row.downloaded);
    MessageCapture capture;
    OpenDocumentFile(services, row.name, nullptr);
    ASSERT_EQ(services.downloads.size(), row.fetches ? 1u : 0u);
    if (row.fetches) {
      EXPECT_EQ(services.downloads[0].message, "Downloading " + rel + " ...");
      EXPECT_EQ(services.downloads[0].url, std::string(kServer) + "/" + rel) << "name kept as is";
      EXPECT_EQ(services.downloads[0].path, Cache(rel));
    }
    EXPECT_EQ(services.defaultApplication, row.opened.empty() ? Args{} : Args{row.opened});
    if (row.fetches && row.opened.empty()) {
      EXPECT_EQ(services.errors, (std::vector<std::pair<std::string, std::string>>{
                                     {"Can't download document file '" + rel +
                                          "'\nfrom document server 'http://docs.test'\n\n"
                                          "It is probably internet error. Try later.",
                                      "Lomari Docuvane Error"}}));
      EXPECT_TRUE(capture.Contains("ERROR: Not accessible the document: " + rel));
    } else {
      EXPECT_TRUE(services.errors.empty());
    }
  }
  // Found by the search, gone when opened: refused, nothing fetched.
  std::remove(installed.c_str());
  FakeAccessServices services;
  MessageCapture capture;
  EXPECT_EQ(OpenDocumentFile(services, "latex/base/installed.pdf", nullptr), 0);
  EXPECT_TRUE(capture.Contains("ERROR: Not accessible the document: latex/base/installed.pdf"));
  EXPECT_TRUE(services.Untouched());
}

TEST_F(OpenDocTest, DocumentServerComesFromTheVariableOrTheDefault) {
  const std::string longServer = "http://docs.test/" + std::string(500, 's');
  for (std::optional<std::string> variable :
       {{longServer}, std::optional<std::string>("http://mirror.test/d"), {}}) {
    ScopedEnv server("DOCSERVER", variable);
    DocumentServerURL = nullptr;
    FakeAccessServices services;
    MessageCapture capture;
    OpenDocumentFile(services, "x/y.pdf", nullptr);
    if (variable == longServer) {
      EXPECT_TRUE(services.downloads.empty());
      EXPECT_TRUE(capture.Contains("ERROR: document server URL too long: "));
      continue;
    }
    ASSERT_EQ(services.downloads.size(), 1u);
    EXPECT_EQ(services.downloads[0].url, variable.value_or(kDefaultDocumentServerURL) + "/x/y.pdf");
  }
  ScopedEnv server("DOCSERVER", std::string("http://other.test"));
  Get_Doc_Server();
  EXPECT_STREQ(DocumentServerURL, kDefaultDocumentServerURL) << "set once, never read again";
}

TEST_F(OpenDocTest, AnchorExtensionAndViewerRoutes) {
  const char* kExample = "dvi=<viewer>{ -p #} ^.dvi";
  const std::string longAnchor(250, 'a'), longExt(40, 'e'), n248(248, 'n');
  const std::string longReader = "/opt/" + std::string(300, 'a') + "/acroread";
  const std::string deepRelative = std::string(250 - Cache("").size(), 'r') + "/x.pdf";  // 256
  struct Row {
    const char* what;
    std::string name;
    const char* anchor;
    Args argv;           // the command run; empty: none
    std::string opened;  // what the default application gets; "" for nothing
    std::string traced;  // a message that must appear, or ""
    std::string reader = "", extensions = "", root = "";
  } rows[] = {
      // clang-format off
      {"anchor split at the first #", "/d/g.pdf#page=3", nullptr, {}, "/d/g.pdf",
       "Openning document type: pdf"},
      {"further # stay in the anchor", "/d/a.b.html#x#y.z", nullptr, {}, "/d/a.b.html",
       "Openning document type: html"},
      {"a caller's anchor keeps # in the name", "/d/g.pdf#p=3", "p=5", {}, "/d/g.pdf#p=3",
       "Openning document type: pdf#p=3"},
      {"extension may hold a slash", "/x/docs.old/readme", nullptr, {}, "/x/docs.old/readme",
       "Openning document type: old/readme"},
      {"extension cut to 31", "/d/a." + longExt, nullptr, {}, "/d/a." + longExt,
       "Openning document type: " + longExt.substr(0, 31) + "\n"},
      {"no dot", "readme", nullptr, {}, "", "ERROR: undefined type of file: readme"},
      {"dot only in the anchor", "/d/readme#a.b", nullptr, {}, "",
       "ERROR: undefined type of file: /d/readme#a.b"},
      {"name of 255 characters", "/d/" + n248 + ".xyz", nullptr, {}, "/d/" + n248 + ".xyz", ""},
      {"name of 256 characters", "/d/" + n248 + "n.xyz", nullptr, {}, "",
       "ERROR: document name too long"},
      {"cache path beyond 255", deepRelative, nullptr, {}, "", "ERROR: document path too long: "},
      {"Acrobat: anchor cut at its first blank", "/d/g.pdf#page=12 15 ", nullptr,
       {kAcrobat, "/A", "page=12", "/d/g.pdf"}, "",
       "Run: \"/opt/Acrobat Reader/bin/acroread\" /A \"page=12\" \"/d/g.pdf\"", kAcrobat},
      {"Acrobat: empty anchor", "/d/g.pdf#", nullptr, {kAcrobat, "/A", "", "/d/g.pdf"}, "",
       "PDF Reader: /opt/Acrobat Reader/bin/acroread", kAcrobat},
      {"Acrobat: capitals, ACRO anywhere", "/d/G.PDF", "nameddest=x",
       {"/x/MYACROVIEW", "/A", "nameddest=x", "/d/G.PDF"}, "", "", "/x/MYACROVIEW"},
      {"reader outside the family", "/d/g.pdf", "p=1", {}, "/d/g.pdf", "", "/usr/bin/evince"},
      {"no reader", "/d/g.pdf", "page=1", {}, "/d/g.pdf", ""},
      {"reader path beyond 259 is no reader", "/d/g.pdf", "page=1", {}, "/d/g.pdf",
       "ERROR: PDF reader path too long: ", longReader},
      {"not a pdf", "/d/g.dvi", "page=1", {}, "/d/g.dvi", "", kAcrobat},
      {"other pdf readers use the template", "/d/g.pdf", "page=3",
       {Viewer(), "-p", "page=3", "/d/g.pdf"}, "", "", "/usr/bin/evince",
       "pdf=<viewer> -p # ^.pdf"},
      {"the example template", "/d/guide.dvi", "5", {Viewer(), "-p", "5", "/d/guide.dvi"}, "", "",
       "", kExample},
      {"the example without anchor", "/d/guide.dvi", nullptr, {Viewer(), "/d/guide.dvi"}, "", "",
       "", kExample},
      {"key found ignoring case", "/d/g.dvi", nullptr, {Viewer(), "/d/g.dvi"}, "", "", "",
       "DVI=<viewer> ^.dvi"},
      {"Root expansion; a failed start still counts", "/d/g.dvi", nullptr,
       {"/opt/tex/bin/v", "/d/g.dvi"}, "", "WARNING: execution failed with error code=-1", "",
       "dvi=%s/bin/v ^.dvi", "/opt/tex"},
      {"lone %s with empty Root: default route", "/d/g.dvi", nullptr, {}, "/d/g.dvi", "", "",
       "dvi=%s"},
      {"missing program keeps its slot", "/d/g.dvi", nullptr, {"", "/d/g.dvi"}, "",
       "Run:  /d/g.dvi", "", "dvi=<nosuchviewer> ^.dvi"},
      {"expansion beyond 63 refused", "/d/g.dvi", nullptr, {}, "",
       "ERROR: opening template too long: ", "", "dvi=%s/v ^.dvi", std::string(60, 'r')},
      {"command line beyond 255 refused", "/d/g.dvi", longAnchor.c_str(), {}, "",
       "ERROR: command line too long: ", "", "dvi=<viewer> # ^.dvi"},
      {"default application fails", "/d/x.xyz#here", nullptr, {}, "/d/x.xyz",
       "ERROR: undefined method to open document file: /d/x.xyz#here"},
      {"a given anchor is not shown", "/d/x.xyz", "given", {}, "/d/x.xyz",
       "ERROR: undefined method to open document file: /d/x.xyz\n"},
      // clang-format on
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    WriteExtensions(row.extensions + "\n");
    RootPath = row.root;
    FakeAccessServices services;
    services.reader = row.reader;
    services.executeResult = -1;
    services.defaultApplicationResult = !(row.traced.rfind("ERROR: undefined method", 0) == 0);
    MessageCapture capture;
    EXPECT_EQ(OpenDocumentFile(services, row.name.c_str(), row.anchor), row.argv.empty() ? 0 : 1);
    EXPECT_EQ(services.executed,
              row.argv.empty() ? std::vector<Args>{} : std::vector<Args>{row.argv});
    EXPECT_EQ(services.defaultApplication, row.opened.empty() ? Args{} : Args{row.opened});
    EXPECT_TRUE(services.downloads.empty());
    EXPECT_EQ(capture.Contains("ERROR"), row.traced.rfind("ERROR", 0) == 0);
    std::string all;
    for (const auto& m : capture.messages()) all += m.line() + "\n";
    EXPECT_NE(all.find(row.traced), std::string::npos) << all;
  }
  FakeAccessServices services;
  services.reader = kAcrobat;
  OpenDocumentFile(services, "/d/g.pdf", nullptr);
  EXPECT_TRUE(services.findExecutable.empty()) << "the association is only asked with an anchor";
}

// Starts argv as a viewer would be started and waits for it.
long SpawnAndWait(const Args& argv) {
  std::vector<char*> args;
  for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
  args.push_back(nullptr);
  pid_t pid = 0;
  int status = 0;
  if (posix_spawn(&pid, args[0], nullptr, nullptr, args.data(), environ) != 0) return -1;
  waitpid(pid, &status, 0);
  return pid;
}

TEST_F(OpenDocTest, HostileNamesAndAnchorsThroughEveryRoute) {
  const std::string record = root_ / "record", recorder = root_ / "bin/acrorecorder";
  const std::string touch = "touch " + root_ / "SENTINEL";
  root_.Write("bin/acrorecorder",
              "#!/bin/sh\nfor a in \"$@\"; do printf '%s\\0' \"$a\"; done > '" + record + "'\n");
  chmod(recorder.c_str(), 0755);
  WriteExtensions("dvi=<acrorecorder> -p # \"^.dvi\"\n");
  // clang-format off
  const Args hostile = {"a\" --evil-opt=1 \"b", "it's", "back\\slash\\\\", "semi;" + touch,
      "pipe|" + touch, "amp&" + touch + "&", "$(" + touch + ")", "`" + touch + "`", "-rf", "--help",
      "new\nline", "tab\there", "Gr\u00fc\u00dfe_\u6587", "*?[glob]", "~user", ">out <in 2>&1",
      "%s%n%x", "${HOME}", "'single' \"double\"", "{^}<viewer>~#", "  blanks around  ",
      "\x01\x1b[31mcontrol", "\\\\server\\share", std::string(4096, 'k')};
  // clang-format on
  for (const std::string& h : hostile) {
    SCOPED_TRACE(h.substr(0, 40));
    FakeAccessServices s;
    s.reader = recorder;
    std::vector<Args> recorded;
    s.onExecute = [&](const Args& argv) {
      long pid = SpawnAndWait(argv);
      std::stringstream content;
      content << std::ifstream(record, std::ios::binary).rdbuf();
      recorded.emplace_back();
      for (std::size_t at = 0, end; (end = content.str().find('\0', at)) != std::string::npos;
           at = end + 1)
        recorded.back().push_back(content.str().substr(at, end - at));
      return pid;
    };
    const std::string pdf = "/d/" + h + ".pdf", dvi = "/d/" + h + ".dvi", xyz = "/d/" + h + ".xyz";
    const std::string rel = "h/" + h + ".pdf";
    s.onDownload = Leaves(kCompletePdf);
    OpenDocumentFile(s, pdf.c_str(), "page=1");   // Acrobat route
    OpenDocumentFile(s, "/d/g.pdf", h.c_str());   // Acrobat route
    OpenDocumentFile(s, dvi.c_str(), h.c_str());  // template route
    OpenDocumentFile(s, xyz.c_str(), h.c_str());  // default route
    OpenDocumentFile(s, rel.c_str(), "x");        // fetch, then the Acrobat route
    if (h.size() > 200) {
      EXPECT_TRUE(s.Untouched());
      continue;
    }
    EXPECT_EQ(recorded, (std::vector<Args>{{"/A", "page=1", pdf},
                                           {"/A", h.substr(0, h.find(' ')), "/d/g.pdf"},
                                           {"-p", h, dvi},
                                           {"/A", "x", Cache(rel)}}));
    EXPECT_EQ(s.defaultApplication, Args{xyz});
    ASSERT_EQ(s.downloads.size(), 1u);
    EXPECT_EQ(s.downloads[0].url, std::string(kServer) + "/" + rel);
    EXPECT_EQ(s.downloads[0].path, Cache(rel));
  }
  EXPECT_FALSE(Exists(root_ / "SENTINEL")) << "no shell ever ran the names";
}

}  // namespace
