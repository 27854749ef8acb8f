// Document access: opening (resolution, the document cache, the viewer rules,
// hostile names on every route) and the transfer from a loopback HTTP server
// (cut, reset and silent bodies, what a PDF must be, aborts, leftovers).
#include "access/opendoc.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "access/download.h"
#include "access/viewer_rules.h"
#include "base/settings.h"
#include "fake_access_services.h"
#include "http_test_server.h"
#include "platform/partfile.h"
#include "platform/profile.h"
#include "test_support.h"

namespace {

using testing_support::FakeAccessServices;
using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;
using Args = std::vector<std::string>;
using Boxes = std::vector<std::pair<std::string, std::string>>;

const char kCompletePdf[] = "%PDF-1.4\n1 0 obj << >> endobj\nstartxref\n9\n%%EOF\n";
const std::string kAcrobat = "/opt/Acrobat Reader/bin/acroread";

// Acrobat route, template grammar, default route.  With the template steps
// noted, the last "templ-dp" note is the command line that "Run: " shows.
TEST(ViewerRules, TheFirstRowThatTakesTheDocumentWins) {
  const std::string evince = "/usr/bin/evince", none;
  const auto kRun = ViewerRoute::kRun, kDefault = ViewerRoute::kDefaultApplication;
  const std::optional<std::string> no;
  struct Row {
    const char* what;
    std::string extension;
    std::optional<std::string> anchor;
    std::string reader, tmpl, root;
    ViewerRoute route;
    Args argv;
    std::string note;  // one of the notes, or ""
    bool asksReader;
  } rows[] = {
      // clang-format off
      {"Acrobat: the page cut at its first blank", "pdf", "page=12 15 ", kAcrobat, "", "", kRun,
       {kAcrobat, "/A", "page=12", "/t/g.pdf"}, "PDF Reader: " + kAcrobat, true},
      {"Acrobat: an empty anchor counts", "pdf", "", kAcrobat, "", "", kRun,
       {kAcrobat, "/A", "", "/t/g.pdf"}, "", true},
      {"no anchor: the reader is not asked", "pdf", no, kAcrobat, "", "", kDefault, {}, "", false},
      {"a reader outside the family", "pdf", "1", evince, "", "", kDefault, {}, "PDF Reader: " + evince, true},
      {"other readers take the template", "pdf", "page=3 4", evince, "<v> -p # ^.pdf", "", kRun,
       {"/bin/v", "-p", "page=3 4", "/t/g.pdf"}, "INFO: templ-dp: /bin/v -p page=3 4 /t/g.pdf\n", true},
      {"Root: two %s, %% and no format", "dvi", no, none, "%s/v %s %s %%%d ^", "/r", kRun,
       {"/r/v", "/r", "%s", "%%d", "/t/g"}, "INFO: template(=) /r/v /r %s %%d ^", false},
      {"expansion beyond 63 refused", "dvi", no, none, "%s/v ^", std::string(60, 'r'),
       ViewerRoute::kRefused, {}, "ERROR: opening template too long: ", false},
      {"braces skip literals without anchor", "dvi", no, none, "<v>{ -p #}{a{b}c} ^.dvi", "", kRun,
       {"/bin/v", "/t/g.dvi"}, "INFO: templ-dp: /bin/v /t/g.dvi\n", false},
      {"program: not found keeps its slot", "dvi", no, none, "<nothere> ^", "", kRun,
       {"", "/t/g"}, "INFO: templ-dp:  /t/g\n", false},
      {"inserted text never splits", "dvi", "a\" \"b c", none, "<my v> #", "", kRun,
       {"/opt/my v/run", "a\" \"b c"}, "INFO: templ-dp: /opt/my v/run a\" \"b c\n", false},
      // clang-format on
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    ViewerFacts facts{
        "/t/g." + row.extension, row.extension, row.anchor, row.tmpl, row.root, true, {}, {}};
    int asked = 0;
    facts.findReader = [&] { return ++asked, row.reader; };
    facts.findProgram = [&](const std::string& name) -> std::string {
      if (name == "v") return "/bin/v";
      return name == "my v" ? "/opt/my v/run" : "";
    };
    const ViewerChoice choice = ChooseViewer(facts);
    EXPECT_EQ(choice.route, row.route);
    EXPECT_EQ(choice.command.argv, row.argv);
    EXPECT_EQ(asked, row.asksReader ? 1 : 0);
    std::string notes;
    for (const auto& [text, argument] : choice.notes) notes += text + argument + "\n";
    EXPECT_NE(notes.find(row.note), std::string::npos) << notes;
  }
}

namespace fs = std::filesystem;
using testing_support::HttpReply;
using End = HttpReply::End;

struct Recorder : DownloadProgress {
  bool Update(int value, const std::string& message) override {
    calls.push_back({value, message});
    return !(message.empty() && ++chunks == refuseAtChunk);
  }
  void Resume() override { ++resumes; }  // after a No
  bool AskAbortQuestion() override { return ++questions, answerYes; }
  bool Completed() const { return !calls.empty() && calls.back().second == "Loading Completed."; }

  std::vector<std::pair<int, std::string>> calls;
  int chunks = 0, refuseAtChunk = -1, resumes = 0, questions = 0;
  bool answerYes = false;
};

// A PDF of one page, with a second revision appended, or with its
// cross-reference as a stream object.  It ends in "%%EOF" without a line
// end, so that one byte less is no whole file.
std::string Pdf(bool twoRevisions = false, bool xrefStream = false) {
  std::string pdf = "%PDF-1.5\n";
  std::vector<std::size_t> at;
  auto object = [&](const std::string& body) {
    at.push_back(pdf.size());
    pdf += std::to_string(at.size()) + " 0 obj\n" + body + "\nendobj\n";
  };
  auto entry = [](std::size_t offset) {
    char line[24];
    return std::string(line, std::snprintf(line, sizeof line, "%010zu 00000 n \n", offset));
  };
  object("<< /Type /Catalog /Pages 2 0 R >>");
  object("<< /Type /Pages /Kids [3 0 R] /Count 1 >>");
  object("<< /Type /Page /Parent 2 0 R /MediaBox [0 0 612 792] >>");
  const std::size_t xref = pdf.size();
  if (xrefStream) {  // rows of 1 + 4 + 2 bytes: type, offset, generation
    std::string rows("\0\0\0\0\0\xff\xff", 7);
    for (std::size_t offset : {at[0], at[1], at[2], xref})
      rows += {'\1', char(offset >> 24), char(offset >> 16), char(offset >> 8), char(offset), 0, 0};
    return pdf + "4 0 obj\n<< /Type /XRef /Size 5 /W [1 4 2] /Root 1 0 R /Length " +
           std::to_string(rows.size()) + " >>\nstream\n" + rows +
           "\nendstream\nendobj\nstartxref\n" + std::to_string(xref) + "\n%%EOF";
  }
  pdf += "xref\n0 4\n0000000000 65535 f \n" + entry(at[0]) + entry(at[1]) + entry(at[2]) +
         "trailer\n<< /Size 4 /Root 1 0 R >>\nstartxref\n" + std::to_string(xref) + "\n%%EOF";
  if (!twoRevisions) return pdf;
  pdf += "\n";
  object("<< /Title (second revision) >>");
  const std::size_t second = pdf.size();
  return pdf + "xref\n0 1\n0000000000 65535 f \n4 1\n" + entry(at[3]) + "trailer\n<< /Size 5 " +
         "/Root 1 0 R /Info 4 0 R /Prev " + std::to_string(xref) + " >>\nstartxref\n" +
         std::to_string(second) + "\n%%EOF";
}

HttpReply Reply(const std::string& body, long long cutAfter = -1, End end = {}, bool sized = true,
                int status = 200, const std::string& location = "") {
  HttpReply r{status, body,
              location.empty() ? HttpReply::Headers{} : HttpReply::Headers{{"Location", location}}};
  r.cutAfter = cutAfter;
  r.end = end;
  r.noLength = !sized;
  return r;
}

HttpReply Redirect(int code, const char* to) { return Reply("moved", -1, {}, true, code, to); }

class OpenDocTest : public ::testing::Test {
 protected:
  void SetUp() override {
    // Short enough for the silent-server rows, long enough that a busy
    // machine delaying the test server does not look like a stall.
    SetDownloadLimits({5000, 3});
    root_.Write("texmf/doc/latex/base/installed.pdf", "not even a PDF");
    chmod(root_.Write("bin/viewer", "#!/bin/sh\n").c_str(), 0755);
    RootPath.clear();
    Extensions("");
    DocumentServerURL = "http://docs.test";
  }
  void TearDown() override {
    std::tie(IniFilePath, RootPath) = std::tie(savedIni_, savedRoot_);
    DocumentServerURL = nullptr;
    SetDownloadLimits(savedLimits_);
  }
  void Extensions(const std::string& lines) {
    IniFilePath = root_.Write("Docuvane.ini", "[Extensions]\n" + lines + "\n");
    ProfileCacheClear();
  }
  std::string Cache(std::string rel) const {
    for (char& c : rel) c = c == '\\' ? '/' : c;
    return root_ / "var/doc/" + rel;
  }
  static auto Leaves(std::string content) {  // a download that leaves `content`
    return [content](const FakeAccessServices::DownloadCall& call) {
      if (!content.empty()) std::ofstream(call.path, std::ios::binary) << content;
      return int(content.size());
    };
  }

  // Into doc.pdf when the address names a PDF document, else into doc.bin.
  int Fetch(Recorder& progress, const std::string& url) {
    const bool pdf = url.size() > 4 && url.compare(url.size() - 4, 4, ".pdf") == 0;
    target_ = dir_ / (pdf ? "doc.pdf" : "doc.bin");
    std::ofstream(target_, std::ios::binary) << "OLD";
    return wxGet(progress, 0, 100, url.c_str(), target_.c_str(), 1 << 24);
  }
  std::string Placed() const {
    std::ifstream in(target_, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
  }
  std::set<std::string> Files() const {  // beside the target
    std::set<std::string> names;
    for (const auto& entry : fs::directory_iterator(dir_.path()))
      names.insert(entry.path().filename().string());
    return names;
  }

  TempDir root_, dir_;
  ScopedEnv texmf_{"TEXMF", root_ / "texmf"}, vartex_{"VARTEX", root_ / "var"};
  ScopedEnv path_{"PATH", root_ / "bin:" + std::getenv("PATH")};
  std::string savedIni_ = IniFilePath, savedRoot_ = RootPath, target_;
  DownloadLimits savedLimits_ = GetDownloadLimits();
  testing_support::HttpTestServer server_;
};

TEST_F(OpenDocTest, FromTheNameToTheViewer) {
  const std::string installed = root_ / "texmf/doc/latex/base/installed.pdf", none;
  const std::string a250(250, 'a');
  const std::optional<std::string> local,
      nothing = "";  // no transfer; a transfer that gives nothing
  struct Row {
    const char* what;
    std::string name;
    const char* anchor;
    std::string cached;                   // the copy in the cache before, "" for none
    std::optional<std::string> transfer;  // what a fetch leaves; nullopt: nothing is fetched
    std::string opened;                   // what the default application gets; "" for nothing
    std::string traced;                   // messages that must appear in this order, or ""
    Args argv = {};                       // the command run; empty: none
    std::string extensions = "";
  } rows[] = {
      // clang-format off
      {"installed copy used as found", "latex\\base\\installed.pdf", 0, none, local, installed, ""},
      {"fetched into the cache", "latex/g.pdf#page=2", 0, none, kCompletePdf, Cache("latex/g.pdf"), ""},
      {"complete cached copy used", "a/c.pdf", 0, kCompletePdf, local, Cache("a/c.pdf"), ""},
      {"incomplete copy fetched again", "a/p.pdf", 0, "%PDF-1.4 cut", kCompletePdf, Cache("a/p.pdf"), ""},
      {"nothing arrives", "a/missing.pdf", 0, none, nothing, "", "ERROR: Not accessible the document"},
      {"html never passes the check", "a/g.html", 0, none, "<html>startxref</html>", "", "ERROR: Not"},
      {"leaves the cache", "a/../../evil.pdf", 0, none, local, "", "ERROR: document name leaves"},
      {"anchor split at the first #", "/d/g.pdf#p=3", 0, none, local, "/d/g.pdf", "document type: pdf\n"},
      {"a caller's anchor keeps # in the name", "/d/g.pdf#p=3", "p=5", none, local, "/d/g.pdf#p=3",
       "type: pdf#p=3\n"},
      {"no dot", "readme", 0, none, local, "", "ERROR: undefined type of file: readme"},
      {"a failed start still counts", "/d/g.dvi", "5", none, local, "", "Run: " + root_ / "bin/viewer "
       "-p 5 /d/g.dvi\nDocuvane: WARNING: execution failed with error code=-1",
       {root_ / "bin/viewer", "-p", "5", "/d/g.dvi"}, "dvi=<viewer>{ -p #} ^.dvi"},
      {"command line beyond 255 refused", "/d/g.dvi", a250.c_str(), none, local, "",
       "ERROR: command line too long: ", {}, "dvi=<viewer> # ^.dvi"},
      {"default application fails", "/d/x.xyz#here", 0, none, local, "/d/x.xyz", "Application /d/x.xyz"
       "\nDocuvane: ERROR: undefined method to open document file: /d/x.xyz#here"},
      // clang-format on
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    const std::string rel = row.name.substr(0, row.name.find('#'));
    if (!row.cached.empty()) root_.Write("var/doc/" + rel, row.cached);
    Extensions(row.extensions);
    FakeAccessServices services;
    services.onDownload = Leaves(row.transfer.value_or(""));
    services.executeResult = -1;
    services.defaultApplicationResult = row.traced.find("undefined method") == std::string::npos;
    MessageCapture capture;
    EXPECT_EQ(OpenDocumentFile(services, row.name.c_str(), row.anchor), row.argv.empty() ? 0 : 1);
    EXPECT_EQ(services.executed,
              row.argv.empty() ? std::vector<Args>{} : std::vector<Args>{row.argv});
    EXPECT_EQ(services.defaultApplication, row.opened.empty() ? Args{} : Args{row.opened});
    ASSERT_EQ(services.downloads.size(), row.transfer ? 1u : 0u);
    if (row.transfer) {
      EXPECT_EQ(services.downloads[0].message, "Downloading " + rel + " ...");
      EXPECT_EQ(services.downloads[0].url, "http://docs.test/" + rel) << "name kept as is";
      EXPECT_EQ(services.downloads[0].path, Cache(rel));
    }
    const std::string box = "Can't download document file '" + rel + "'\nfrom document server " +
                            "'http://docs.test'\n\nIt is probably internet error. Try later.";
    const bool failed = row.transfer && row.opened.empty();
    EXPECT_EQ(services.errors, failed ? Boxes(1, {box, "Lomari Docuvane Error"}) : Boxes());
    EXPECT_EQ(capture.Contains("ERROR"), row.traced.find("ERROR") != std::string::npos);
    std::string all;
    for (const auto& m : capture.messages()) all += m.line() + "\n";
    EXPECT_NE(all.find(row.traced), std::string::npos) << all;
  }
  std::remove(installed.c_str());  // found by the search, gone when opened: nothing fetched
  FakeAccessServices services;
  EXPECT_TRUE(OpenDocumentFile(services, "latex/base/installed.pdf", nullptr) == 0 &&
              services.Untouched());
}

// Names and anchors that a shell, a re-split command line or a format would
// misread reach the viewer as one argument each, on every route.
TEST_F(OpenDocTest, HostileNamesAndAnchorsThroughEveryRoute) {
  Extensions("dvi=<viewer> -p # \"^.dvi\"");
  // clang-format off
  const Args hostile = {"a\" --evil-opt=1 \"b", "it's", "back\\slash\\\\", "$(touch x);`touch x`",
      "-rf", "new\nline\ttab", "Gr\u00fc\u00dfe_\u6587", "*?[glob] >out <in 2>&1", "%s%n%x${HOME}",
      "{^}<viewer>~#", "  blanks around  ", "\x01\x1b[31m", "x#y?z%41", std::string(4096, 'k')};
  // clang-format on
  for (const std::string& h : hostile) {
    SCOPED_TRACE(h.substr(0, 40));
    FakeAccessServices s;
    s.reader = kAcrobat;
    s.onDownload = Leaves(kCompletePdf);
    const std::string pdf = "/d/" + h + ".pdf", dvi = "/d/" + h + ".dvi", xyz = "/d/" + h + ".xyz";
    const std::string rel = "h/" + h + ".pdf";
    OpenDocumentFile(s, pdf.c_str(), "page=1");   // Acrobat route
    OpenDocumentFile(s, "/d/g.pdf", h.c_str());   // Acrobat route
    OpenDocumentFile(s, dvi.c_str(), h.c_str());  // template route
    OpenDocumentFile(s, xyz.c_str(), h.c_str());  // default route
    OpenDocumentFile(s, rel.c_str(), "x");        // fetch, then the Acrobat route
    if (h.size() > 200) {
      EXPECT_TRUE(s.Untouched());
      continue;
    }
    EXPECT_EQ(s.executed, (std::vector<Args>{{kAcrobat, "/A", "page=1", pdf},
                                             {kAcrobat, "/A", h.substr(0, h.find(' ')), "/d/g.pdf"},
                                             {root_ / "bin/viewer", "-p", h, dvi},
                                             {kAcrobat, "/A", "x", Cache(rel)}}));
    EXPECT_EQ(s.defaultApplication, Args{xyz});
    ASSERT_EQ(s.downloads.size(), 1u);
    EXPECT_EQ(s.downloads[0].path, Cache(rel));
    EXPECT_EQ(s.downloads[0].url.find_first_of("#?"), std::string::npos) << "no fragment, no query";
  }
}

TEST_F(OpenDocTest, OnlyCompleteCopiesTakeTheirPlace) {
  const std::string doc = Pdf(), two = Pdf(true), xs = Pdf(false, true), body(10000, 'b');
  const std::string html = "<html>Not here</html>\n";
  const std::string noPages = std::string(doc).replace(doc.find("/Pages 2"), 8, "/Pages 7");
  const std::string farXref = std::string(doc).insert(doc.rfind("startxref") + 10, "9");
  for (const char* target : {"/c", "/q%23r%3Fs%2541%20t.pdf"}) server_.Route(target, Reply(doc));
  server_.Route("/x/b", Redirect(301, "../c"));
  const long long n = doc.size(), t = two.size(), first = two.find("%%EOF") + 5;
  const char *kCut = "transfer failed for ", *kNoPdf = "no complete PDF document from ";
  struct Row {
    const char* what;
    std::string source;                 // a target on the server, or a full URL
    HttpReply reply;                    // for the source
    long long result;                   // -1: any
    std::optional<std::string> placed;  // the target's content afterwards; nullopt: the old copy
    const char* error;                  // part of the expected "ERROR: wxGet " message, or ""
    int abortAt = 0;  // the user stops at this update and says Yes (> 0) or No (< 0)
  } rows[] = {
      // clang-format off
      {"200", "/a.pdf", Reply(doc), n, doc, ""},
      {"302, 301 and a relative Location", "/a", Redirect(302, server_.Url("/x/b").c_str()), n, doc, ""},
      {"redirect loop", "/loop", Redirect(308, "/loop"), 0, {}, "too many redirections"},
      {"Location to file://", "/f", Redirect(302, "file:///etc/passwd"), 0, {}, "outside http"},
      {"sized, cut one short", "/c3", Reply(body, 9999), 9999, {}, kCut},
      {"unsized, two revisions, clean end", "/u.pdf", Reply(two, -1, End::kClose, false), t, two, ""},
      {"unsized, reset after the first revision", "/u1.pdf", Reply(two, first, End::kReset, false),
       -1, {}, kCut},
      {"unsized, reset one short", "/u2.pdf", Reply(two, t - 1, End::kReset, false), -1, {}, kCut},
      {"unsized, closed one short", "/u4.pdf", Reply(two, t - 1, End::kClose, false), t - 1, {},
       kNoPdf},
      {"unsized, closed mid-way", "/u5.pdf", Reply(two, t / 2, End::kClose, false), t / 2, {}, kNoPdf},
      {"short body, matching wrong length", "/w.pdf", Reply(two.substr(0, t - 9)), t - 9, {}, kNoPdf},
      {"an HTML page answered with 200", "/h.pdf", Reply(html), -1, {}, "(no PDF header)"},
      {"startxref beyond the file", "/x.pdf", Reply(farXref), n + 1, {}, "no cross-reference"},
      {"cross-reference stream", "/xs.pdf", Reply(xs), -1, xs, ""},
      {"unreadable to the PDF library", "/p.pdf", Reply(noPages), n, {}, kNoPdf},
      {"server silent mid-body", "/mid", Reply(body, 2000, End::kSilence), 2000, {}, kCut},
      {"nobody listening", "http://127.0.0.1:1/x.pdf", {}, 0, {}, "initialize stream for"},
      {"abort: Yes keeps the old copy", "/big", Reply(std::string(1 << 23, 'b')), 3 * 4096, {}, "", 3},
      {"abort: No goes on", "/more", Reply(body), 10000, body, "", -2},
      {"# ? % of a name stay in the path", "/" + EscapeUrlPath("q#r?s%41 t.pdf"), {}, n, doc, ""},
      // clang-format on
  };
  for (Row& row : rows) {
    SCOPED_TRACE(row.what);
    server_.Route(row.source, row.reply);
    const std::string url = row.source[0] == '/' ? server_.Url(row.source) : row.source;
    MessageCapture capture;
    Recorder progress;
    progress.refuseAtChunk = std::abs(row.abortAt);
    progress.answerYes = row.abortAt > 0;
    const int result = Fetch(progress, url);
    EXPECT_EQ(progress.questions + progress.resumes, row.abortAt ? 1 + (row.abortAt < 0) : 0);
    EXPECT_EQ(result, row.result < 0 ? result : row.result);
    EXPECT_EQ(Placed(), row.placed.value_or("OLD"));
    EXPECT_EQ(capture.LevelOf("ERROR: wxGet"), *row.error ? 5 : -1);
    EXPECT_TRUE(!*row.error || capture.Contains(row.error)) << "missing " << row.error;
    const bool setUp = !capture.Contains("initialize") && !capture.Contains("redirection");
    EXPECT_EQ(progress.Completed(), setUp) << "the final message only after a transfer";
    EXPECT_EQ(Files(), std::set<std::string>{fs::path(target_).filename().string()}) << "part file";
    std::string message = "Downloading " + url.substr(url.rfind('/') + 1) + "...";
    EXPECT_EQ(progress.calls.at(0), std::make_pair(0, message.substr(0, 255)));
    fs::remove(target_);
  }
}

// Part files whose writer was killed go with the next transfer of the same
// document; one that a live writer holds, and those of others, stay.
TEST_F(OpenDocTest, LeftoverPartFilesOfKilledTransfersGo) {
  PartFile live;
  ASSERT_TRUE(live.Create(dir_ / "doc.pdf"));
  std::set<std::string> kept = {"doc.pdf", fs::path(live.path()).filename().string()};
  for (const char* name : {"doc.pdf.part-toolong", "other.pdf.part-Ab12Cd", "doc.pdf.part-"})
    kept.insert(fs::path(dir_.Write(name, "cut")).filename().string());
  for (const char* name : {"doc.pdf.part-Ab12Cd", "doc.pdf.part-zzzzzz"}) dir_.Write(name, "cut");
  server_.Route("/doc.pdf", Reply(Pdf()));
  Recorder progress;
  EXPECT_EQ(Fetch(progress, server_.Url("/doc.pdf")), int(Pdf().size()));
  EXPECT_EQ(Files(), kept);
}

}  // namespace

namespace {

// A cached copy counts as complete only with "%PDF-1" first and "startxref"
// in its last 1024 bytes; which names are taken as they stand.
TEST(OpenDocRules, CompleteCopiesAndAbsoluteNames) {
  testing_support::TempDir dir;
  const std::string pad(1100, ' ');
  const std::pair<std::string, bool> files[] = {{"%PDF-1.4 x startxref\n9\n%%EOF", true},
                                                {"%PDF-1.4" + pad + "startxref", true},
                                                {"%PDF-1.4 startxref" + pad, false},
                                                {"%PDF-1", false},
                                                {"%PDF-2.0 startxref", false},
                                                {"<html>startxref</html>", false}};
  for (const auto& [text, complete] : files)
    EXPECT_EQ(Check_Loaded_PDF(dir.Write("f.pdf", text).c_str()), complete) << text.substr(0, 20);
  EXPECT_FALSE(Check_Loaded_PDF((dir / "missing.pdf").c_str()));
  for (const char* name : {"C:\\docs\\a.pdf", "c:x", "/docs/a.pdf", "\\\\server\\a.pdf"})
    EXPECT_TRUE(Is_Absolute_Path(name)) << name;
  for (const char* name : {"\\docs\\a.pdf", "docs/a.pdf", "1:x", ""})
    EXPECT_FALSE(Is_Absolute_Path(name)) << name;
}

}  // namespace
