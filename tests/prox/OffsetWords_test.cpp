#include "prox/OffsetWords.h"

#include <map>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

constexpr OffsetTask kAllTasks[] = {
    OffsetTask::kNone,           OffsetTask::kSample,        OffsetTask::kPoffset,
    OffsetTask::kPoffsetDisable, OffsetTask::kPoffsetEnable, OffsetTask::kPulseNumber,
    OffsetTask::kPulseCurrent,   OffsetTask::kOre,           OffsetTask::kOreDisable,
    OffsetTask::kOreEnable,
};
// Every word there is, and some that only look like one.
const std::vector<std::string> kAllWords{
    "sample", "poffset", "ppulse",  "pldrive", "ore",     "disable", "enable", "Sample", "poffse", "poffsets",
    "OFF",    "",        " sample", "disabl",  "enabled", "near",    "far",    "-1",     "0",      "500"};

using Table = std::map<std::pair<OffsetTask, std::string>, OffsetTask>;

Table transitions(std::span<const OffsetWord> words) {
  Table table;
  for (const OffsetTask task : kAllTasks) {
    for (const std::string& word : kAllWords) {
      if (const auto next = taskAfter(words, task, word.c_str())) table[{task, word}] = *next;
    }
  }
  return table;
}

TEST(OffsetWords, LeadOnlyFromTheseTasksToThose) {
  EXPECT_EQ(transitions(kOffsetWords), (Table{
                                           {{OffsetTask::kNone, "sample"}, OffsetTask::kSample},
                                           {{OffsetTask::kNone, "poffset"}, OffsetTask::kPoffset},
                                           {{OffsetTask::kPoffset, "disable"}, OffsetTask::kPoffsetDisable},
                                           {{OffsetTask::kPoffset, "enable"}, OffsetTask::kPoffsetEnable},
                                       }));
}

TEST(OffsetWords, UnderTheDisplayThereAreMore) {
  EXPECT_EQ(transitions(kUnderDisplayWords), (Table{
                                                 {{OffsetTask::kNone, "ppulse"}, OffsetTask::kPulseNumber},
                                                 {{OffsetTask::kNone, "pldrive"}, OffsetTask::kPulseCurrent},
                                                 {{OffsetTask::kNone, "ore"}, OffsetTask::kOre},
                                                 {{OffsetTask::kOre, "disable"}, OffsetTask::kOreDisable},
                                                 {{OffsetTask::kOre, "enable"}, OffsetTask::kOreEnable},
                                             }));
}

TEST(OffsetWords, NoWordMeansSamplingAndASwitchAloneDisables) {
  for (const OffsetTask task : kAllTasks) {
    const OffsetTask inTheEnd = taskWithoutMoreWords(task);
    if (task == OffsetTask::kNone) {
      EXPECT_EQ(inTheEnd, OffsetTask::kSample);
    } else if (task == OffsetTask::kPoffset) {
      EXPECT_EQ(inTheEnd, OffsetTask::kPoffsetDisable);
    } else if (task == OffsetTask::kOre) {
      EXPECT_EQ(inTheEnd, OffsetTask::kOreDisable);
    } else {
      EXPECT_EQ(inTheEnd, task);
    }
    EXPECT_EQ(isChosen(task), inTheEnd == task);
  }
}

}  // namespace
