// The PDF check: a few structural rules read from both ends of the file,
// then poppler.  Poppler repairs a broken cross-reference table silently, so
// it alone would take many cut files for whole ones.
#include "pdf/pdf_check.h"

#include <poppler.h>

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstring>
#include <memory>
#include <mutex>

#include "platform/dynamic_library.h"
#include "platform/files.h"

namespace {

constexpr std::size_t kTailSize = 1024;   // where "startxref" and "%%EOF" must stand
constexpr std::size_t kXrefWindow = 512;  // what is read where "startxref" points

bool IsPdfSpace(char c) {
  return c == ' ' || c == '\n' || c == '\r' || c == '\t' || c == '\f' || c == '\0';
}

std::size_t SkipSpace(const std::string& text, std::size_t at) {
  while (at < text.size() && IsPdfSpace(text[at])) ++at;
  return at;
}

std::size_t SkipDigits(const std::string& text, std::size_t at) {
  while (at < text.size() && std::isdigit(static_cast<unsigned char>(text[at]))) ++at;
  return at;
}

bool ReadPiece(RandomAccessFile& file, std::int64_t offset, std::size_t size, std::string& piece) {
  piece.assign(size, '\0');
  return file.ReadAt(offset, piece.data(), size);
}

// The offset that the last "startxref" of `tail` gives, when "%%EOF" and
// nothing but white space follow it; -1 otherwise.
std::int64_t LastStartXref(const std::string& tail) {
  const std::size_t keyword = tail.rfind("startxref");
  if (keyword == std::string::npos) return -1;
  const std::size_t digits = SkipSpace(tail, keyword + 9);
  const std::size_t end = SkipDigits(tail, digits);
  if (end == digits || end - digits > 15) return -1;
  const std::size_t marker = SkipSpace(tail, end);
  if (tail.compare(marker, 5, "%%EOF") != 0 || SkipSpace(tail, marker + 5) != tail.size())
    return -1;
  return std::stoll(tail.substr(digits, end - digits));
}

// "xref", or an object "N G obj" whose dictionary says /Type /XRef.
bool IsCrossReference(const std::string& text) {
  std::size_t at = SkipSpace(text, 0);
  if (text.compare(at, 4, "xref") == 0) return true;
  for (int number = 0; number < 2; ++number) {
    const std::size_t end = SkipDigits(text, at);
    if (end == at || end >= text.size() || !IsPdfSpace(text[end])) return false;
    at = SkipSpace(text, end);
  }
  if (text.compare(at, 3, "obj") != 0) return false;
  const std::size_t stream = text.find("stream", at);
  const std::size_t type = text.find("/XRef", at);
  return type != std::string::npos && type < stream;
}

bool Refuse(std::string& problem, const char* why) {
  problem = why;
  return false;
}

struct GObjectUnref {
  void operator()(void* object) const { g_object_unref(object); }
};

// The PDF library, loaded on the first check: the program needs it only for
// downloads, and it brings the colour, image and signature libraries along.
struct PopplerApi {
  decltype(&::poppler_document_new_from_file) new_from_file;
  decltype(&::poppler_document_get_n_pages) get_n_pages;
  decltype(&::poppler_error_quark) error_quark;
};

const PopplerApi* LoadPoppler(std::string& reason) {
  static PopplerApi api;
  static const PopplerApi* loaded = nullptr;
  static std::string why;
  static std::once_flag once;
  std::call_once(once, [] {
    static DynamicLibrary library;
    if (!library.Open({"libpoppler-glib.so.8"}, &why)) return;
    std::string missing;
    library.Take("poppler_document_new_from_file", api.new_from_file, missing);
    library.Take("poppler_document_get_n_pages", api.get_n_pages, missing);
    library.Take("poppler_error_quark", api.error_quark, missing);
    if (!missing.empty())
      why = "libpoppler-glib lacks a function it should have";
    else
      loaded = &api;
  });
  reason = why;
  return loaded;
}

bool PopplerOpens(const std::string& path, std::string& problem) {
  std::string reason;
  const PopplerApi* poppler = LoadPoppler(reason);
  if (poppler == nullptr) {
    problem = "cannot be checked, the PDF library does not load: " + reason;
    return false;
  }
  char* absolute = g_canonicalize_filename(path.c_str(), nullptr);
  GError* error = nullptr;
  char* uri = g_filename_to_uri(absolute, nullptr, &error);
  g_free(absolute);
  std::unique_ptr<PopplerDocument, GObjectUnref> document;
  if (uri != nullptr) document.reset(poppler->new_from_file(uri, nullptr, &error));
  g_free(uri);
  // A document that asks for a password is whole; it is just not ours to read.
  const bool encrypted = error != nullptr && error->domain == poppler->error_quark() &&
                         error->code == POPPLER_ERROR_ENCRYPTED;
  if (document == nullptr && !encrypted)
    problem = std::string("unreadable: ") + (error ? error->message : "no document");
  else if (document != nullptr && poppler->get_n_pages(document.get()) < 1)
    problem = "no pages";
  if (error != nullptr) g_error_free(error);
  return problem.empty();
}

}  // namespace

bool IsCompletePdf(const std::string& path, std::string& problem) {
  problem.clear();
  RandomAccessFile file;
  if (!file.Open(path)) return Refuse(problem, "cannot be read");
  const std::int64_t size = file.Size();
  std::string head, tail, target;
  if (!ReadPiece(file, 0, 8, head) || head.compare(0, 5, "%PDF-") != 0 ||
      !std::isdigit(static_cast<unsigned char>(head[5])) || head[6] != '.' ||
      !std::isdigit(static_cast<unsigned char>(head[7])))
    return Refuse(problem, "no PDF header");
  const std::size_t tailSize = static_cast<std::size_t>(std::min<std::int64_t>(size, kTailSize));
  if (!ReadPiece(file, size - static_cast<std::int64_t>(tailSize), tailSize, tail))
    return Refuse(problem, "cannot be read");
  const std::int64_t xref = LastStartXref(tail);
  if (xref < 0) return Refuse(problem, "no end-of-file marker after startxref");
  const std::size_t window =
      static_cast<std::size_t>(std::min<std::int64_t>(size - std::min(xref, size), kXrefWindow));
  if (xref >= size || !ReadPiece(file, xref, window, target) || !IsCrossReference(target))
    return Refuse(problem, "startxref leads to no cross-reference section");
  file.Close();
  return PopplerOpens(path, problem);
}
