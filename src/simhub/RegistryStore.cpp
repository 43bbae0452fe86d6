#include "simhub/RegistryStore.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "simhub/RegistryJson.h"
#include "simhub/Suid.h"

namespace simhub {
namespace {

using Item = sns_registry_data_item;

constexpr int kMaxDepth = 16;               // of subgroups
constexpr std::size_t kMaxNameBytes = 240;  // with what is put around it, still a file name
constexpr const char* kJournal = ".journal";
constexpr const char* kNewJournal = ".journal.new";
constexpr const char* kJournalMark = "registry write\n";

std::string newName(const std::string& name) { return "." + name + ".new"; }

bool canBeFileName(const std::string& name) {
  return !name.empty() && name.size() <= kMaxNameBytes && name.front() != '.' &&
         name.find('/') == std::string::npos && name.find('\0') == std::string::npos;
}

/// A subgroup's name becomes part of its file's; a dot in it would make it another group's.
bool canBeSubgroup(const std::string& name) { return !name.empty() && name.find('.') == std::string::npos; }

std::string describe(int error) { return std::strerror(error); }

/// The journal: a mark, the names of the files, one a line, and a checksum of it all. Names hold any byte but
/// '/' and zero, so they are ended by zero bytes.
std::string formatJournal(const std::vector<std::string>& names) {
  std::string text = kJournalMark;
  for (const std::string& name : names) text += name + '\0';
  return text + std::to_string(hashText(text)) + "\n";
}

bool parseJournal(const std::string& text, std::vector<std::string>* names) {
  const std::size_t mark = std::strlen(kJournalMark);
  if (text.rfind(kJournalMark, 0) != 0) return false;
  std::size_t position = mark;
  for (std::size_t end = text.find('\0', position); end != std::string::npos;
       end = text.find('\0', position)) {
    names->push_back(text.substr(position, end - position));
    position = end + 1;
    if (!canBeFileName(names->back())) return false;
  }
  return text.substr(position) == std::to_string(hashText(text.substr(0, position))) + "\n";
}

Item* findItem(sns_registry_data* items, const std::string& name) {
  for (Item& item : *items->mutable_items()) {
    if (item.name() == name) return &item;
  }
  return nullptr;
}

/// An item as the group's own file has it: a subgroup without its items.
void copyFlat(const Item& from, Item* to) {
  if (from.data_case() != Item::kSubgrp) {
    *to = from;
    return;
  }
  to->Clear();
  to->set_name(from.name());
  if (from.has_version()) to->set_version(from.version());
  to->mutable_subgrp();
}

}  // namespace

RegistryStore::RegistryStore(RegistryFiles& files, Defaults defaults, Diagnostics diagnostics)
    : files_(files), defaults_(std::move(defaults)), diagnostics_(std::move(diagnostics)) {}

void RegistryStore::Load(const std::vector<std::string>& torn) {
  groups_.clear();
  if (const int error = files_.CreateFolder(); error != 0) {
    diagnostics_("registry folder " + files_.Path("") + ": " + describe(error));
  }
  std::string error;
  if (!finishJournal(&error)) diagnostics_("registry journal: " + error);
  std::vector<std::string> leftOver;
  for (const std::string& name : files_.List()) {
    if (name.front() != '.') loadFile(name, torn);
    if (name.front() == '.' && name.size() > 5 && name.ends_with(".new")) leftOver.push_back(name);
  }
  // Where the journal could not be finished now, its files are still needed.
  for (const std::string& name : leftOver) {
    if (error.empty()) (void)files_.Remove(name);
  }
  for (const auto& [group, items] : defaults_) addDefaults(group, items, 0);
}

void RegistryStore::addDefaults(const std::string& group, const sns_registry_data& items, int depth) {
  if (depth > kMaxDepth) return;
  const auto [entry, isNew] = groups_.try_emplace(group);
  for (const Item& item : items.items()) {
    if (isNew) copyFlat(item, entry->second.items.add_items());
    if (item.data_case() == Item::kSubgrp) addDefaults(group + "." + item.name(), item.subgrp(), depth + 1);
  }
}

void RegistryStore::loadFile(const std::string& name, const std::vector<std::string>& torn) {
  Group& group = groups_[name];
  std::string text;
  if (const int error = files_.Read(name, kMaxRegistryFileBytes, &text); error != 0) {
    group.fault = describe(error);
  } else {
    const bool isTorn = std::any_of(torn.begin(), torn.end(), [&](const std::string& pattern) {
      return pattern == "*" || pattern == name;
    });
    if (isTorn) text.resize(text.size() / 2);
    (void)parseRegistryGroup(text, &group.items, &group.fault);
  }
  if (!group.fault.empty()) {
    group.items.Clear();
    diagnostics_("registry file " + files_.Path(name) + " cannot be used: " + group.fault);
  }
}

RegistryStore::Result RegistryStore::Read(const std::string& group, sns_registry_data* items) const {
  items->Clear();
  return read(group, 0, items);
}

RegistryStore::Result RegistryStore::read(const std::string& group, int depth,
                                          sns_registry_data* items) const {
  const auto entry = groups_.find(group);
  if (entry == groups_.end()) return Result::kMissing;
  if (!entry->second.fault.empty() || depth > kMaxDepth) return Result::kInvalid;
  *items = entry->second.items;
  for (Item& item : *items->mutable_items()) {
    if (item.data_case() != Item::kSubgrp) continue;
    // A subgroup without a file or default has no items.
    if (read(group + "." + item.name(), depth + 1, item.mutable_subgrp()) == Result::kInvalid) {
      return Result::kInvalid;
    }
  }
  return Result::kOk;
}

bool RegistryStore::Write(const std::string& group, const sns_registry_data& items) {
  Groups changed;
  std::string error;
  if (!merge(group, items, 0, &changed, &error) || !store(changed, &error)) {
    diagnostics_("registry group \"" + group + "\" is not written: " + error);
    return false;
  }
  for (auto& [name, content] : changed) groups_[name] = std::move(content);
  return true;
}

bool RegistryStore::merge(const std::string& group, const sns_registry_data& items, int depth,
                          Groups* changed, std::string* error) const {
  if (!canBeFileName(group)) {
    *error = "\"" + group + "\" cannot be a file's name";
    return false;
  }
  if (depth > kMaxDepth) {
    *error = "subgroups nested too deeply";
    return false;
  }
  const auto stored = groups_.find(group);
  if (stored != groups_.end() && !stored->second.fault.empty()) {
    *error = "its file cannot be used: " + stored->second.fault;
    return false;
  }
  if (changed->find(group) == changed->end() && stored != groups_.end()) (*changed)[group] = stored->second;
  Group& merged = (*changed)[group];
  for (const Item& item : items.items()) {
    Item* target = findItem(&merged.items, item.name());
    if (target == nullptr) target = merged.items.add_items();
    copyFlat(item, target);
    if (item.data_case() != Item::kSubgrp) continue;
    if (!canBeSubgroup(item.name())) {
      *error = "\"" + item.name() + "\" cannot be a subgroup's name";
      return false;
    }
    if (!merge(group + "." + item.name(), item.subgrp(), depth + 1, changed, error)) return false;
  }
  return true;
}

bool RegistryStore::store(const Groups& changed, std::string* error) {
  if (!finishJournal(error)) return false;  // an earlier write, committed but not completed
  std::vector<std::string> names;
  int failure = 0;
  for (const auto& [name, group] : changed) {
    const std::string text = formatRegistryGroup(group.items);
    names.push_back(name);
    failure = text.size() > kMaxRegistryFileBytes ? EFBIG : files_.Write(newName(name), text);
    if (failure != 0) break;
  }
  const bool journaled = names.size() > 1;
  if (failure == 0) failure = journaled ? commitJournal(names) : files_.Rename(newName(names[0]), names[0]);
  if (failure == 0 && !journaled) failure = files_.SyncFolder();
  if (failure != 0) {
    *error = describe(failure);
    dropNewFiles(names);
    return false;
  }
  std::string later;
  if (journaled && !finishJournal(&later)) diagnostics_("registry journal, to be completed later: " + later);
  return true;
}

int RegistryStore::commitJournal(const std::vector<std::string>& names) {
  int failure = files_.Write(kNewJournal, formatJournal(names));
  if (failure == 0) failure = files_.SyncFolder();  // what the journal names is there before the journal is
  if (failure == 0) failure = files_.Rename(kNewJournal, kJournal);
  if (failure == 0) failure = files_.SyncFolder();
  return failure;
}

bool RegistryStore::finishJournal(std::string* error) {
  std::string text;
  const int failure = files_.Read(kJournal, kMaxRegistryFileBytes, &text);
  if (failure == ENOENT) return true;
  if (failure != 0) {
    *error = describe(failure);
    return false;
  }
  std::vector<std::string> names;
  if (!parseJournal(text, &names)) {
    // It came into place whole or not at all, so this is none of the store's; nothing in it can be trusted.
    diagnostics_("registry journal " + files_.Path(kJournal) + " makes no sense and is dropped");
    names.clear();
  }
  for (const std::string& name : names) {
    const int renamed = files_.Rename(newName(name), name);
    if (renamed != 0 && renamed != ENOENT) {  // ENOENT: renamed before the crash
      *error = describe(renamed);
      return false;
    }
  }
  int finished = files_.SyncFolder();
  if (finished == 0) finished = files_.Remove(kJournal);
  if (finished == 0) finished = files_.SyncFolder();
  if (finished != 0) *error = describe(finished);
  return finished == 0;
}

void RegistryStore::dropNewFiles(const std::vector<std::string>& names) {
  // While a journal may still stand, a start would complete the write from whatever new files it finds: then
  // all of them stay.
  if (files_.Remove(kJournal) != 0 || files_.SyncFolder() != 0) return;
  for (const std::string& name : names) (void)files_.Remove(newName(name));
  (void)files_.Remove(kNewJournal);
}

}  // namespace simhub
