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
#include <vector>

#include "fake_access_services.h"
#include "platform/profile.h"
#include "shell/settings.h"
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

class OpenDocTest : public ::testing::Test {
 protected:
  void SetUp() override {
    root_.Write("texmf/doc/latex/base/installed.pdf", "not even a PDF");
    root_.Write("bin/viewer", "#!/bin/sh\nexit 0\n");
    chmod((root_ / "bin/viewer").c_str(), 0755);
    texmf_ = std::make_unique<ScopedEnv>("TEXMF", root_ / "texmf");
    vartex_ = std::make_unique<ScopedEnv>("VARTEX", root_ / "var");
    const char* path = std::getenv("PATH");
    path_ = std::make_unique<ScopedEnv>("PATH", root_ / "bin" + ":" + (path ? path : "/usr/bin:/bin"));
    savedIni_ = IniFilePath;
    savedRoot_ = RootPath;
    savedTrace_ = TraceMode;
    TraceMode = 0;
    RootPath.clear();
    WriteExtensions("");
    DocumentServerURL = kServer;
  }
  void TearDown() override {
    IniFilePath = savedIni_;
    RootPath = savedRoot_;
    TraceMode = savedTrace_;
    DocumentServerURL = nullptr;
    ProfileCacheClear();
  }

  void WriteExtensions(const std::string& lines) {
    IniFilePath = root_.Write("Docuvane.ini", "[Extensions]\n" + lines);
    ProfileCacheClear();
  }
  std::string CacheDir() const { return root_ / "var/doc/"; }
  std::string Viewer() const { return root_ / "bin/viewer"; }
  // A download that leaves a complete copy where it was asked to.
  static int WriteComplete(const FakeAccessServices::DownloadCall& call) {
    std::ofstream(call.path, std::ios::binary) << kCompletePdf;
    return static_cast<int>(sizeof kCompletePdf - 1);
  }

  TempDir root_;
  std::unique_ptr<ScopedEnv> texmf_, vartex_, path_;
  std::string savedIni_, savedRoot_;
  int savedTrace_ = 0;
};

TEST_F(OpenDocTest, AnchorAndExtension) {
  struct Row {
    const char* what;
    const char* name;
    const char* anchor;
    const char* typeTrace;  // "" when refused
    const char* opened;     // what the default application receives
  } rows[] = {
      {"anchor split at the first #", "/d/guide.pdf#page=3", nullptr, "pdf", "/d/guide.pdf"},
      {"further # stay in the anchor", "/d/a.b.html#x#y.z", nullptr, "html", "/d/a.b.html"},
      {"caller's anchor keeps # in the name", "/d/guide.pdf#page=3", "page=5", "pdf#page=3",
       "/d/guide.pdf#page=3"},
      {"empty anchor", "/d/guide.pdf#", nullptr, "pdf", "/d/guide.pdf"},
      {"extension may hold a slash", "/x/docs.old/readme", nullptr, "old/readme", "/x/docs.old/readme"},
      {"extension cut to 31", "/d/a.0123456789012345678901234567890123456789", nullptr,
       "0123456789012345678901234567890", "/d/a.0123456789012345678901234567890123456789"},
      {"no dot", "readme", nullptr, "", nullptr},
      {"dot only in the anchor", "/d/readme#a.b", nullptr, "", nullptr},
  };
  for (const Row& row : rows) {
    FakeAccessServices services;
    MessageCapture capture;
    EXPECT_EQ(OpenDocumentFile(services, row.name, row.anchor), 0) << row.what;
    if (*row.typeTrace == '\0') {
      EXPECT_TRUE(capture.Contains(std::string("ERROR: undefined type of file: ") + row.name)) << row.what;
      EXPECT_TRUE(services.Untouched()) << row.what;
      continue;
    }
    EXPECT_TRUE(capture.Contains(std::string("Openning document type: ") + row.typeTrace)) << row.what;
    EXPECT_EQ(services.defaultApplication, Args{row.opened}) << row.what;
  }
}

TEST(OpenDocPaths, IsAbsolutePath) {
  struct Row {
    const char* name;
    bool absolute;
  } rows[] = {
      {"C:\\docs\\a.pdf", true}, {"c:a.pdf", true},   {"/docs/a.pdf", true},
      {"\\\\server\\a.pdf", true}, {"\\docs\\a.pdf", false}, {"docs/a.pdf", false},
      {"1:\\a.pdf", false},       {":a.pdf", false},   {"", false},
      {"\xc3\xa4:x", false},      {"C", false},
  };
  for (const Row& row : rows) EXPECT_EQ(Is_Absolute_Path(row.name), row.absolute) << row.name;
  EXPECT_FALSE(Is_Absolute_Path(nullptr));
}

TEST(OpenDocPaths, CheckLoadedPdf) {
  TempDir dir;
  std::string padding(2000, 'x');
  struct Row {
    const char* what;
    std::string content;
    bool complete;
  } rows[] = {
      {"complete small file", kCompletePdf, true},
      {"startxref in the last 1024 bytes", "%PDF-1.7\n" + padding + "startxref\n12\n%%EOF", true},
      {"startxref ending exactly at the end", "%PDF-1.5 startxref", true},
      {"startxref only before the last 1024", "%PDF-1.7\nstartxref\n" + padding, false},
      {"startxref straddling the 1024 boundary", "%PDF-1.7\nstartx" + std::string("ref") + std::string(1021, 'y'), false},
      {"wrong magic", "%PDF-2.0 startxref", false},
      {"html page", "<html>startxref</html>", false},
      {"shorter than nine bytes", "%PDF-1.4", false},
      {"empty", "", false},
      {"magic only", "%PDF-1", false},
  };
  for (const Row& row : rows) {
    std::string path = dir.Write("f.pdf", row.content);
    EXPECT_EQ(Check_Loaded_PDF(path.c_str()), row.complete) << row.what;
  }
  EXPECT_FALSE(Check_Loaded_PDF((dir / "missing.pdf").c_str()));
  EXPECT_FALSE(Check_Loaded_PDF(dir.path().c_str())) << "a directory";
  EXPECT_FALSE(Check_Loaded_PDF(nullptr));
}

TEST(OpenDocPaths, MakePathAndMakeFilePath) {
  TempDir dir;
  struct stat st;
  EXPECT_EQ(Make_Path((dir / "a/b/c").c_str()), 0);
  EXPECT_TRUE(stat((dir / "a/b/c").c_str(), &st) == 0 && S_ISDIR(st.st_mode));
  EXPECT_EQ(st.st_mode & 0777 & ~0022u, 0755u & ~0022u);
  EXPECT_EQ(Make_Path((dir / "a/b/c").c_str()), 0) << "existing directory";
  EXPECT_EQ(Make_Path((dir.path() + "\\w\\x\\y").c_str()), 0) << "backslashes";
  EXPECT_EQ(stat((dir / "w/x/y").c_str(), &st), 0);

  dir.Write("file", "x");
  EXPECT_NE(Make_Path((dir / "file/sub").c_str()), 0) << "a file in the way";
  EXPECT_NE(Make_Path("/proc/docuvane-none/x"), 0) << "parent cannot be made";

  EXPECT_EQ(Make_File_Path((dir / "p/q/doc.pdf").c_str()), 0);
  EXPECT_EQ(stat((dir / "p/q").c_str(), &st), 0);
  EXPECT_NE(stat((dir / "p/q/doc.pdf").c_str(), &st), 0) << "the file itself is not made";
  EXPECT_NE(Make_File_Path("doc.pdf"), 0) << "no separator";
  std::string tooLong = dir / (std::string(300, 'd') + "/x.pdf");
  EXPECT_NE(Make_File_Path(tooLong.c_str()), 0);
  EXPECT_NE(stat((dir / std::string(300, 'd')).c_str(), &st), 0) << "nothing made for a refused path";
}

TEST_F(OpenDocTest, InstalledDocumentIsUsedAsFound) {
  FakeAccessServices services;
  MessageCapture capture;
  OpenDocumentFile(services, "latex\\base\\installed.pdf", nullptr);
  std::string full = root_ / "texmf/doc/latex/base/installed.pdf";
  EXPECT_TRUE(capture.Contains("Openning document file: " + full));
  EXPECT_TRUE(services.downloads.empty()) << "installed copies are not checked";
  EXPECT_EQ(services.defaultApplication, Args{full});

  // Found by the search, gone when opened: refused, nothing fetched.
  std::remove(full.c_str());
  FakeAccessServices again;
  capture.clear();
  EXPECT_EQ(OpenDocumentFile(again, "latex/base/installed.pdf", nullptr), 0);
  EXPECT_TRUE(capture.Contains("ERROR: Not accessible the document: latex/base/installed.pdf"));
  EXPECT_TRUE(again.Untouched());
}

TEST_F(OpenDocTest, FetchIntoTheCacheThenUseTheCache) {
  FakeAccessServices services;
  services.onDownload = WriteComplete;
  MessageCapture capture;
  OpenDocumentFile(services, "latex/guide.pdf#page=2", nullptr);

  const std::string cache = CacheDir() + "latex/guide.pdf";
  ASSERT_EQ(services.downloads.size(), 1u);
  EXPECT_EQ(services.downloads[0].message, "Downloading latex/guide.pdf ...");
  EXPECT_EQ(services.downloads[0].url, "http://docs.test/latex/guide.pdf");
  EXPECT_EQ(services.downloads[0].path, cache);
  EXPECT_EQ(services.defaultApplication, Args{cache});

  std::vector<std::string> expected = {
      "Open document: latex/guide.pdf#page=2",
      "INFO: Loading file to " + cache,
      "INFO: Loading from Document Server: http://docs.test",
      "INFO: Loading: http://docs.test/latex/guide.pdf",
      "INFO: Start Loading ...",
      "INFO: End Loading ...",
      "INFO: Checking Loaded file ...",
      "Openning document file: " + cache,
      "Openning document type: pdf",
      "INFO: wxLaunchDefaultApplication " + cache,
  };
  std::vector<std::string> got;
  for (const auto& m : capture.messages()) got.push_back(m.text);
  EXPECT_EQ(got, expected);

  // The complete copy is used from now on, without the server.
  FakeAccessServices second;
  capture.clear();
  OpenDocumentFile(second, "latex/guide.pdf", nullptr);
  EXPECT_TRUE(second.downloads.empty());
  EXPECT_TRUE(capture.Contains("INFO: Checking Loaded file ..."));
  EXPECT_EQ(second.defaultApplication, Args{cache});
}

TEST_F(OpenDocTest, FailedFetchShowsTheDownloadMessage) {
  struct Row {
    const char* what;
    const char* name;
    std::string cached;      // copy in the cache before; "" for none
    std::string downloaded;  // what the transfer leaves; "" for nothing
    bool fetches;
    bool opens;
  } rows[] = {
      {"nothing arrives", "a/missing.pdf", "", "", true, false},
      {"incomplete copy is fetched again", "a/partial.pdf", "%PDF-1.4 cut", kCompletePdf, true, true},
      {"an error page is no document", "a/page.pdf", "", "<html>404</html>", true, false},
      {"html never passes the check", "a/guide.html", "", "<html>startxref</html>", true, false},
      {"backslashes: cache path fixed", "b\\c\\d.pdf", "", kCompletePdf, true, true},
  };
  for (const Row& row : rows) {
    std::string rel = row.name;
    std::string cache = CacheDir() + rel;
    for (char& c : cache)
      if (c == '\\') c = '/';
    if (!row.cached.empty()) root_.Write("var/doc/" + std::string(row.name), row.cached);
    FakeAccessServices services;
    std::string content = row.downloaded;
    services.onDownload = [content](const FakeAccessServices::DownloadCall& call) {
      if (!content.empty()) std::ofstream(call.path, std::ios::binary) << content;
      return static_cast<int>(content.size());
    };
    MessageCapture capture;
    OpenDocumentFile(services, row.name, nullptr);
    ASSERT_EQ(services.downloads.size(), row.fetches ? 1u : 0u) << row.what;
    EXPECT_EQ(services.downloads[0].path, cache) << row.what;
    EXPECT_EQ(services.downloads[0].url, std::string(kServer) + "/" + rel) << row.what << ": URL keeps the name";
    if (row.opens) {
      EXPECT_EQ(services.defaultApplication, Args{cache}) << row.what;
      EXPECT_TRUE(services.errors.empty()) << row.what;
    } else {
      EXPECT_TRUE(services.defaultApplication.empty()) << row.what;
      ASSERT_EQ(services.errors.size(), 1u) << row.what;
      EXPECT_EQ(services.errors[0].first, "Can't download document file '" + rel +
                                              "'\nfrom document server 'http://docs.test'\n\n"
                                              "It is probably internet error. Try later.");
      EXPECT_EQ(services.errors[0].second, "Lomari Docuvane Error");
      EXPECT_TRUE(capture.Contains("ERROR: Not accessible the document: " + rel)) << row.what;
    }
  }
}

TEST_F(OpenDocTest, DocumentServerComesFromTheVariableOrTheDefault) {
  struct Row {
    std::optional<std::string> variable;
    std::string url;
  } rows[] = {
      {std::string("http://mirror.test/docs"), "http://mirror.test/docs/x/y.pdf"},
      {std::nullopt, std::string(kDefaultDocumentServerURL) + "/x/y.pdf"},
  };
  for (const Row& row : rows) {
    ScopedEnv server("DOCSERVER", row.variable);
    DocumentServerURL = nullptr;
    FakeAccessServices services;
    OpenDocumentFile(services, "x/y.pdf", nullptr);
    ASSERT_EQ(services.downloads.size(), 1u);
    EXPECT_EQ(services.downloads[0].url, row.url);
  }
  // Set once: a later change of the variable is not seen.
  ScopedEnv server("DOCSERVER", std::string("http://other.test"));
  Get_Doc_Server();
  EXPECT_STREQ(DocumentServerURL, kDefaultDocumentServerURL);
}

TEST_F(OpenDocTest, NamesThatLeaveTheCacheAreRefused) {
  for (const char* name : {"../evil.pdf", "a/../../evil.pdf", "..\\..\\evil.pdf", "a/.."}) {
    FakeAccessServices services;
    MessageCapture capture;
    EXPECT_EQ(OpenDocumentFile(services, name, nullptr), 0) << name;
    EXPECT_TRUE(services.Untouched()) << name;
  }
  FakeAccessServices services;
  services.onDownload = WriteComplete;
  OpenDocumentFile(services, "a..b/..c.pdf", nullptr);
  EXPECT_EQ(services.downloads.size(), 1u) << "dots inside names are fine";
}

TEST_F(OpenDocTest, AcrobatRoute) {
  struct Row {
    const char* what;
    const char* reader;
    const char* name;
    const char* anchor;
    Args argv;           // empty: not this route
    const char* line;    // the "Run: " trace
  } rows[] = {
      {"anchor cut at its first blank", kAcrobat, "/d/g.pdf#page=12 15 ", nullptr,
       {kAcrobat, "/A", "page=12", "/d/g.pdf"},
       "Run: \"/opt/Acrobat Reader/bin/acroread\" /A \"page=12\" \"/d/g.pdf\""},
      {"empty anchor", kAcrobat, "/d/g.pdf#", nullptr, {kAcrobat, "/A", "", "/d/g.pdf"},
       "Run: \"/opt/Acrobat Reader/bin/acroread\" /A \"\" \"/d/g.pdf\""},
      {"extension in capitals, ACRO anywhere", "/x/MYACROVIEW", "/d/G.PDF", "nameddest=x",
       {"/x/MYACROVIEW", "/A", "nameddest=x", "/d/G.PDF"}, nullptr},
      {"reader outside the family", "/usr/bin/evince", "/d/g.pdf", "page=1", {}, nullptr},
      {"no reader", "", "/d/g.pdf", "page=1", {}, nullptr},
      {"no anchor: not asked", kAcrobat, "/d/g.pdf", nullptr, {}, nullptr},
      {"not a pdf", kAcrobat, "/d/g.dvi", "page=1", {}, nullptr},
  };
  for (const Row& row : rows) {
    FakeAccessServices services;
    services.reader = row.reader;
    MessageCapture capture;
    int result = OpenDocumentFile(services, row.name, row.anchor);
    if (row.argv.empty()) {
      EXPECT_EQ(result, 0) << row.what;
      EXPECT_TRUE(services.executed.empty()) << row.what;
      EXPECT_EQ(services.defaultApplication.size(), 1u) << row.what;
    } else {
      EXPECT_EQ(result, 1) << row.what;
      ASSERT_EQ(services.executed.size(), 1u) << row.what;
      EXPECT_EQ(services.executed[0], row.argv) << row.what;
      EXPECT_TRUE(capture.Contains(std::string("PDF Reader: ") + row.reader)) << row.what;
      if (row.line) {
        EXPECT_TRUE(capture.Contains(row.line)) << row.what;
      }
    }
  }
  FakeAccessServices services;
  services.reader = kAcrobat;
  OpenDocumentFile(services, "/d/g.pdf", nullptr);
  EXPECT_TRUE(services.findExecutable.empty()) << "the association is only asked with an anchor";
}

TEST_F(OpenDocTest, TemplateRoute) {
  const std::string longAnchor(250, 'a');
  struct Row {
    const char* what;
    const char* extensions;
    std::string root;
    int trace;
    const char* name;
    const char* anchor;
    Args argv;           // empty: no command run
    bool defaultApp;
    const char* traced;  // a message that must appear, or nullptr
  } rows[] = {
      {"the example template", "dvi=<viewer>{ -p #} ^.dvi\n", "", 0, "/d/guide.dvi", "5",
       {Viewer(), "-p", "5", "/d/guide.dvi"}, false, nullptr},
      {"the example without anchor", "dvi=<viewer>{ -p #} ^.dvi\n", "", 0, "/d/guide.dvi", nullptr,
       {Viewer(), "/d/guide.dvi"}, false, nullptr},
      {"key found ignoring case", "DVI=<viewer> ^.dvi\n", "", 0, "/d/guide.dvi", nullptr,
       {Viewer(), "/d/guide.dvi"}, false, nullptr},
      {"Root expansion", "dvi=%s/bin/v ^.dvi\n", "/opt/tex", 0, "/d/g.dvi", nullptr,
       {"/opt/tex/bin/v", "/d/g.dvi"}, false, nullptr},
      {"lone %s with empty Root: default route", "dvi=%s\n", "", 0, "/d/g.dvi", nullptr, {}, true, nullptr},
      {"no template: default route", "", "", 0, "/d/g.dvi", nullptr, {}, true, nullptr},
      {"non-acro pdf with anchor uses the template", "pdf=<viewer> -p # ^.pdf\n", "", 0, "/d/g.pdf",
       "page=3", {Viewer(), "-p", "page=3", "/d/g.pdf"}, false, nullptr},
      {"missing program keeps its slot", "dvi=<nosuchviewer> ^.dvi\n", "", 0, "/d/g.dvi", nullptr,
       {"", "/d/g.dvi"}, false, "Run:  /d/g.dvi"},
      {"expansion beyond 63 refused", "dvi=%s/v ^.dvi\n", std::string(60, 'r'), 0, "/d/g.dvi", nullptr,
       {}, false, "ERROR: opening template too long: "},
      {"command line beyond 255 refused", "dvi=<viewer> # ^.dvi\n", "", 0, "/d/g.dvi",
       longAnchor.c_str(), {}, false, "ERROR: command line too long: "},
      {"traces under TraceMode", "dvi=%s ^.dvi\n", "/r", 1, "/d/g.dvi", nullptr, {"/r", "/d/g.dvi"}, false,
       "INFO: template(=) /r ^.dvi"},
  };
  for (const Row& row : rows) {
    WriteExtensions(row.extensions);
    RootPath = row.root;
    TraceMode = row.trace;
    FakeAccessServices services;
    services.reader = "/usr/bin/evince";
    MessageCapture capture;
    int result = OpenDocumentFile(services, row.name, row.anchor);
    EXPECT_EQ(result, row.argv.empty() ? 0 : 1) << row.what;
    if (row.argv.empty()) {
      EXPECT_TRUE(services.executed.empty()) << row.what;
    } else {
      ASSERT_EQ(services.executed.size(), 1u) << row.what;
      EXPECT_EQ(services.executed[0], row.argv) << row.what;
    }
    EXPECT_EQ(services.defaultApplication.size(), row.defaultApp ? 1u : 0u) << row.what;
    if (row.traced) {
      EXPECT_TRUE(capture.Contains(row.traced)) << row.what;
    }
    EXPECT_EQ(capture.Contains("INFO: template(*) "), row.trace != 0) << row.what;
    EXPECT_EQ(capture.Contains("INFO: templ-sp: "), row.trace != 0 && !row.argv.empty()) << row.what;
  }
}

TEST_F(OpenDocTest, DefaultRouteAndFailures) {
  FakeAccessServices services;
  services.defaultApplicationResult = false;
  MessageCapture capture;
  EXPECT_EQ(OpenDocumentFile(services, "/d/x.xyz#here", nullptr), 0);
  EXPECT_EQ(services.defaultApplication, Args{"/d/x.xyz"});
  EXPECT_TRUE(capture.Contains("INFO: wxLaunchDefaultApplication /d/x.xyz"));
  EXPECT_TRUE(capture.Contains("ERROR: undefined method to open document file: /d/x.xyz#here"));

  capture.clear();
  EXPECT_EQ(OpenDocumentFile(services, "/d/x.xyz", "given"), 0);
  EXPECT_TRUE(capture.Contains("ERROR: undefined method to open document file: /d/x.xyz"));
  EXPECT_FALSE(capture.Contains("#given")) << "a given anchor is not shown";

  // A start that fails is still reported as started.
  WriteExtensions("dvi=<viewer> ^.dvi\n");
  FakeAccessServices failing;
  failing.executeResult = -1;
  capture.clear();
  EXPECT_EQ(OpenDocumentFile(failing, "/d/g.dvi", nullptr), 1);
  EXPECT_TRUE(capture.Contains("WARNING: execution failed with error code=-1"));
}

TEST_F(OpenDocTest, OverlongTextsAreRefusedNotCut) {
  const std::string longServer = "http://docs.test/" + std::string(500, 's');
  const std::string name255 = "/d/" + std::string(248, 'n') + ".xyz";  // exactly 255
  const std::string name256 = "/d/" + std::string(249, 'n') + ".xyz";
  const std::string deepRelative = std::string(250 - CacheDir().size(), 'r') + "/x.pdf";  // cache path 256
  const std::string longReader = "/opt/" + std::string(300, 'a') + "/acroread";
  struct Row {
    const char* what;
    std::string name;
    const char* anchor;
    std::string server;
    std::string reader;
    const char* error;   // "" when nothing is refused
    bool opened;         // reached the default application
  } rows[] = {
      {"name of 255 characters", name255, nullptr, kServer, "", "", true},
      {"name of 256 characters", name256, nullptr, kServer, "", "ERROR: document name too long: ", false},
      {"cache path beyond the name's capacity", deepRelative, nullptr, kServer, "",
       "ERROR: document path too long: ", false},
      {"server URL beyond 511", "a/b.pdf", nullptr, longServer, "", "ERROR: document server URL too long: ", false},
      {"reader path beyond 259 is no reader", "/d/g.pdf", "page=1", kServer, longReader,
       "ERROR: PDF reader path too long: ", true},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    DocumentServerURL = row.server.c_str();
    FakeAccessServices services;
    services.reader = row.reader;
    MessageCapture capture;
    EXPECT_EQ(OpenDocumentFile(services, row.name.c_str(), row.anchor), 0);
    EXPECT_TRUE(services.executed.empty());
    EXPECT_TRUE(services.downloads.empty());
    EXPECT_EQ(services.defaultApplication.size(), row.opened ? 1u : 0u);
    if (*row.error) {
      EXPECT_TRUE(capture.Contains(row.error));
    } else {
      EXPECT_FALSE(capture.Contains("ERROR"));
    }
  }
  DocumentServerURL = kServer;
}

// Names and anchors that a shell or a re-split command line would misread.
std::vector<std::string> HostileTexts(const std::string& sentinel) {
  return {
      "a\" --evil-opt=1 \"b",
      "it's",
      "back\\slash\\\\",
      "semi;touch " + sentinel,
      "pipe|touch " + sentinel,
      "amp&touch " + sentinel + "&",
      "$(touch " + sentinel + ")",
      "`touch " + sentinel + "`",
      "-rf",
      "--help",
      "new\nline",
      "tab\there",
      "Gr\xc3\xbc\xc3\x9f" "e_\xe6\x96\x87\xe6\xa1\xa3",
      "*?[glob]",
      "~user",
      ">out <in 2>&1",
      "%s%n%x",
      "${HOME}",
      "'single' \"double\"",
      "{^}<viewer>~#",
      "  blanks around  ",
      "\x01\x1b[31mcontrol",
      "\\\\server\\share",
      std::string(4096, 'k'),
  };
}

TEST_F(OpenDocTest, HostileNamesAndAnchorsThroughEveryRoute) {
  WriteExtensions("dvi=<viewer> -p # ^.dvi\n");
  const std::string sentinel = root_ / "SENTINEL";
  for (const std::string& h : HostileTexts(sentinel)) {
    SCOPED_TRACE(h.substr(0, 40));
    const bool longName = h.size() > 200;

    // Acrobat route, hostile name.
    {
      FakeAccessServices s;
      s.reader = kAcrobat;
      std::string name = "/d/" + h + ".pdf";
      OpenDocumentFile(s, name.c_str(), "page=1");
      if (longName) {
        EXPECT_TRUE(s.Untouched());
      } else {
        ASSERT_EQ(s.executed.size(), 1u);
        EXPECT_EQ(s.executed[0], (Args{kAcrobat, "/A", "page=1", name}));
      }
    }
    // Acrobat route, hostile anchor.
    {
      FakeAccessServices s;
      s.reader = kAcrobat;
      OpenDocumentFile(s, "/d/g.pdf", h.c_str());
      if (longName) {
        EXPECT_TRUE(s.executed.empty());
      } else {
        ASSERT_EQ(s.executed.size(), 1u);
        EXPECT_EQ(s.executed[0], (Args{kAcrobat, "/A", h.substr(0, h.find(' ')), "/d/g.pdf"}));
      }
    }
    // Template route, hostile name and hostile anchor.
    {
      FakeAccessServices s;
      std::string name = "/d/" + h + ".dvi";
      OpenDocumentFile(s, name.c_str(), "x");
      if (longName) {
        EXPECT_TRUE(s.Untouched());
      } else {
        ASSERT_EQ(s.executed.size(), 1u);
        EXPECT_EQ(s.executed[0], (Args{Viewer(), "-p", "x", name}));
      }
      FakeAccessServices t;
      OpenDocumentFile(t, "/d/g.dvi", h.c_str());
      if (longName) {
        EXPECT_TRUE(t.executed.empty());
      } else {
        ASSERT_EQ(t.executed.size(), 1u);
        EXPECT_EQ(t.executed[0], (Args{Viewer(), "-p", h, "/d/g.dvi"}));
      }
    }
    // Default route: exactly the document, nothing else.
    {
      FakeAccessServices s;
      std::string name = "/d/" + h + ".xyz";
      OpenDocumentFile(s, name.c_str(), h.c_str());
      EXPECT_TRUE(s.executed.empty());
      if (longName) {
        EXPECT_TRUE(s.Untouched());
      } else {
        EXPECT_EQ(s.defaultApplication, Args{name});
      }
    }
    // Fetch route: the name reaches the transfer unchanged.
    {
      FakeAccessServices s;
      s.onDownload = WriteComplete;
      std::string rel = "h/" + h + ".pdf";
      OpenDocumentFile(s, rel.c_str(), "x");
      if (longName) {
        EXPECT_TRUE(s.Untouched());
      } else {
        std::string cache = CacheDir() + rel;
        for (char& c : cache)
          if (c == '\\') c = '/';
        ASSERT_EQ(s.downloads.size(), 1u);
        EXPECT_EQ(s.downloads[0].url, std::string(kServer) + "/" + rel);
        EXPECT_EQ(s.downloads[0].path, cache);
        EXPECT_EQ(s.defaultApplication, Args{cache});
      }
    }
  }
  struct stat st;
  EXPECT_NE(stat(sentinel.c_str(), &st), 0);
}

// Starts argv for real and waits for it, as a viewer would be started.
long SpawnAndWait(const std::vector<std::string>& argv) {
  std::vector<char*> args;
  for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
  args.push_back(nullptr);
  pid_t pid = 0;
  if (argv.empty() || posix_spawn(&pid, args[0], nullptr, nullptr, args.data(), environ) != 0) return -1;
  int status = 0;
  waitpid(pid, &status, 0);
  return pid;
}

TEST_F(OpenDocTest, RealViewerReceivesExactlyItsArguments) {
  const std::string record = root_ / "record";
  root_.Write("bin/recorder", "#!/bin/sh\n: > '" + record + "'\nfor a in \"$@\"; do printf '%s\\0' \"$a\" >> '" +
                                 record + "'; done\n");
  chmod((root_ / "bin/recorder").c_str(), 0755);
  WriteExtensions("dvi=<recorder> -p # \"^.dvi\"\n");
  const std::string sentinel = root_ / "SENTINEL";

  int checked = 0;
  for (const std::string& h : HostileTexts(sentinel)) {
    if (h.size() > 200) continue;
    SCOPED_TRACE(h);
    std::remove(record.c_str());
    FakeAccessServices services;
    services.onExecute = SpawnAndWait;
    std::string name = "/d/" + h + ".dvi";
    ASSERT_EQ(OpenDocumentFile(services, name.c_str(), h.c_str()), 1);

    std::ifstream in(record, std::ios::binary);
    std::stringstream content;
    content << in.rdbuf();
    Args received;
    std::string all = content.str(), arg;
    for (char c : all) {
      if (c == '\0') {
        received.push_back(arg);
        arg.clear();
      } else {
        arg += c;
      }
    }
    EXPECT_EQ(received, (Args{"-p", h, name}));
    ++checked;
  }
  EXPECT_GE(checked, 20);
  struct stat st;
  EXPECT_NE(stat(sentinel.c_str(), &st), 0) << "no shell ever ran the names";
}

}  // namespace
