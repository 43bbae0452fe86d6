#include "simhub/RegistryStore.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "simhub/Descriptor.h"
#include "simhub/RegistryJson.h"
#include "simhub/Suid.h"

namespace simhub {
namespace {

using Item = sns_registry_data_item;

constexpr int kMaxDepth = 16;               // of subgroups
constexpr std::size_t kMaxNameBytes = 240;  // with what is put around it, still a file name
constexpr std::size_t kMaxJournalBytes = std::size_t{8} << 20;
constexpr const char* kJournal = ".journal";
constexpr const char* kNewJournal = ".journal.new";
constexpr const char* kJournalMark = "registry write\n";
constexpr const char* kOtherHub = "another hub keeps it to itself";

std::string newName(const std::string& name) { return "." + name + ".new"; }

bool canBeFileName(const std::string& name) {
  return !name.empty() && name.size() <= kMaxNameBytes && name.front() != '.' &&
         name.find('/') == std::string::npos && name.find('\0') == std::string::npos;
}

/// A subgroup's name becomes part of its file's; a dot in it would make it another group's.
bool canBeSubgroup(const std::string& name) { return !name.empty() && name.find('.') == std::string::npos; }

std::string describe(int error) { return std::strerror(error); }

/// The journal: a mark, each file's name and the hash of its new content, and a hash of it all. Names hold
/// any byte but '/' and zero.
std::string formatJournal(const std::map<std::string, std::string>& contents) {
  std::string text = kJournalMark;
  for (const auto& [name, content] : contents) text += name + '\0' + std::to_string(hashText(content)) + '\n';
  return text + std::to_string(hashText(text)) + '\n';
}

/// Names and hashes, hashes as they are written.
bool parseJournal(const std::string& text, std::map<std::string, std::string>* hashes) {
  if (text.rfind(kJournalMark, 0) != 0) return false;
  std::size_t position = std::strlen(kJournalMark);
  for (std::size_t zero = text.find('\0'); zero != std::string::npos; zero = text.find('\0', position)) {
    const std::string name = text.substr(position, zero - position);
    const std::size_t end = text.find('\n', zero);
    if (!canBeFileName(name) || end == std::string::npos) return false;
    (*hashes)[name] = text.substr(zero + 1, end - zero - 1);
    position = end + 1;
  }
  return text.substr(position) == std::to_string(hashText(text.substr(0, position))) + '\n';
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
  Descriptor turn;
  // What another hub has under way is not to be completed or dropped here.
  if (files_.Lock(&turn) == EWOULDBLOCK) {
    diagnostics_("registry folder " + files_.Path("") + ": " + kOtherHub);
  } else {
    cleanUp();
  }
  std::vector<std::string> names;
  const int failure = files_.List(&names);
  fault_ = failure != 0 ? "the folder cannot be read: " + describe(failure) : "";
  if (!fault_.empty()) diagnostics_("registry folder " + files_.Path("") + ": " + fault_);
  for (const std::string& name : names) {
    if (name.front() != '.') loadFile(name, torn);
  }
  for (const auto& [group, items] : defaults_) addDefaults(group, items, 0);
}

void RegistryStore::cleanUp() {
  std::string error;
  if (!finishJournal(&error)) diagnostics_("registry journal: " + error);
  std::vector<std::string> names;
  // Where the journal could not be finished now, its files are still needed.
  if (!error.empty() || files_.List(&names) != 0) return;
  for (const std::string& name : names) {
    if (name.front() == '.' && name.size() > 5 && name.ends_with(".new")) (void)files_.Remove(name);
  }
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
  if (!fault_.empty()) return Result::kInvalid;
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
  if (!fault_.empty()) {
    *error = fault_;
    return false;
  }
  Descriptor turn;
  if (const int busy = files_.Lock(&turn); busy != 0) {
    *error = busy == EWOULDBLOCK ? kOtherHub : describe(busy);
    return false;
  }
  if (!finishJournal(error)) return false;  // an earlier write, committed but not completed
  std::map<std::string, std::string> contents;
  for (const auto& [name, group] : changed) contents[name] = formatRegistryGroup(group.items);
  const bool isJournaled = contents.size() > 1;
  int failure = 0;
  for (const auto& [name, content] : contents) {
    if (failure == 0)
      failure = content.size() > kMaxRegistryFileBytes ? EFBIG : files_.Write(newName(name), content);
  }
  if (failure == 0 && isJournaled) failure = files_.Write(kNewJournal, formatJournal(contents));
  if (failure == 0) {
    const std::string& only = contents.begin()->first;
    failure = isJournaled ? files_.Rename(kNewJournal, kJournal) : files_.Rename(newName(only), only);
  }
  if (failure == 0) failure = files_.SyncFolder();
  if (failure != 0) {
    *error = describe(failure);
    undo(contents);
    return false;
  }
  std::string later;
  if (isJournaled && !finishJournal(&later))
    diagnostics_("registry journal, to be completed later: " + later);
  return true;
}

void RegistryStore::undo(const std::map<std::string, std::string>& contents) {
  // While a journal may still stand, a start would complete the write: then all of its files stay.
  if (files_.Remove(kJournal) != 0 || files_.SyncFolder() != 0) return;
  for (const auto& [name, content] : contents) (void)files_.Remove(newName(name));
  (void)files_.Remove(kNewJournal);
}

bool RegistryStore::holds(const std::string& file, const std::string& hash) const {
  std::string content;
  return files_.Read(file, kMaxRegistryFileBytes, &content) == 0 && std::to_string(hashText(content)) == hash;
}

bool RegistryStore::finishJournal(std::string* error) {
  std::string text;
  int failure = files_.Read(kJournal, kMaxJournalBytes, &text);
  if (failure == ENOENT) return true;
  std::map<std::string, std::string> hashes;
  bool isCommitted = failure == 0 && parseJournal(text, &hashes);
  std::vector<std::string> pending;
  for (const auto& [name, hash] : hashes) {
    if (holds(newName(name), hash)) {
      pending.push_back(name);
    } else if (!holds(name, hash)) {
      // The crash came before the folder was synced: nothing is renamed yet, and the write has not happened.
      isCommitted = false;
    }
  }
  if (!isCommitted) pending.clear();
  for (const std::string& name : pending) {
    if (failure == 0) failure = files_.Rename(newName(name), name);
  }
  if (failure == 0) failure = files_.SyncFolder();
  // Should the journal come back after a crash, it finds everything done.
  if (failure == 0) failure = files_.Remove(kJournal);
  if (failure != 0) *error = describe(failure);
  return failure == 0;
}

}  // namespace simhub
