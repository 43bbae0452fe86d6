// The words of the offset variants of "prox": which of them may follow which, and what they ask for.
#pragma once

#include <optional>
#include <span>

/// What the command is to do, as far as the words read so far tell.
enum class OffsetTask {
  kNone,
  kSample,
  kPoffset,  ///< which way is yet to be said
  kPoffsetDisable,
  kPoffsetEnable,
  kPulseNumber,
  kPulseCurrent,
  kOre,  ///< which way is yet to be said
  kOreDisable,
  kOreEnable,
};

struct OffsetWord {
  OffsetTask before;
  const char* word;
  OffsetTask after;
};

/// What every sensor with an offset can be asked for.
inline constexpr OffsetWord kOffsetWords[] = {
    {OffsetTask::kNone, "sample", OffsetTask::kSample},
    {OffsetTask::kNone, "poffset", OffsetTask::kPoffset},
    {OffsetTask::kPoffset, "disable", OffsetTask::kPoffsetDisable},
    {OffsetTask::kPoffset, "enable", OffsetTask::kPoffsetEnable},
};

/// What a sensor under the display can be asked for besides.
inline constexpr OffsetWord kUnderDisplayWords[] = {
    {OffsetTask::kNone, "ppulse", OffsetTask::kPulseNumber},
    {OffsetTask::kNone, "pldrive", OffsetTask::kPulseCurrent},
    {OffsetTask::kNone, "ore", OffsetTask::kOre},
    {OffsetTask::kOre, "disable", OffsetTask::kOreDisable},
    {OffsetTask::kOre, "enable", OffsetTask::kOreEnable},
};

/// The task after one more word; nothing when the word does not fit. Words have to match to the letter.
[[nodiscard]] std::optional<OffsetTask> taskAfter(std::span<const OffsetWord> words, OffsetTask task,
                                                  const char* word);

/// Whether the task takes no more words that choose it.
[[nodiscard]] bool isChosen(OffsetTask task);

/// What is done when the words end here: no word means sampling, and whatever can be switched is disabled.
[[nodiscard]] OffsetTask taskWithoutMoreWords(OffsetTask task);
