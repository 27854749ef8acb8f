// The Locations items of a word's keyword targets.
#include <string>

#include "base/trace.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "text/text.h"

const KeywordNode* FindKeyword(const char* word) {
  if (word == nullptr) return nullptr;
  // The list is sorted, but a match is looked for to its end: the first
  // equal node counts, whatever came before it.
  for (const KeywordNode* node = KeywordListHead.Next; node != nullptr && node != &KeywordListEnd;
       node = node->Next) {
    if (node->Keyword != nullptr && CompareIgnoringCase(node->Keyword, word) == 0) return node;
  }
  return nullptr;
}

KeywordTargets CollectKeywordTargets(const char* word) {
  KeywordTargets result;
  if (word == nullptr) return result;
  const KeywordNode* match = FindKeyword(word);
  if (match == nullptr) return result;

  int targets = 0;
  for (const KeywordTarget* target = match->Targets; target != nullptr; target = target->Next) {
    ++targets;
    if (target->DocumentIndex < 0 || target->DocumentIndex >= DocumentCount) continue;
    const std::string& path = DocumentTable[target->DocumentIndex].Path;
    const char* anchor = target->Anchor ? target->Anchor : "";
    std::string text = path + "#" + anchor;
    if (text.size() > kMaxKeywordTargetText) {
      TraceMessage("WARNING: Keyword target too long: ", text.c_str());
      continue;
    }
    if (targets == 1 && target->Next == nullptr) {
      result.single = true;
      result.singlePath = path;
      result.singleAnchor = anchor;
    }
    result.items.push_back(std::move(text));
  }
  return result;
}
