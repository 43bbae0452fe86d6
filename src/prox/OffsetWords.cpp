#include "prox/OffsetWords.h"

#include <algorithm>
#include <cstring>

std::optional<OffsetTask> taskAfter(std::span<const OffsetWord> words, OffsetTask task, const char* word) {
  const auto found = std::find_if(words.begin(), words.end(), [&](const OffsetWord& row) {
    return row.before == task && std::strcmp(row.word, word) == 0;
  });
  return found == words.end() ? std::nullopt : std::optional(found->after);
}

bool isChosen(OffsetTask task) { return taskWithoutMoreWords(task) == task; }

OffsetTask taskWithoutMoreWords(OffsetTask task) {
  switch (task) {
    case OffsetTask::kNone:
      return OffsetTask::kSample;
    case OffsetTask::kPoffset:
      return OffsetTask::kPoffsetDisable;
    case OffsetTask::kOre:
      return OffsetTask::kOreDisable;
    default:
      return task;
  }
}
