// The viewer rules in force.
#include "access/viewer_rules.h"

#include "text/text.h"

namespace {

// Only a PDF document with an anchor (an empty one counts) goes to an
// Acrobat-family reader, which gets the destination up to its first blank.
bool AcrobatReader(const ViewerFacts& facts, ViewerChoice& choice) {
  if (!facts.anchor || CompareIgnoringCase(facts.extension.c_str(), "PDF") != 0 ||
      !facts.findReader)
    return false;
  const std::string reader = facts.findReader();
  if (reader.size() >= kReaderPathCapacity) {
    choice.notes.emplace_back("ERROR: PDF reader path too long: ", reader);
    return false;
  }
  if (reader.empty()) return false;
  choice.notes.emplace_back("PDF Reader: ", reader);
  if (!ContainsIgnoringCase(reader, "acro")) return false;
  const std::string destination = facts.anchor->substr(0, facts.anchor->find(' '));
  choice.route = ViewerRoute::kRun;
  choice.command.commandLine =
      "\"" + reader + "\" /A \"" + destination + "\" \"" + facts.document + "\"";
  choice.command.argv = {reader, "/A", destination, facts.document};
  return true;
}

bool OpeningTemplate(const ViewerFacts& facts, ViewerChoice& choice) {
  if (facts.openingTemplate.empty()) return false;
  if (facts.traceTemplates) choice.notes.emplace_back("INFO: template(*) ", facts.openingTemplate);
  const std::string expansion = ExpandTemplateRoot(facts.openingTemplate, facts.root);
  if (facts.traceTemplates) choice.notes.emplace_back("INFO: template(=) ", expansion);
  if (expansion.size() >= kTemplateCapacity) {
    choice.notes.emplace_back("ERROR: opening template too long: ", expansion);
    choice.route = ViewerRoute::kRefused;
    return true;
  }
  if (expansion.empty()) return false;
  choice.route = ViewerRoute::kRun;
  choice.command = BuildTemplateCommand(
      expansion, facts.document, facts.anchor ? facts.anchor->c_str() : nullptr, facts.findProgram,
      facts.traceTemplates ? &choice.notes : nullptr);
  return true;
}

bool DefaultApplication(const ViewerFacts&, ViewerChoice& choice) {
  choice.route = ViewerRoute::kDefaultApplication;
  return true;
}

}  // namespace

const std::vector<ViewerRule>& ViewerRules() {
  static const std::vector<ViewerRule> rules = {
      {"Acrobat reader", AcrobatReader},
      {"opening template", OpeningTemplate},
      {"default application", DefaultApplication},
  };
  return rules;
}

ViewerChoice ChooseViewer(const ViewerFacts& facts, const std::vector<ViewerRule>& rules) {
  ViewerChoice choice;
  for (const ViewerRule& rule : rules)
    if (rule.decide(facts, choice)) return choice;
  choice.route = ViewerRoute::kDefaultApplication;
  return choice;
}
