// docuvane-mkpdf: writes a small valid PDF whose pages show a title.
//
//   docuvane-mkpdf OUT.pdf "Title" [pages]
//   docuvane-mkpdf --manual OUT.pdf      a manual with commands, environments,
//                                        page labels and a hyperlinked index
//   docuvane-mkpdf --damaged OUT.pdf     a PDF cut short
//   docuvane-mkpdf --encrypted OUT.pdf   a PDF that needs a password
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

struct Link {
  double x1, y1, x2, y2;
  std::string dest;  // a named destination
};
struct Page {
  std::string content;
  std::vector<Link> links;
};

// One text piece at (x, y), 12 pt Courier: every character is 7.2 pt wide,
// so pieces can be put side by side on one line.
std::string Text(double x, double y, const std::string& text) {
  return "BT /F1 12 Tf " + std::to_string(x) + " " + std::to_string(y) + " Td " + Literal(text) +
         " Tj ET\n";
}

// Pages with links to named destinations; `catalog` and `trailer` extend
// those dictionaries; the text is set in `font`.
std::string Document(const std::vector<Page>& pages, const std::string& names,
                     const std::string& catalog, const std::string& trailer,
                     const std::string& font = "Courier") {
  std::string pdf = "%PDF-1.4\n%\xE2\xE3\xCF\xD3\n";
  std::vector<std::size_t> offsets;
  auto object = [&](const std::string& body) {
    offsets.push_back(pdf.size());
    pdf += std::to_string(offsets.size()) + " 0 obj\n" + body + "\nendobj\n";
  };
  const auto pageObject = [](std::size_t i) { return std::to_string(4 + 2 * i) + " 0 R"; };
  std::string kids;
  for (std::size_t i = 0; i < pages.size(); ++i) kids += (i ? " " : "") + pageObject(i);
  std::string dests = names;
  for (std::size_t i = 0; i < pages.size(); ++i) {
    const std::string key = "@" + std::to_string(i + 1) + "@";
    for (std::size_t at; (at = dests.find(key)) != std::string::npos;)
      dests.replace(at, key.size(), pageObject(i));
  }
  object("<< /Type /Catalog /Pages 2 0 R " +
         (dests.empty() ? std::string() : "/Names << /Dests << /Names [" + dests + "] >> >> ") +
         catalog + " >>");
  object("<< /Type /Pages /Kids [" + kids + "] /Count " + std::to_string(pages.size()) + " >>");
  object("<< /Type /Font /Subtype /Type1 /BaseFont /" + font + " >>");
  for (std::size_t i = 0; i < pages.size(); ++i) {
    std::string annots;
    for (const Link& l : pages[i].links)
      annots += "<< /Type /Annot /Subtype /Link /Border [0 0 0] /Rect [" + std::to_string(l.x1) +
                " " + std::to_string(l.y1) + " " + std::to_string(l.x2) + " " +
                std::to_string(l.y2) + "] /Dest " + Literal(l.dest) + " >> ";
    object(
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 612 792] /Resources << /Font << /F1 3 0 "
        "R >> >> /Contents " +
        std::to_string(5 + 2 * i) + " 0 R" +
        (annots.empty() ? std::string() : " /Annots [" + annots + "]") + " >>");
    object("<< /Length " + std::to_string(pages[i].content.size()) + " >>\nstream\n" +
           pages[i].content + "endstream");
  }
  const std::size_t xref = pdf.size();
  pdf += "xref\n0 " + std::to_string(offsets.size() + 1) + "\n0000000000 65535 f \n";
  for (std::size_t offset : offsets) {
    char line[24];
    snprintf(line, sizeof line, "%010zu 00000 n \n", offset);
    pdf += line;
  }
  pdf += "trailer\n<< /Size " + std::to_string(offsets.size() + 1) + " /Root 1 0 R " + trailer +
         " >>\nstartxref\n" + std::to_string(xref) + "\n%%EOF\n";
  return pdf;
}

// Pages that show a title, and their numbers.
std::string Pdf(const std::string& title, int count) {
  std::vector<Page> pages(static_cast<std::size_t>(count));
  for (int i = 0; i < count; ++i)
    pages[static_cast<std::size_t>(i)].content =
        "BT /F1 24 Tf 72 700 Td " + Literal(title) + " Tj ET\nBT /F1 12 Tf 72 72 Td " +
        Literal("Page " + std::to_string(i + 1)) + " Tj ET\n";
  return Document(pages, "", "", "/Info << /Title " + Literal(title) + " >>", "Helvetica");
}

// Six pages labelled i, ii, 1, 2, 3, 4.  Text pages mention commands and
// environments; the last page is an index whose page numbers link to the
// destinations page.1 and page.2 (physical pages 3 and 4), and whose code
// line number 17 links to HD.17 on physical page 2.
std::string Manual() {
  std::vector<Page> pages(6);
  pages[0].content = Text(72, 700, "A manual for testing");
  pages[1].content = Text(72, 700, "Contents");
  pages[2].content = Text(72, 700, "\\section starts a section.") +
                     Text(72, 680, "\\begin{align} x \\end{align} and \\section again.");
  pages[3].content = Text(72, 700, "\\cs_new:Npn defines a function; so does \\section.");
  pages[4].content = Text(72, 700, "\\binom{n}{k} and \\binom again, then \\foo.");
  Page& index = pages[5];
  index.content = Text(72, 740, "Index");
  struct Entry {
    const char* head;
    std::vector<std::pair<const char*, const char*>> numbers;  // text, destination
  };
  const std::vector<Entry> entries = {
      {"\\section . . .", {{"1", "page.1"}, {"2", "page.2"}}},
      {"\\cs_new:Npn . . .", {{"2", "page.2"}}},
      {"align (environment) . . .", {{"1", "page.1"}}},
      {"\\foo . . .", {{"17", "HD.17"}}},
  };
  double y = 700;
  for (const Entry& e : entries) {
    index.content += Text(72, y, e.head);
    double x = 72 + 7.2 * (std::string(e.head).size() - 1);  // "\\" is one character
    for (const auto& [number, dest] : e.numbers) {
      const std::string shown =
          std::string(number) + (&dest != &e.numbers.back().second ? "," : "");
      x += 7.2;
      index.content += Text(x, y, shown);
      index.links.push_back(Link{x, y - 3, x + 7.2 * std::string(number).size(), y + 10, dest});
      x += 7.2 * shown.size();
    }
    y -= 20;
  }
  // Sorted names, as the name tree wants them.
  const std::string names =
      "(HD.17) [@2@ /XYZ 0 792 0] (page.1) [@3@ /XYZ 0 792 0] "
      "(page.2) [@4@ /XYZ 0 792 0]";
  return Document(pages, names, "/PageLabels << /Nums [0 << /S /r >> 2 << /S /D >>] >>",
                  "/Info << /Title (A manual for testing) >>");
}

std::string Encrypted() {
  std::vector<Page> pages(1);
  pages[0].content = Text(72, 700, "\\secret");
  const std::string filler(64, 'A');
  return Document(pages, "", "",
                  "/Encrypt << /Filter /Standard /V 1 /R 2 /O <" + filler + "> /U <" + filler +
                      "> /P -4 >> /ID [<00112233445566778899AABBCCDDEEFF> "
                      "<00112233445566778899AABBCCDDEEFF>]");
}

// Writes the document; the exit status of the tool.
int WriteFile(const char* path, const std::string& pdf) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(pdf.data(), static_cast<std::streamsize>(pdf.size()));
  out.close();
  if (!out) {
    std::cerr << "docuvane-mkpdf: cannot write " << path << "\n";
    return 1;
  }
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc == 3 && argv[1][0] == '-') {
    const std::string kind = argv[1];
    std::string pdf;
    if (kind == "--manual")
      pdf = Manual();
    else if (kind == "--encrypted")
      pdf = Encrypted();
    else if (kind == "--damaged")
      pdf = Pdf("Damaged", 3).substr(0, 200);
    else {
      std::cerr << "docuvane-mkpdf: unknown kind " << kind << "\n";
      return 2;
    }
    return WriteFile(argv[2], pdf);
  }
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
  return WriteFile(argv[1], Pdf(argv[2], pages));
}
