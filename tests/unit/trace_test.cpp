// TraceMessage: joining within 511 characters and the choice of level.
#include <gtest/gtest.h>

#include <string>

#include "shell/trace.h"
#include "test_support.h"

using testing_support::MessageCapture;

namespace {

TEST(TraceLevel, PicksTheLevelFromTheWordsOfTheMessage) {
  struct Row {
    const char* what;
    const char* message;
    int level;
  } rows[] = {
      {"Run at the start", "Run viewer", 2},
      {"Open at the start", "Openning document file: x.pdf", 2},
      {"Launch at the start", "Launch acroread", 2},
      {"the beginning wins over ERROR", "Openning document file: ERROR.pdf", 2},
      {"the beginning wins over WARNING", "Running WARNING", 2},
      {"WARNING anywhere", "something WARNING here", 3},
      {"WARNING wins over ERROR", "ERROR and WARNING", 3},
      {"ERROR anywhere", "Attach document: /x/ERROR/y.pdf", 4},
      {"lower-case run is plain", "run viewer", 1},
      {"lower-case warning is plain", "a warning", 1},
      {"a word inside is not a beginning", " Run", 1},
      {"plain text", "Collect Document:", 1},
      {"empty", "", 1},
  };
  for (const auto& row : rows) EXPECT_EQ(TraceLevelOf(row.message), row.level) << row.what;
}

TEST(TraceMessage, JoinsTextAndArgumentWithinTheBuffer) {
  const std::string long_text(600, 't');
  const std::string text_510(510, 'a');
  struct Row {
    const char* what;
    std::string text;
    const char* argument;
    std::string expected;
    int level;
  } rows[] = {
      {"text and argument, no separator added", "Private INI file: ", "Docuvane.INI",
       "Private INI file: Docuvane.INI", 1},
      {"NULL argument gives the text alone", "Start", nullptr, "Start", 1},
      {"empty text gives the argument alone", "", "Run x", "Run x", 2},
      {"the argument takes part in the level", "Attach document: ", "ERROR.pdf",
       "Attach document: ERROR.pdf", 4},
      {"a long text is cut to 511 and the argument dropped", long_text, "ERROR",
       std::string(511, 't'), 1},
      {"the argument is cut so that the whole stays 511", text_510, "ERROR",
       text_510 + "E", 1},
  };
  for (const auto& row : rows) {
    MessageCapture capture;
    TraceMessage(row.text.c_str(), row.argument);
    ASSERT_EQ(capture.messages().size(), 1u) << row.what;
    const auto& m = capture.messages()[0];
    EXPECT_EQ(m.prefix, "Docuvane: ") << row.what;
    EXPECT_EQ(m.text, row.expected) << row.what;
    EXPECT_EQ(m.level, row.level) << row.what;
  }
}

}  // namespace
