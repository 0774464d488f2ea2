#pragma once

#include <sys/stat.h>

#include <cerrno>
#include <map>
#include <string>
#include <vector>

// What stands before the last slash in `path`.
[[nodiscard]] std::string get_parent(const std::string& path);

// What stands at a path.
struct olm_entry {
  int error = ENOENT;    // 0, or the errno with which the system fails to find it
  std::string place{};   // its path without a link on the way, "" for "/"; empty if there is no way
  std::string target{};  // what it holds, if it is a link
  struct statx status {};
  bool is_new = false;  // it was made in the trial

  [[nodiscard]] bool is(mode_t type) const {
    return error == 0 && (status.stx_mode & S_IFMT) == type;
  }
  // The last name in `place`.
  [[nodiscard]] std::string get_name() const { return place.substr(place.rfind('/') + 1); }

  // Whether both are of one kind, and hold the same if they are links.
  [[nodiscard]] bool equals(const olm_entry& other) const;
};

// A link that a trial finds at `path` whatever stands there; with an empty target, none.
struct supposed_link {
  std::string path;
  std::string target;
};
using suppositions = std::vector<supposed_link>;

// What a trial has met.
struct trial_record {
  std::vector<std::string> warnings;   // without the program's name and the text of errno
  std::vector<std::string> obstacles;  // what the device or a boot's rights did not allow
  std::vector<std::string> written;    // the paths of the files that were to be written
  std::string endless;                 // the file at which a start would wait or run out of memory
};

// A boot, or a part of one, that changes nothing. While a trial exists, the functions of
// fs/device.h look at the device with the rights of a boot, whoever runs the program: those of root
// without capabilities, and confined if the kernel can do that. What they are to change, the trial
// remembers, and sees from then on. All of it is forgotten with the trial.
//
// Two things end a trial early: a file at which a start would wait or run out of memory, and one
// that the user of the program may not look at although a boot may. Then std::runtime_error is
// thrown, with that as its text. As a start goes on after whatever is thrown, each further use of
// fs/device.h throws it again, so that nothing counts that comes later.
//
// There is one trial at a time. Nothing here prints. What may look at the device throws as told
// above, and in no other way but for want of memory.
class olm_trial {
 public:
  explicit olm_trial(const suppositions& supposed = {});
  olm_trial(const olm_trial&) = delete;
  olm_trial& operator=(const olm_trial&) = delete;
  ~olm_trial();

  // What stands at `path` by now; with `follows`, what a link there leads to.
  [[nodiscard]] olm_entry find(const std::string& path, bool follows = false);

  // The entries of `directory`, which may be a link, in its own order; none if it is missing or
  // closed to a boot.
  [[nodiscard]] std::vector<olm_entry> list(const std::string& directory);

  // Throws if the user of this program may not look at what the outcome depends on.
  void require_told() const;

  // From now on, goes by the rights of this program's user instead of a boot's, or back. The user
  // may go on asking what stands on the device after the trial's end.
  void go_by_rights_of_user(bool is_for_user) { is_for_user_ = is_for_user; }

  [[nodiscard]] const trial_record& get_record() const { return record_; }

  // What fs/device.h asks for; for its second implementation alone. An int is 0 or an errno.
  [[nodiscard]] static olm_trial& get();
  [[nodiscard]] int unlink(const std::string& path);
  [[nodiscard]] int remove(const std::string& path);
  [[nodiscard]] int symlink(const std::string& target, const std::string& path);
  [[nodiscard]] int rename(const std::string& path, const std::string& new_path);
  [[nodiscard]] int write(const std::string& path, bool reads_too);
  [[nodiscard]] std::string read_first_word(const std::string& path);
  void warn(const std::string& message) { record_.warnings.push_back(message); }

 private:
  // What a boot may do with an entry, as the bits of a mode.
  enum right : unsigned { search = 1, change = 2, look_into = 4 };

  [[nodiscard]] olm_entry look_up(const std::string& place);
  [[nodiscard]] olm_entry look_up_in(const olm_entry& directory, const std::string& name);
  [[nodiscard]] olm_entry look_up_directory(const olm_entry& entry);
  [[nodiscard]] bool may(const olm_entry& entry, unsigned rights);
  void confine();
  void suppose(const supposed_link& link);
  [[nodiscard]] bool is_allowed(const std::string& place, bool writes) const;
  [[nodiscard]] int refuse_writing(const olm_entry& entry);
  [[nodiscard]] int refuse_making(const olm_entry& entry);
  [[nodiscard]] int refuse_removing(const olm_entry& entry);
  [[nodiscard]] std::string read_word_in(const std::string& place);
  void note(const std::string& obstacle);
  void put(const std::string& place, mode_t type, const std::string& target);
  [[noreturn]] void leave_untold(const std::string& why);
  [[noreturn]] void end_at(const std::string& place);

  [[nodiscard]] static olm_trial*& get_current();

  trial_record record_;
  std::map<std::string, olm_entry> changes_;  // by their places
  std::map<std::string, bool> allowed_;       // places to read below, and whether to write
  bool is_confined_ = false;
  std::string untold_;
  bool is_for_user_ = false;
};
