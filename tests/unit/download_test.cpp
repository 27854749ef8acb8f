// The document transfer against a real HTTP server on the loopback
// interface: redirections, error pages, cut and slow bodies, aborts.
#include "access/download.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "http_test_server.h"
#include "test_support.h"

namespace {

using testing_support::HttpReply;
using testing_support::HttpTestServer;
using testing_support::MessageCapture;
using testing_support::TempDir;

constexpr int kExpected = 16777216;

class Recorder : public DownloadProgress {
 public:
  struct Call {
    int value;
    std::string message;
  };

  bool Update(int value, const std::string& message) override {
    calls.push_back({value, message});
    if (message.empty() && ++chunkUpdates == refuseAtChunk) return false;
    return true;
  }
  void Resume() override { ++resumes; }
  bool AskAbortQuestion() override {
    ++questions;
    return answerYes;
  }
  bool KeepAlive(int value) override {
    ++keepAlives;
    lastKeepAliveValue = value;
    return !(refuseFirstKeepAlive && keepAlives == 1);
  }

  std::vector<int> ChunkValues() const {
    std::vector<int> values;
    for (const auto& c : calls)
      if (c.message.empty()) values.push_back(c.value);
    return values;
  }
  bool Completed() const { return !calls.empty() && calls.back().message == "Loading Completed."; }

  std::vector<Call> calls;
  int chunkUpdates = 0;
  int refuseAtChunk = -1;  // the chunk update that answers "stop"
  bool refuseFirstKeepAlive = false;
  bool answerYes = false;
  int resumes = 0;
  int questions = 0;
  int keepAlives = 0;
  int lastKeepAliveValue = -1;
};

std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream s;
  s << in.rdbuf();
  return s.str();
}

std::vector<std::string> Listing(const std::string& dir) {
  std::vector<std::string> names;
  for (const auto& e : std::filesystem::directory_iterator(dir)) names.push_back(e.path().filename().string());
  std::sort(names.begin(), names.end());
  return names;
}

std::string Pattern(std::size_t size) {
  std::string body(size, '\0');
  for (std::size_t i = 0; i < size; ++i) body[i] = static_cast<char>('a' + (i * 7 + i / 251) % 26);
  return body;
}

HttpReply Ok(const std::string& body) {
  HttpReply r;
  r.body = body;
  return r;
}

HttpReply Redirect(int code, const std::string& location) {
  HttpReply r;
  r.status = code;
  r.reason = "Moved";
  r.headers = {{"Location", location}};
  r.body = "<html>moved</html>";
  return r;
}

class DownloadTest : public ::testing::Test {
 protected:
  void SetUp() override {
    saved_ = GetDownloadLimits();
    target_ = dir_ / "doc.pdf";
  }
  void TearDown() override { SetDownloadLimits(saved_); }

  int Fetch(Recorder& progress, const std::string& url, int first = 0, int last = 100,
            int expected = kExpected) {
    return wxGet(progress, first, last, url.c_str(), target_.c_str(), expected);
  }

  TempDir dir_;
  std::string target_;
  HttpTestServer server_;
  DownloadLimits saved_;
};

TEST_F(DownloadTest, OutcomesKeepOnlyCompleteCopies) {
  const std::string doc = "%PDF-1.4 the document startxref";
  const std::string html = "<html><body>Not here</body></html>";
  const std::string half = Pattern(10000);
  std::string longPath = "/" + std::string(2000, 'L') + ".pdf";
  auto cut = [&](long long at) {
    HttpReply r = Ok(half);
    r.cutAfter = at;
    return r;
  };
  HttpReply chunkedCut = Ok(half);
  chunkedCut.chunked = true;
  chunkedCut.chunkSize = 3000;
  chunkedCut.trailer = "X-Checksum: 1234\r\n";
  // Every data chunk arrives (4 of them, 7 bytes of framing each), then
  // "0\r\n" and the connection ends inside the trailer.
  chunkedCut.cutAfter = static_cast<long long>(10000 + 4 * 7 + 3 + 8);
  HttpReply chunkedFull = chunkedCut;
  chunkedFull.cutAfter = -1;
  HttpReply emptyBody = Ok("");

  struct Row {
    const char* what;
    std::vector<std::pair<std::string, HttpReply>> routes;
    std::string source;  // a target on the server, or a full URL
    int result;
    std::optional<std::string> placed;  // the target's content afterwards; nullopt: the old copy
    const char* error;                  // an expected "ERROR: " message, or ""
    bool completed;                     // "Loading Completed." shown
    int hits;                           // requests that reached the server, -1: not checked
  } rows[] = {
      {"200", {{"/a.pdf", Ok(doc)}}, "/a.pdf", int(doc.size()), doc, "", true, 1},
      {"empty 200 gives an empty file", {{"/e.pdf", emptyBody}}, "/e.pdf", 0, std::string(), "", true, 1},
      {"302 then 301 chain",
       {{"/a", Redirect(302, "{base}/b")},
        {"/b", Redirect(301, "/c")}, {"/c", Ok(doc)}},
       "/a", int(doc.size()), doc, "", true, 3},
      {"303, 307 and 308 alike",
       {{"/r3", Redirect(303, "/r7")}, {"/r7", Redirect(307, "/r8")}, {"/r8", Redirect(308, "/d")},
        {"/d", Ok(doc)}},
       "/r3", int(doc.size()), doc, "", true, 4},
      {"relative Location", {{"/dir/a", Redirect(302, "b.pdf")}, {"/dir/b.pdf", Ok(doc)}}, "/dir/a",
       int(doc.size()), doc, "", true, 2},
      {"dot-dot Location", {{"/x/y/a", Redirect(302, "../z.pdf")}, {"/x/z.pdf", Ok(doc)}}, "/x/y/a",
       int(doc.size()), doc, "", true, 2},
      {"Location longer than 255", {{"/long", Redirect(302, longPath)}, {longPath, Ok(doc)}}, "/long",
       int(doc.size()), doc, "", true, 2},
      {"empty Location", {{"/a", Redirect(302, "")}}, "/a", 0, std::nullopt,
       "ERROR: wxGet can't initialize - ", false, 1},
      {"redirect loop", {{"/loop", Redirect(302, "/loop")}}, "/loop", 0, std::nullopt,
       "ERROR: wxGet too many redirections for ", false, 11},
      {"Location to file://", {{"/f", Redirect(302, "file:///etc/passwd")}}, "/f", 0, std::nullopt,
       "ERROR: wxGet refuses a redirection outside http and https: file:///etc/passwd", false, 1},
      {"Location to ftp://", {{"/f", Redirect(301, "ftp://127.0.0.1/x")}}, "/f", 0, std::nullopt,
       "ERROR: wxGet refuses a redirection", false, 1},
      {"404 with an HTML page", {{"/m.pdf", [&] { HttpReply r = Ok(html); r.status = 404; return r; }()}},
       "/m.pdf", int(html.size()), std::nullopt, "ERROR: wxGet no document at ", true, 1},
      {"500 with a body", {{"/s", [&] { HttpReply r = Ok(html); r.status = 500; return r; }()}}, "/s",
       int(html.size()), std::nullopt, "(HTTP 500)", true, 1},
      {"cut at 0", {{"/c", cut(0)}}, "/c", 0, std::nullopt, "ERROR: wxGet transfer failed for ", true, 1},
      {"cut at 1", {{"/c", cut(1)}}, "/c", 1, std::nullopt, "ERROR: wxGet transfer failed for ", true, 1},
      {"cut at half", {{"/c", cut(5000)}}, "/c", 5000, std::nullopt, "ERROR: wxGet transfer failed for ", true, 1},
      {"cut one short", {{"/c", cut(9999)}}, "/c", 9999, std::nullopt, "ERROR: wxGet transfer failed for ", true, 1},
      {"chunked complete", {{"/k", chunkedFull}}, "/k", 10000, half, "", true, 1},
      {"chunked cut inside the trailer", {{"/k", chunkedCut}}, "/k", 10000, std::nullopt,
       "ERROR: wxGet transfer failed for ", true, 1},
      {"malformed URL", {}, "ht!tp://no", 0, std::nullopt, "ERROR: wxGet can't initialize - ht!tp://no", false, 0},
      {"nobody listening", {}, "http://127.0.0.1:1/x.pdf", 0, std::nullopt,
       "ERROR: wxGet can't initialize stream for http://127.0.0.1:1/x.pdf", false, 0},
      {"garbage instead of HTTP", {{"/g", [] { HttpReply r; r.raw = "SSH-2.0-nothing\r\n\r\n"; return r; }()}}, "/g",
       0, std::nullopt, "ERROR: wxGet can't initialize stream for ", false, 1},
  };

  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    HttpTestServer server;
    for (auto [path, reply] : row.routes) {
      for (auto& [name, value] : reply.headers)  // "{base}" names this row's server
        if (value.compare(0, 6, "{base}") == 0) value = server.Base() + value.substr(6);
      server.Route(path, reply);
    }
    std::string url = row.source[0] == '/' ? server.Url(row.source) : row.source;
    std::ofstream(target_, std::ios::binary | std::ios::trunc) << "OLD";
    MessageCapture capture;
    Recorder progress;
    int result = Fetch(progress, url);

    EXPECT_EQ(result, row.result);
    EXPECT_EQ(ReadFile(target_), row.placed ? *row.placed : std::string("OLD"));
    if (*row.error) {
      EXPECT_TRUE(capture.Contains(row.error)) << "missing " << row.error;
      EXPECT_EQ(capture.LevelOf("ERROR: wxGet"), 5);
    } else {
      EXPECT_FALSE(capture.Contains("ERROR:"));
    }
    EXPECT_EQ(progress.Completed(), row.completed);
    if (row.hits >= 0) {
      EXPECT_EQ(static_cast<int>(server.Requests().size()), row.hits);
    }
    EXPECT_EQ(Listing(dir_.path()), std::vector<std::string>{"doc.pdf"}) << "no temporary file left";
    // Each pass starts with the first address's last segment.
    if (!progress.calls.empty()) {
      std::size_t slash = url.rfind('/');
      EXPECT_EQ(progress.calls[0].message, "Downloading " + url.substr(slash + 1) + "...");
      EXPECT_EQ(progress.calls[0].value, 0);
    }
  }
}

TEST_F(DownloadTest, FileSchemeIsCopiedWithoutResponseCheck) {
  std::string source = dir_.Write("source.pdf", Pattern(9000));
  Recorder progress;
  EXPECT_EQ(Fetch(progress, "file://" + source), 9000);
  EXPECT_EQ(ReadFile(target_), Pattern(9000));
  EXPECT_TRUE(progress.Completed());

  MessageCapture capture;
  Recorder missing;
  EXPECT_EQ(Fetch(missing, "file://" + dir_ / "nothing.pdf"), 0);
  EXPECT_TRUE(capture.Contains("ERROR: wxGet can't initialize stream for file://"));
}

TEST_F(DownloadTest, ProgressMessageIsCutTo255Characters) {
  const std::string name = std::string(300, 'n') + ".pdf";
  server_.Route("/" + name, Ok("doc"));
  Recorder progress;
  EXPECT_EQ(Fetch(progress, server_.Url("/" + name)), 3);
  ASSERT_FALSE(progress.calls.empty());
  EXPECT_EQ(progress.calls[0].message, ("Downloading " + name).substr(0, 255));
}

TEST_F(DownloadTest, UncreatableFileEndsWithoutFinalMessage) {
  server_.Route("/a.pdf", Ok("data"));
  MessageCapture capture;
  Recorder progress;
  std::string path = dir_ / "no/such/dir/a.pdf";
  EXPECT_EQ(wxGet(progress, 0, 100, server_.Url("/a.pdf").c_str(), path.c_str(), kExpected), 0);
  EXPECT_TRUE(capture.Contains("ERROR: wxGet can't create file: " + path));
  EXPECT_FALSE(progress.Completed());
}

TEST_F(DownloadTest, ProgressSteps) {
  struct Row {
    const char* what;
    std::size_t size;
    int first, last, expected;
    int lastChunkValue;
  } rows[] = {
      {"8 MiB ends at 50", 8u << 20, 0, 100, kExpected, 50},
      {"16 MiB reaches 100 with its last chunk", 16u << 20, 0, 100, kExpected, 100},
      {"no overflow with a wide range", 8u << 20, 0, 1000000, kExpected, 500000},
      {"longer than expected stays in range", 50000, 0, 100, 1000, 100},
      {"offset range", 4096 * 10, 10, 20, 4096 * 20, 15},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    server_.Route("/big.pdf", Ok(Pattern(row.size)));
    Recorder progress;
    int result = Fetch(progress, server_.Url("/big.pdf"), row.first, row.last, row.expected);
    EXPECT_EQ(result, static_cast<int>(row.size));
    std::vector<int> values = progress.ChunkValues();
    ASSERT_FALSE(values.empty());
    EXPECT_GE(values.size(), (row.size + 4095) / 4096) << "one update per piece of at most 4096 bytes";
    EXPECT_EQ(values.back(), row.lastChunkValue);
    EXPECT_TRUE(std::is_sorted(values.begin(), values.end()));
    EXPECT_GE(values.front(), row.first);
    EXPECT_LE(*std::max_element(values.begin(), values.end()), row.last);
    EXPECT_EQ(progress.calls.back().value, row.last);
    EXPECT_EQ(progress.calls.back().message, "Loading Completed.");
    EXPECT_EQ(std::filesystem::file_size(target_), row.size);
  }
}

HttpReply Slow(const std::string& body) {
  HttpReply r = Ok(body);
  r.pieceSize = 4096;
  r.pieceDelayMs = 15;
  return r;
}

TEST_F(DownloadTest, AbortAnsweredYesKeepsTheOldCopy) {
  const std::string body = Pattern(4096 * 300);  // several seconds at this pace
  server_.Route("/slow.pdf", Slow(body));
  std::ofstream(target_) << "OLD";
  Recorder progress;
  progress.refuseAtChunk = 3;
  progress.answerYes = true;
  MessageCapture capture;
  int result = Fetch(progress, server_.Url("/slow.pdf"));
  EXPECT_GT(result, 0);
  EXPECT_LT(result, static_cast<int>(body.size()));
  EXPECT_EQ(progress.questions, 1);
  EXPECT_EQ(progress.resumes, 0);
  EXPECT_EQ(progress.chunkUpdates, 3) << "no update after the confirmed abort";
  EXPECT_TRUE(progress.Completed());
  EXPECT_EQ(ReadFile(target_), "OLD");
  EXPECT_FALSE(capture.Contains("ERROR:")) << "the user's abort is no error";
  EXPECT_EQ(Listing(dir_.path()), std::vector<std::string>{"doc.pdf"});
}

TEST_F(DownloadTest, AbortAnsweredNoResumes) {
  const std::string body = Pattern(4096 * 20);
  server_.Route("/slow.pdf", Slow(body));
  Recorder progress;
  progress.refuseAtChunk = 3;
  progress.answerYes = false;
  EXPECT_EQ(Fetch(progress, server_.Url("/slow.pdf")), static_cast<int>(body.size()));
  EXPECT_EQ(progress.questions, 1);
  EXPECT_EQ(progress.resumes, 1);
  EXPECT_EQ(ReadFile(target_), body);
  EXPECT_TRUE(progress.Completed());
}

TEST_F(DownloadTest, StalledTransferCanBeAborted) {
  HttpReply stall = Ok(Pattern(100000));
  stall.stallAfterHeaders = true;
  server_.Route("/stall.pdf", stall);
  std::ofstream(target_) << "OLD";
  Recorder progress;
  progress.refuseFirstKeepAlive = true;
  progress.answerYes = true;
  EXPECT_EQ(Fetch(progress, server_.Url("/stall.pdf")), 0);
  EXPECT_EQ(progress.keepAlives, 1);
  EXPECT_EQ(progress.lastKeepAliveValue, 0);
  EXPECT_EQ(progress.questions, 1);
  EXPECT_TRUE(progress.Completed());
  EXPECT_EQ(ReadFile(target_), "OLD");
  EXPECT_EQ(Listing(dir_.path()), std::vector<std::string>{"doc.pdf"});
}

TEST_F(DownloadTest, SilentServersAreGivenUp) {
  SetDownloadLimits({2000, 1});
  HttpReply never;
  never.neverAnswer = true;
  HttpReply midStall = Ok(Pattern(50000));
  midStall.pieceSize = 20000;
  midStall.pieceDelayMs = 60000;  // the second piece never comes in time
  server_.Route("/never.pdf", never);
  server_.Route("/mid.pdf", midStall);

  struct Row {
    const char* target;
    int result;
    const char* error;
  } rows[] = {
      {"/never.pdf", 0, "ERROR: wxGet can't initialize stream for "},
      {"/mid.pdf", 20000, "ERROR: wxGet transfer failed for "},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.target);
    MessageCapture capture;
    Recorder progress;
    auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(Fetch(progress, server_.Url(row.target)), row.result);
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(30));
    EXPECT_TRUE(capture.Contains(row.error));
    EXPECT_GT(progress.keepAlives, 0) << "the window kept handling input meanwhile";
    EXPECT_TRUE(Listing(dir_.path()).empty()) << "nothing placed, nothing left";
  }
}

}  // namespace
