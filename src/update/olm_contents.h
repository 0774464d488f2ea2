#pragma once

#include <sys/types.h>

#include <map>
#include <string>

struct update_entry {
  enum class kind { directory, file, hard_link, symbolic_link };
  kind type = kind::directory;
  std::string target{};  // of a link; a hard link's is the name of an entry
  off_t begin = 0;       // where a file's data stand in the archive
  off_t size = 0;
};

// What is in an update: entries by their names, such as zoneinfo/Asia/Tokyo. They come from
// outside, and only what can do no harm gets in: each in a directory that is itself an entry, and
// no link that leads elsewhere. What is refused is told by an olm_refusal. Prints nothing.
class olm_contents {
 public:
  // Takes in the entry `name`. Throws olm_refusal where it has no place in an update, or there are
  // too many entries.
  void add(const std::string& name, const update_entry& entry);

  // Throws olm_refusal where there are no zone files, or a link leads to no entry.
  void require_whole() const;

  [[nodiscard]] const std::map<std::string, update_entry>& get_entries() const { return entries_; }

 private:
  [[nodiscard]] bool has(const std::string& name, update_entry::kind type) const;
  [[nodiscard]] bool leads_within(std::string name) const;

  std::map<std::string, update_entry> entries_;
};
