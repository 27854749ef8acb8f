// Opening templates: expansion by the Root setting and the command grammar.
#include "access/template.h"

std::string ExpandTemplateRoot(const std::string& tmpl, const std::string& root) {
  std::string out;
  int used = 0;  // only two string arguments are supplied
  for (std::size_t i = 0; i < tmpl.size(); ++i) {
    char c = tmpl[i];
    if (c == '%' && i + 1 < tmpl.size()) {
      char next = tmpl[i + 1];
      if (next == '%') {
        out += '%';
        ++i;
        continue;
      }
      if (next == 's' && used < 2) {
        out += root;
        ++used;
        ++i;
        continue;
      }
    }
    out += c;
  }
  return out;
}

namespace {

// Collects the command line and its argument vector side by side.
class CommandBuilder {
 public:
  // A character of the template itself: blanks and double quotes shape the
  // arguments unless escaped.
  void Literal(char c) {
    result_.commandLine += c;
    if ((c == ' ' || c == '\t') && !quoted_) {
      EndArgument();
    } else if (c == '"') {
      quoted_ = !quoted_;
      started_ = true;  // "" is an empty argument of its own
    } else {
      current_ += c;
      started_ = true;
    }
  }

  // A character escaped with "~": always part of the argument.
  void Escaped(char c) {
    result_.commandLine += c;
    current_ += c;
    started_ = true;
  }

  // Text from outside the template (document name, anchor, program path):
  // never splits or groups anything.  A program path opens an argument even
  // when the program was not found, so that the next argument is never
  // taken for the program.
  void Insert(const std::string& text, bool alwaysStarts) {
    result_.commandLine += text;
    current_ += text;
    if (alwaysStarts || !text.empty()) started_ = true;
  }

  const std::string& CommandLine() const { return result_.commandLine; }

  TemplateCommand Finish() {
    EndArgument();
    return std::move(result_);
  }

 private:
  void EndArgument() {
    if (started_) result_.argv.push_back(current_);
    current_.clear();
    started_ = false;
  }

  TemplateCommand result_;
  std::string current_;
  bool started_ = false;
  bool quoted_ = false;
};

}  // namespace

TemplateCommand BuildTemplateCommand(const std::string& expansion, const std::string& document,
                                     const char* anchor, const ProgramLookup& findProgram,
                                     TraceNotes* notes) {
  const bool hasAnchor = anchor != nullptr;
  const std::size_t dot = document.rfind('.');
  const std::string stem = dot == std::string::npos ? document : document.substr(0, dot);

  CommandBuilder builder;
  int depth = 0;  // changes only without an anchor
  std::size_t i = 0;
  const std::size_t n = expansion.size();
  while (i < n) {
    if (notes) notes->emplace_back("INFO: templ-sp: ", expansion.substr(i));
    const char c = expansion[i];
    const bool copying = hasAnchor || depth == 0;
    switch (c) {
      case '^':
        builder.Insert(stem, false);
        ++i;
        break;
      case '#':
        if (hasAnchor) builder.Insert(anchor, false);
        ++i;
        break;
      case '{':
        if (!hasAnchor) ++depth;
        ++i;
        break;
      case '}':
        if (!hasAnchor) --depth;
        ++i;
        break;
      case '~':
        if (i + 1 >= n) {
          i = n;  // a trailing "~" ends the template
        } else if (copying) {
          builder.Escaped(expansion[i + 1]);
          i += 2;
        } else {
          ++i;  // inside a skipped section the next character is read as usual
        }
        break;
      case '<': {
        const std::size_t close = expansion.find('>', i + 1);
        std::string name =
            expansion.substr(i + 1, close == std::string::npos ? std::string::npos : close - i - 1);
        if (name.size() > kProgramNameCapacity - 1) name.resize(kProgramNameCapacity - 1);
        builder.Insert(findProgram ? findProgram(name) : std::string(), true);
        i = close == std::string::npos ? n : close + 1;
        break;
      }
      default:
        if (copying) builder.Literal(c);
        ++i;
        break;
    }
    if (notes) notes->emplace_back("INFO: templ-dp: ", builder.CommandLine());
  }
  return builder.Finish();
}
