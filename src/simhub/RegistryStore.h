// The hub's registry: groups of items, kept in files, each group one file named after it. A subgroup S of the
// group G is the group G.S, with a file of its own.
//
// The store keeps what it has read when it was loaded. A group without a file has its built-in default. A
// group whose file cannot be used can be neither read nor written, so that what is in it is not destroyed.
//
// A write merges: a written item replaces the item of that name, in a subgroup too; the others stay. It is
// one durable step, also over several files:
//   1. every new file is written beside the old one, as ".NAME.new", and synced
//   2. more than one: ".journal" with their names and hashes is written, synced and renamed into place, and
//   the
//      folder synced; this commits the write
//   3. the new files are renamed over the old ones (a single one: this commits), the folder is synced, the
//   journal
//      removed
// Each write, and each loading, is alone with the folder: another hub on the same one waits.
// Loading completes what a journal lists and drops new files that none lists, and a journal whose files are
// not all there: it was not committed.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "proto/sns_registry.pb.h"
#include "simhub/Diagnostics.h"
#include "simhub/RegistryFiles.h"

namespace simhub {

class RegistryStore {
 public:
  using Defaults = std::map<std::string, sns_registry_data>;  ///< by group, subgroups nested

  /// `files` outlives the store. Nothing is read before Load.
  RegistryStore(RegistryFiles& files, Defaults defaults, Diagnostics diagnostics);

  /// Forgets everything and reads all files. The file of a group in `torn` is taken as if cut in half; "*" is
  /// every group.
  void Load(const std::vector<std::string>& torn = {});

  enum class Result { kOk, kMissing, kInvalid };
  /// The group's items with its subgroups filled in. kInvalid also when a subgroup's file is.
  [[nodiscard]] Result Read(const std::string& group, sns_registry_data* items) const;

  /// False, with a diagnostic and nothing changed, when the write is not durable: a disk error, a group whose
  /// file cannot be used, a name that cannot be a file's, subgroups nested too deeply.
  [[nodiscard]] bool Write(const std::string& group, const sns_registry_data& items);

 private:
  struct Group {
    sns_registry_data items;  ///< subgroups empty
    std::string fault;        ///< why its file cannot be used; empty: it can, or there is none
  };
  using Groups = std::map<std::string, Group>;

  void addDefaults(const std::string& group, const sns_registry_data& items, int depth);
  void loadFile(const std::string& name, const std::vector<std::string>& torn);
  [[nodiscard]] Result read(const std::string& group, int depth, sns_registry_data* items) const;
  [[nodiscard]] bool merge(const std::string& group, const sns_registry_data& items, int depth,
                           Groups* changed, std::string* error) const;
  [[nodiscard]] bool store(const Groups& changed, std::string* error);
  /// Completes or drops what an earlier hub has left behind.
  void cleanUp();
  /// Drops what a failed write has left.
  void undo(const std::map<std::string, std::string>& contents);
  /// Completes the write that the journal stands for, if there is one.
  [[nodiscard]] bool finishJournal(std::string* error);
  [[nodiscard]] bool holds(const std::string& file, const std::string& hash) const;

  RegistryFiles& files_;
  const Defaults defaults_;
  const Diagnostics diagnostics_;
  Groups groups_;
  std::string fault_;  ///< why the folder cannot be read, and with it no group; empty: it can
};

}  // namespace simhub
