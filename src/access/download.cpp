// The document transfer on libcurl.
#include "access/download.h"

#include <algorithm>
#include <cctype>
#include <chrono>
#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <mutex>

#include "access/curl_api.h"
#include "pdf/pdf_check.h"
#include "platform/partfile.h"
#include "text/text.h"
#include "trovlib/trovlib.h"

namespace {

constexpr int kMaxRedirections = 10;
constexpr std::size_t kReadChunk = 4096;    // one progress step per piece of this size
constexpr std::size_t kMessageLimit = 255;  // progress messages
constexpr int kKeepAliveMs = 100;
constexpr long kCurlBufferSize = 128 * 1024;

std::mutex g_limitsMutex;
DownloadLimits g_limits;

// The loaded library (set before the first transfer's first call).
const CurlApi* g_curl = nullptr;

void Error(const char* prefix, const std::string& text) { TrovMessage(prefix, text.c_str(), 5); }

bool IsRedirection(long code) {
  return code == 301 || code == 302 || code == 303 || code == 307 || code == 308;
}

bool IsHex(char c) { return std::isxdigit(static_cast<unsigned char>(c)) != 0; }

void AppendEscaped(std::string& out, unsigned char c) {
  char hex[4];
  std::snprintf(hex, sizeof hex, "%%%02X", c);
  out += hex;
}

// Percent-encodes what may not stand in a URL as it is (blanks, controls,
// quotes, 8-bit bytes), so that names of any kind reach the server as one
// path and never split a request line.
std::string EscapeUrl(const std::string& url) {
  static const char* kUnsafe = "\"<>\\^`{|}";
  std::string out;
  for (std::size_t i = 0; i < url.size(); ++i) {
    unsigned char c = static_cast<unsigned char>(url[i]);
    bool escape = c <= 0x20 || c >= 0x7f || std::strchr(kUnsafe, c) != nullptr;
    if (c == '%' && !(i + 2 < url.size() && IsHex(url[i + 1]) && IsHex(url[i + 2]))) escape = true;
    if (escape) {
      AppendEscaped(out, c);
    } else {
      out += static_cast<char>(c);
    }
  }
  return out;
}

std::string UrlPart(CURLU* url, CURLUPart part) {
  char* value = nullptr;
  if (g_curl->url_get(url, part, &value, 0) != CURLUE_OK || value == nullptr) return std::string();
  std::string result(value);
  g_curl->free(value);
  return result;
}

struct CurlUrl {
  CURLU* handle = nullptr;
  CurlUrl() : handle(g_curl->url()) {}
  explicit CurlUrl(CURLU* h) : handle(h) {}
  ~CurlUrl() {
    if (handle) g_curl->url_cleanup(handle);
  }
  CurlUrl(const CurlUrl&) = delete;
  CurlUrl& operator=(const CurlUrl&) = delete;
};

// What one pass of the transfer learns and writes; shared with libcurl's
// callbacks.
struct Transfer {
  DownloadProgress* dialog = nullptr;
  int first = 0;
  int last = 0;
  int expected = 0;
  CURL* easy = nullptr;
  std::string targetPath;
  PartFile file;
  std::int64_t count = 0;
  bool http = false;
  bool bodySeen = false;    // the response's body started (headers complete)
  bool redirected = false;  // a redirection: its body is not wanted
  bool createFailed = false;
  bool writeFailed = false;
  bool aborted = false;
  std::string location;
  bool responseSeen = false;
  std::chrono::steady_clock::time_point lastShown = std::chrono::steady_clock::now();

  int Value() const {
    if (expected <= 0) return first;
    std::int64_t value = first + (static_cast<std::int64_t>(last) - first) * count / expected;
    std::int64_t low = std::min(first, last);
    std::int64_t high = std::max(first, last);
    return static_cast<int>(std::clamp(value, low, high));
  }

  // The dialog's answer: false once the user confirmed the abort.
  bool Answer(bool goOn) {
    lastShown = std::chrono::steady_clock::now();
    if (goOn) return true;
    if (dialog->AskAbortQuestion()) {
      aborted = true;
      return false;
    }
    dialog->Resume();
    lastShown = std::chrono::steady_clock::now();
    return true;
  }

  void KeepAliveIfDue() {
    auto now = std::chrono::steady_clock::now();
    if (now - lastShown < std::chrono::milliseconds(kKeepAliveMs)) return;
    Answer(dialog->KeepAlive(Value()));
  }

  bool OpenTemp() { return file.Create(targetPath); }
};

size_t OnHeader(char* data, size_t size, size_t count, void* user) {
  Transfer& t = *static_cast<Transfer*>(user);
  std::size_t total = size * count;
  std::string line(data, total);
  while (!line.empty() && (line.back() == '\r' || line.back() == '\n')) line.pop_back();
  if (line.compare(0, 5, "HTTP/") == 0) {  // a new response (after 1xx, a new block)
    t.location.clear();
    t.responseSeen = true;
  } else if (line.size() >= 9 && Folded(line.substr(0, 9)) == "location:") {
    std::size_t begin = line.find_first_not_of(" \t", 9);
    t.location = begin == std::string::npos ? std::string() : line.substr(begin);
    while (!t.location.empty() && (t.location.back() == ' ' || t.location.back() == '\t'))
      t.location.pop_back();
  }
  return total;
}

size_t OnData(char* data, size_t size, size_t count, void* user) {
  Transfer& t = *static_cast<Transfer*>(user);
  std::size_t total = size * count;
  if (!t.bodySeen) {
    t.bodySeen = true;
    long code = 0;
    g_curl->easy_getinfo(t.easy, CURLINFO_RESPONSE_CODE, &code);
    if (t.http && IsRedirection(code)) t.redirected = true;
  }
  if (t.redirected) return 0;  // stop: the body of a redirection is not the document
  if (!t.file.IsOpen() && !t.OpenTemp()) {
    t.createFailed = true;
    return 0;
  }
  std::size_t done = 0;
  while (done < total) {
    std::size_t n = std::min(kReadChunk, total - done);
    if (!t.file.Write(data + done, n)) {
      t.writeFailed = true;
      return 0;
    }
    done += n;
    t.count += static_cast<std::int64_t>(n);
    if (!t.Answer(t.dialog->Update(t.Value(), std::string()))) return 0;
  }
  return total;
}

// Runs one request to its end, keeping the dialog alive between arrivals.
CURLcode Perform(CURLM* multi, Transfer& t) {
  g_curl->multi_add_handle(multi, t.easy);
  CURLcode result = CURLE_OK;
  bool done = false;
  for (;;) {
    int running = 0;
    if (g_curl->multi_perform(multi, &running) != CURLM_OK) {
      result = CURLE_FAILED_INIT;
      break;
    }
    int queued = 0;
    while (CURLMsg* msg = g_curl->multi_info_read(multi, &queued)) {
      if (msg->msg == CURLMSG_DONE) {
        result = msg->data.result;
        done = true;
      }
    }
    if (done || running == 0 || t.aborted) break;
    t.KeepAliveIfDue();
    if (t.aborted) break;
    g_curl->multi_poll(multi, nullptr, 0, kKeepAliveMs, nullptr);
  }
  if (t.aborted && !done) result = CURLE_ABORTED_BY_CALLBACK;
  g_curl->multi_remove_handle(multi, t.easy);
  return result;
}

struct CurlHandles {
  CURL* easy = g_curl->easy_init();
  CURLM* multi = g_curl->multi_init();
  ~CurlHandles() {
    if (easy) g_curl->easy_cleanup(easy);
    if (multi) g_curl->multi_cleanup(multi);
  }
};

// Whether what arrived is the whole document, judged before it takes the
// document's place.  Without a Content-Length only a clean end of the
// connection says the body is over; a document named *.pdf must also be a
// whole PDF file, which a body cut at a revision's end or one short is not.
bool IsComplete(Transfer& t, CURLcode result, long code, const std::string& source) {
  curl_off_t announced = -1;
  g_curl->easy_getinfo(t.easy, CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &announced);
  std::string problem;
  if (t.writeFailed) {
    Error("ERROR: wxGet can't write file: ", t.targetPath);
  } else if (result != CURLE_OK) {
    Error("ERROR: wxGet transfer failed for ", source + " (" + g_curl->easy_strerror(result) + ")");
  } else if (t.http && code != 200) {
    Error("ERROR: wxGet no document at ", source + " (HTTP " + std::to_string(code) + ")");
  } else if (announced >= 0 && announced != t.count) {
    Error("ERROR: wxGet incomplete transfer of ", source);
  } else if (EndsWithIgnoringCase(t.targetPath, ".pdf") && !IsCompletePdf(t.file.path(), problem)) {
    Error("ERROR: wxGet no complete PDF document from ", source + " (" + problem + ")");
  } else {
    return true;
  }
  return false;
}

}  // namespace

std::string EscapeUrlPath(const std::string& name) {
  std::string out;
  for (char c : name) {
    if (c == '#' || c == '?' || c == '%') {
      AppendEscaped(out, static_cast<unsigned char>(c));
    } else {
      out += c;
    }
  }
  return out;
}

void SetDownloadLimits(const DownloadLimits& limits) {
  std::lock_guard<std::mutex> lock(g_limitsMutex);
  g_limits = limits;
}

DownloadLimits GetDownloadLimits() {
  std::lock_guard<std::mutex> lock(g_limitsMutex);
  return g_limits;
}

int wxGet(DownloadProgress& dialog, int first, int last, const char* url, const char* path,
          int expected) {
  const std::string source = url ? url : "";
  std::string why;
  g_curl = LoadCurl(&why);
  if (g_curl == nullptr) {
    Error("ERROR: wxGet can't load the HTTP library for ", source + " (" + why + ")");
    return 0;
  }
  const DownloadLimits limits = GetDownloadLimits();

  CurlUrl current;
  if (current.handle == nullptr ||
      g_curl->url_set(current.handle, CURLUPART_URL, EscapeUrl(source).c_str(), 0) != CURLUE_OK) {
    Error("ERROR: wxGet can't initialize - ", source);
    return 0;
  }

  std::size_t slash = source.rfind('/');
  const std::string progressMessage = CutUtf8(
      "Downloading " + (slash == std::string::npos ? source : source.substr(slash + 1)) + "...",
      kMessageLimit);

  CurlHandles curl;
  if (curl.easy == nullptr || curl.multi == nullptr) {
    Error("ERROR: wxGet can't initialize stream for ", source);
    return 0;
  }

  Transfer t;
  t.dialog = &dialog;
  t.first = first;
  t.last = last;
  t.expected = expected;
  t.easy = curl.easy;
  t.targetPath = path ? path : "";

  // Part files of transfers that were killed would stay beside it forever.
  RemoveAbandonedPartFiles(t.targetPath);

  CURLcode result = CURLE_OK;
  long code = 0;
  for (int redirections = 0;; ++redirections) {
    dialog.Update(first, progressMessage);

    const std::string address = UrlPart(current.handle, CURLUPART_URL);
    const std::string scheme = Folded(UrlPart(current.handle, CURLUPART_SCHEME));
    t.http = scheme == "http" || scheme == "https";
    t.bodySeen = t.redirected = t.responseSeen = false;
    t.location.clear();

    g_curl->easy_reset(t.easy);
    g_curl->easy_setopt(t.easy, CURLOPT_URL, address.c_str());
    // Only the first address may use any scheme; redirections lead to the web.
    g_curl->easy_setopt(t.easy, CURLOPT_PROTOCOLS_STR, redirections == 0 ? "all" : "http,https");
    g_curl->easy_setopt(t.easy, CURLOPT_FOLLOWLOCATION, 0L);
    g_curl->easy_setopt(t.easy, CURLOPT_NOSIGNAL, 1L);
    g_curl->easy_setopt(t.easy, CURLOPT_CONNECTTIMEOUT_MS, limits.connectTimeoutMs);
    g_curl->easy_setopt(t.easy, CURLOPT_LOW_SPEED_LIMIT, 1L);
    g_curl->easy_setopt(t.easy, CURLOPT_LOW_SPEED_TIME, limits.stallTimeoutS);
    g_curl->easy_setopt(t.easy, CURLOPT_BUFFERSIZE, kCurlBufferSize);
    g_curl->easy_setopt(t.easy, CURLOPT_USERAGENT, "Docuvane/5.0");
    g_curl->easy_setopt(t.easy, CURLOPT_HEADERFUNCTION, OnHeader);
    g_curl->easy_setopt(t.easy, CURLOPT_HEADERDATA, &t);
    g_curl->easy_setopt(t.easy, CURLOPT_WRITEFUNCTION, OnData);
    g_curl->easy_setopt(t.easy, CURLOPT_WRITEDATA, &t);

    result = Perform(curl.multi, t);
    code = 0;
    g_curl->easy_getinfo(t.easy, CURLINFO_RESPONSE_CODE, &code);

    if (t.aborted || !t.http || !IsRedirection(code)) break;

    // A redirection: where to, and whether we may go there.
    if (t.location.empty()) {
      Error("ERROR: wxGet can't initialize - ", source);
      return 0;
    }
    if (redirections >= kMaxRedirections) {
      Error("ERROR: wxGet too many redirections for ", source);
      return 0;
    }
    CurlUrl next(g_curl->url_dup(current.handle));
    if (next.handle == nullptr || g_curl->url_set(next.handle, CURLUPART_URL,
                                                  EscapeUrl(t.location).c_str(), 0) != CURLUE_OK) {
      Error("ERROR: wxGet can't initialize - ", source);
      return 0;
    }
    const std::string nextScheme = Folded(UrlPart(next.handle, CURLUPART_SCHEME));
    if (nextScheme != "http" && nextScheme != "https") {
      Error("ERROR: wxGet refuses a redirection outside http and https: ", t.location);
      return 0;
    }
    std::swap(current.handle, next.handle);
  }

  if (t.createFailed) {
    t.file.Remove();
    Error("ERROR: wxGet can't create file: ", t.targetPath);
    return 0;
  }
  // Nothing came back at all: no connection, no response, no such file.
  if (!t.aborted && result != CURLE_OK && !t.bodySeen && !(t.http && t.responseSeen && code != 0)) {
    t.file.Remove();
    Error("ERROR: wxGet can't initialize stream for ", source);
    return 0;
  }
  // The stream is there: an empty body still gives a file.
  if (!t.aborted && !t.file.IsOpen() && !t.OpenTemp()) {
    Error("ERROR: wxGet can't create file: ", t.targetPath);
    return 0;
  }

  if (!t.aborted && IsComplete(t, result, code, source)) {
    if (!t.file.MoveTo(t.targetPath)) Error("ERROR: wxGet can't create file: ", t.targetPath);
  }
  t.file.Remove();

  dialog.Update(last, "Loading Completed.");
  return static_cast<int>(std::min<std::int64_t>(t.count, INT_MAX));
}
