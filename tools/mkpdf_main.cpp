// docuvane-mkpdf: writes a small valid PDF whose pages show a title.
//
//   docuvane-mkpdf OUT.pdf "Title" [pages]
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

namespace {

// A PDF literal string: parentheses and backslashes escaped, other control
// bytes dropped.
std::string Literal(const std::string& text) {
  std::string out = "(";
  for (unsigned char c : text) {
    if (c == '(' || c == ')' || c == '\\') {
      out += '\\';
      out += static_cast<char>(c);
    } else if (c >= 0x20) {
      out += static_cast<char>(c);
    }
  }
  return out + ")";
}

std::string Pdf(const std::string& title, int pages) {
  std::string pdf = "%PDF-1.4\n%\xE2\xE3\xCF\xD3\n";
  std::vector<std::size_t> offsets;  // of objects 1..n
  auto object = [&](const std::string& body) {
    offsets.push_back(pdf.size());
    pdf += std::to_string(offsets.size()) + " 0 obj\n" + body + "\nendobj\n";
  };
  // 1 catalog, 2 page tree, 3 font, then per page: page object, content.
  std::string kids;
  for (int i = 0; i < pages; ++i) kids += (i ? " " : "") + std::to_string(4 + 2 * i) + " 0 R";
  object("<< /Type /Catalog /Pages 2 0 R >>");
  object("<< /Type /Pages /Kids [" + kids + "] /Count " + std::to_string(pages) + " >>");
  object("<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica >>");
  for (int i = 0; i < pages; ++i) {
    object(
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 612 792] /Resources << /Font << /F1 3 0 R "
        ">> >> /Contents " +
        std::to_string(5 + 2 * i) + " 0 R >>");
    const std::string content = "BT /F1 24 Tf 72 700 Td " + Literal(title) +
                                " Tj ET\nBT /F1 12 Tf 72 72 Td " +
                                Literal("Page " + std::to_string(i + 1)) + " Tj ET\n";
    object("<< /Length " + std::to_string(content.size()) + " >>\nstream\n" + content +
           "endstream");
  }
  const std::size_t xref = pdf.size();
  pdf += "xref\n0 " + std::to_string(offsets.size() + 1) + "\n0000000000 65535 f \n";
  for (std::size_t offset : offsets) {
    char line[24];
    snprintf(line, sizeof line, "%010zu 00000 n \n", offset);
    pdf += line;
  }
  pdf += "trailer\n<< /Size " + std::to_string(offsets.size() + 1) +
         " /Root 1 0 R /Info << /Title " + Literal(title) + " >> >>\nstartxref\n" +
         std::to_string(xref) + "\n%%EOF\n";
  return pdf;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3 || argc > 4) {
    std::cerr << "usage: docuvane-mkpdf OUT.pdf \"Title\" [pages]\n";
    return 2;
  }
  int pages = 1;
  if (argc == 4) {
    char* end = nullptr;
    long n = strtol(argv[3], &end, 10);
    if (end == argv[3] || *end != '\0' || n < 1 || n > 10000) {
      std::cerr << "docuvane-mkpdf: pages must be a number from 1 to 10000\n";
      return 2;
    }
    pages = static_cast<int>(n);
  }
  std::ofstream out(argv[1], std::ios::binary | std::ios::trunc);
  const std::string pdf = Pdf(argv[2], pages);
  out.write(pdf.data(), static_cast<std::streamsize>(pdf.size()));
  out.close();
  if (!out) {
    std::cerr << "docuvane-mkpdf: cannot write " << argv[1] << "\n";
    return 1;
  }
  return 0;
}
