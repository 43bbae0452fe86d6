#pragma once

#include <initializer_list>
#include <string>
#include <vector>

/// An argument vector that a program or command may be given: owns its words.
class ArgumentWords {
 public:
  ArgumentWords(std::initializer_list<const char*> words) : words_(words.begin(), words.end()) {
    for (std::string& word : words_) pointers_.push_back(word.data());
    pointers_.push_back(nullptr);
  }
  ArgumentWords(const ArgumentWords&) = delete;
  ArgumentWords& operator=(const ArgumentWords&) = delete;

  [[nodiscard]] int argc() const { return static_cast<int>(words_.size()); }
  [[nodiscard]] char** argv() { return pointers_.data(); }

 private:
  std::vector<std::string> words_;
  std::vector<char*> pointers_;
};
