// The document transfer against a real HTTP server on the loopback
// interface: redirections, error pages, cut, slow and silent bodies, aborts.
#include "access/download.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "http_test_server.h"
#include "test_support.h"

namespace {

using testing_support::HttpReply;
using testing_support::MessageCapture;
using testing_support::TempDir;

constexpr int kExpected = 16777216;

struct Recorder : DownloadProgress {
  bool Update(int value, const std::string& message) override {
    calls.push_back({value, message});
    return !(message.empty() && ++chunks == refuseAtChunk);
  }
  void Resume() override { ++resumes; }
  bool AskAbortQuestion() override { return ++questions, answerYes; }
  bool KeepAlive(int) override { return !(++keepAlives == 1 && refuseFirstKeepAlive); }
  bool Completed() const { return !calls.empty() && calls.back().second == "Loading Completed."; }

  std::vector<std::pair<int, std::string>> calls;
  int chunks = 0, refuseAtChunk = -1, resumes = 0, questions = 0, keepAlives = 0;
  bool refuseFirstKeepAlive = false, answerYes = false;
};

std::string ReadFile(const std::string& path) {
  std::stringstream s;
  s << std::ifstream(path, std::ios::binary).rdbuf();
  return s.str();
}

std::string Pattern(std::size_t size) {
  std::string body(size, '\0');
  for (std::size_t i = 0; i < size; ++i) body[i] = static_cast<char>('a' + (i * 7 + i / 251) % 26);
  return body;
}

HttpReply Ok(const std::string& body, long long cutAfter = -1) {
  HttpReply r{200, body};
  r.cutAfter = cutAfter;
  return r;
}
HttpReply Redirect(int code, const std::string& location) {
  return {code, "moved", {{"Location", location}}};
}
HttpReply Raw(const std::string& raw) {
  HttpReply r;
  r.raw = raw;
  return r;
}
HttpReply Slow(const std::string& body) {  // 15 ms a piece
  HttpReply r{200, body};
  r.pieceSize = 4096;
  r.pieceDelayMs = 15;
  return r;
}

class DownloadTest : public ::testing::Test {
 protected:
  void SetUp() override {
    saved_ = GetDownloadLimits();
    SetDownloadLimits({2000, 1});
  }
  void TearDown() override { SetDownloadLimits(saved_); }
  int Fetch(Recorder& progress, const std::string& url, int first = 0, int last = 100,
            int expected = kExpected) {
    std::ofstream(target_, std::ios::binary) << "OLD";
    return wxGet(progress, first, last, url.c_str(), target_.c_str(), expected);
  }
  bool OnlyTarget() const {  // no temporary file left beside the target
    auto files = std::filesystem::directory_iterator(dir_.path());
    return std::distance(files, {}) == 1 && std::filesystem::exists(target_);
  }

  TempDir dir_, source_;
  std::string target_ = dir_ / "doc.pdf";
  testing_support::HttpTestServer server_;
  DownloadLimits saved_;
};

TEST_F(DownloadTest, OutcomesKeepOnlyCompleteCopies) {
  const std::string doc = "%PDF-1.4 the document startxref", html = "<html>Not here</html>";
  const std::string body = Pattern(10000), longName = "/" + std::string(300, 'n') + ".pdf";
  const std::string chunked = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n1388\r\n" +
                              body.substr(0, 5000) + "\r\n1388\r\n" + body.substr(5000) +
                              "\r\n0\r\nX-Checksum: 1234\r\n\r\n";
  HttpReply mid = Ok(Pattern(50000)), never, toFile = Redirect(302, "file:///etc/passwd");
  mid.stallAfter = 20000;
  never.neverAnswer = true;
  for (const char* target : {"/c", "/d", "/x/z.pdf"}) server_.Route(target, Ok(doc));
  server_.Route(longName, Ok(doc));
  server_.Route("/b", Redirect(301, "/c"));
  server_.Route("/r7", Redirect(307, "/r8"));
  server_.Route("/r8", Redirect(308, "/d"));
  const std::string file = "file://" + source_.Write("source.pdf", body);
  const std::string cutChunked = chunked.substr(0, chunked.size() - 10);
  const int n = int(doc.size()), h = int(html.size());
  const char* kCut = "transfer failed for ";
  const char* kNoStream = "can't initialize stream for ";
  const char* kInit = "can't initialize - ";

  struct Row {
    const char* what;
    std::string source;  // a target on the server, or a full URL
    HttpReply reply;     // for the source
    int result;
    std::optional<std::string> placed;  // the target's content afterwards; nullopt: the old copy
    const char* error;                  // part of the expected "ERROR: wxGet " message, or ""
    bool completed;                     // "Loading Completed." shown
    int hits;                           // requests that reached the server
  } rows[] = {
      {"200", "/a.pdf", Ok(doc), n, doc, "", true, 1},
      {"empty 200 gives an empty file", "/e.pdf", Ok(""), 0, "", "", true, 1},
      {"302 then 301 chain", "/a", Redirect(302, server_.Url("/b")), n, doc, "", true, 3},
      {"303, 307 and 308 alike", "/r3", Redirect(303, "/r7"), n, doc, "", true, 4},
      {"relative Location with dot-dot", "/x/y/a", Redirect(302, "../z.pdf"), n, doc, "", true, 2},
      {"Location longer than 255", "/long", Redirect(302, longName), n, doc, "", true, 2},
      {"name beyond the message's 255", longName, Ok(doc), n, doc, "", true, 1},
      {"empty Location", "/empty", Redirect(302, ""), 0, {}, kInit, false, 1},
      {"redirect loop", "/loop", Redirect(302, "/loop"), 0, {}, "too many redirections", false, 11},
      {"Location to file://", "/f", toFile, 0, {}, "outside http and https: file:///etc", false, 1},
      {"404 with an HTML page", "/m.pdf", {404, html}, h, {}, "no document at ", true, 1},
      {"500 with a body", "/s", {500, html}, h, {}, "(HTTP 500)", true, 1},
      {"cut at 0", "/c0", Ok(body, 0), 0, {}, kCut, true, 1},
      {"cut at 1", "/c1", Ok(body, 1), 1, {}, kCut, true, 1},
      {"cut at half", "/c2", Ok(body, 5000), 5000, {}, kCut, true, 1},
      {"cut one short", "/c3", Ok(body, 9999), 9999, {}, kCut, true, 1},
      {"chunked complete", "/k", Raw(chunked), 10000, body, "", true, 1},
      {"chunked cut inside the trailer", "/kc", Raw(cutChunked), 10000, {}, kCut, true, 1},
      {"server silent before the headers", "/never", never, 0, {}, kNoStream, false, 1},
      {"server silent mid-body", "/mid", mid, 20000, {}, kCut, true, 1},
      {"garbage instead of HTTP", "/g", Raw("SSH-2.0-x\r\n\r\n"), 0, {}, kNoStream, false, 1},
      {"nobody listening", "http://127.0.0.1:1/x.pdf", {}, 0, {}, kNoStream, false, 0},
      {"malformed URL", "ht!tp://no", {}, 0, {}, "can't initialize - ht!tp://no", false, 0},
      {"file:// copied without a response check", file, {}, 10000, body, "", true, 0},
      {"file:// missing", file + ".none", {}, 0, {}, kNoStream, false, 0},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    server_.Route(row.source, row.reply);
    const std::string url = row.source[0] == '/' ? server_.Url(row.source) : row.source;
    const int before = server_.Requests();
    MessageCapture capture;
    Recorder progress;
    EXPECT_EQ(Fetch(progress, url), row.result);
    EXPECT_EQ(ReadFile(target_), row.placed.value_or("OLD"));
    EXPECT_EQ(capture.LevelOf("ERROR: wxGet"), *row.error ? 5 : -1);
    EXPECT_TRUE(!*row.error || capture.Contains(row.error)) << "missing " << row.error;
    EXPECT_EQ(progress.Completed(), row.completed);
    EXPECT_EQ(server_.Requests() - before, row.hits);
    EXPECT_TRUE(OnlyTarget());
    if (!progress.calls.empty()) {  // the first address's last segment, cut to 255
      std::string first = "Downloading " + url.substr(url.rfind('/') + 1) + "...";
      EXPECT_EQ(progress.calls[0], std::make_pair(0, first.substr(0, 255)));
    }
  }
}

TEST_F(DownloadTest, UncreatableFileEndsWithoutFinalMessage) {
  server_.Route("/a.pdf", Ok("data"));
  MessageCapture capture;
  Recorder progress;
  target_ = dir_ / "no/such/dir/a.pdf";
  EXPECT_EQ(wxGet(progress, 0, 100, server_.Url("/a.pdf").c_str(), target_.c_str(), kExpected), 0);
  EXPECT_TRUE(capture.Contains("ERROR: wxGet can't create file: " + target_));
  EXPECT_FALSE(progress.Completed());
}

TEST_F(DownloadTest, ProgressStepsStayInRange) {
  struct Row {
    const char* what;
    std::size_t size;
    int first, last, expected, lastChunkValue;
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
    EXPECT_EQ(Fetch(progress, server_.Url("/big.pdf"), row.first, row.last, row.expected),
              int(row.size));
    std::vector<int> values;
    for (const auto& [value, message] : progress.calls)
      if (message.empty()) values.push_back(value);
    ASSERT_GE(values.size(), (row.size + 4095) / 4096)
        << "one update per piece of at most 4096 bytes";
    EXPECT_EQ(values.back(), row.lastChunkValue);
    EXPECT_TRUE(std::is_sorted(values.begin(), values.end()));
    EXPECT_GE(values.front(), row.first);
    EXPECT_LE(values.back(), row.last);
    EXPECT_EQ(progress.calls.back(), std::make_pair(row.last, std::string("Loading Completed.")));
    EXPECT_EQ(std::filesystem::file_size(target_), row.size);
  }
}

TEST_F(DownloadTest, AbortQuestion) {
  const std::string longBody = Pattern(4096 * 300), shortBody = Pattern(4096 * 20);
  HttpReply stall = Ok(shortBody);
  stall.stallAfter = 0;
  server_.Route("/long", Slow(longBody));
  server_.Route("/short", Slow(shortBody));
  server_.Route("/stall", stall);
  struct Row {
    const char* what;
    const char* target;
    bool atKeepAlive, answerYes;
    int minResult, maxResult, resumes;
    std::string placed;
  } rows[] = {
      {"Yes stops a slow body", "/long", false, true, 1, int(longBody.size()) - 1, 0, "OLD"},
      {"No resumes it", "/short", false, false, int(shortBody.size()), int(shortBody.size()), 1,
       shortBody},
      {"Yes stops a stalled body", "/stall", true, true, 0, 0, 0, "OLD"},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    Recorder progress;
    progress.refuseAtChunk = row.atKeepAlive ? -1 : 3;
    progress.refuseFirstKeepAlive = row.atKeepAlive;
    progress.answerYes = row.answerYes;
    MessageCapture capture;
    int result = Fetch(progress, server_.Url(row.target));
    EXPECT_GE(result, row.minResult);
    EXPECT_LE(result, row.maxResult);
    EXPECT_EQ(progress.questions, 1);
    EXPECT_EQ(progress.resumes, row.resumes);
    if (row.answerYes && !row.atKeepAlive) {
      EXPECT_EQ(progress.chunks, 3) << "no update after the confirmed abort";
    }
    EXPECT_TRUE(progress.Completed());
    EXPECT_EQ(ReadFile(target_), row.placed);
    EXPECT_FALSE(capture.Contains("ERROR:")) << "the user's choice is no error";
    EXPECT_TRUE(OnlyTarget());
  }
}

}  // namespace
