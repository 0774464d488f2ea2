#include "update/archive.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <numeric>
#include <span>
#include <string_view>

#include "fs/olm_descriptor.h"
#include "update/failure.h"
#include "update/steps.h"

namespace {

using std::string;
using kind = update_entry::kind;

constexpr off_t block_size = 512;
constexpr off_t most_bytes = off_t{64} << 20U;

// Where a header has its fields.
struct field {
  std::size_t begin;
  std::size_t size;
};
constexpr field name_field = {0, 100};
constexpr field size_field = {124, 12};
constexpr field sum_field = {148, 8};
constexpr field type_field = {156, 1};
constexpr field target_field = {157, 100};
constexpr field magic_field = {257, 8};
constexpr field prefix_field = {345, 155};

[[noreturn]] void refuse(const string& reason) { throw olm_refusal({"the archive " + reason}); }

// Reads at `offset` until `data` is full.
void read_fully(int archive, off_t offset, std::span<char> data) {
  while (!data.empty()) {
    const ssize_t length = pread(archive, data.data(), data.size(), offset);
    if (length < 0) fail("the archive");
    if (length == 0) refuse("is cut off");
    data = data.subspan(static_cast<std::size_t>(length));
    offset += length;
  }
}

class olm_header {
 public:
  olm_header(int archive, off_t offset) { read_fully(archive, offset, block_); }

  [[nodiscard]] bool is_empty() const {
    return std::all_of(block_.begin(), block_.end(), [](char byte) { return byte == 0; });
  }

  // Throws olm_refusal where this is no sound header of an entry that an update may have.
  [[nodiscard]] string get_name() const {
    const string_view magic = get_bytes(magic_field);
    const bool is_posix = magic == string_view("ustar\00000", magic_field.size);
    if (!is_posix && magic != string_view("ustar  \0", magic_field.size))
      refuse("is no ustar archive, or compressed");
    if (get_number(sum_field) != get_sum()) refuse("has a damaged header");
    const string name = get_text(name_field);
    const string prefix = is_posix ? get_text(prefix_field) : "";
    return prefix.empty() ? name : prefix + '/' + name;
  }

  [[nodiscard]] char get_type() const { return get_bytes(type_field).front(); }
  [[nodiscard]] string get_target() const { return get_text(target_field); }
  [[nodiscard]] off_t get_size() const { return get_number(size_field); }

 private:
  using string_view = std::string_view;

  [[nodiscard]] string_view get_bytes(const field& which) const {
    return string_view(block_.data(), block_.size()).substr(which.begin, which.size);
  }

  [[nodiscard]] string get_text(const field& which) const {
    const string_view bytes = get_bytes(which);
    return string(bytes.substr(0, bytes.find('\0')));
  }

  [[nodiscard]] off_t get_number(const field& which) const {
    string text = get_text(which);
    text.erase(0, text.find_first_not_of(' '));
    text.erase(std::min(text.find(' '), text.size()));
    constexpr int octal = 8;
    off_t number = 0;
    const char* const end = std::to_address(text.end());
    const auto [rest, error] = std::from_chars(text.data(), end, number, octal);
    if (error != std::errc() || rest != end || number < 0) refuse("has a header with a bad number");
    return number;
  }

  // Of all bytes, where those of the sum itself count as spaces.
  [[nodiscard]] off_t get_sum() const {
    const auto add = [](off_t sum, char byte) { return sum + static_cast<unsigned char>(byte); };
    const string_view own = get_bytes(sum_field);
    const off_t all = std::accumulate(block_.begin(), block_.end(), off_t{0}, add);
    return all - std::accumulate(own.begin(), own.end(), off_t{0}, add) +
           static_cast<off_t>(own.size()) * ' ';
  }

  std::array<char, block_size> block_{};
};

// Gives the size of the entry's data.
off_t add_entry(const olm_header& header, off_t data, olm_contents& contents) {
  string name = header.get_name();
  update_entry entry;
  const off_t size = header.get_size();
  switch (header.get_type()) {
    case '0':
    case '\0':
      entry = {.type = kind::file, .begin = data, .size = size};
      break;
    case '1':
      entry = {.type = kind::hard_link, .target = header.get_target()};
      break;
    case '2':
      entry = {.type = kind::symbolic_link, .target = header.get_target()};
      break;
    case '5':
      if (name.ends_with('/')) name.pop_back();
      break;
    default:
      throw olm_refusal({name + " has the type " + header.get_type() +
                         " in the archive: it is no plain file, directory or link of ustar"});
  }
  if (entry.type != kind::file && size != 0) refuse("has data for what is no file: " + name);
  const string top = name.substr(0, name.find('/'));
  if (top != "zoneinfo" && top != "icutz") refuse("has more than zoneinfo and icutz: " + name);
  contents.add(name, entry);
  return size;
}

void unpack_file(int archive, const update_entry& entry, const olm_directory& directory,
                 const string& name) {
  constexpr std::size_t most_at_once = std::size_t{64} << 10U;
  const string path = directory.path + '/' + name;
  olm_descriptor file = open_entry(directory, name, O_WRONLY | O_CREAT | O_EXCL);
  std::array<char, most_at_once> buffer{};
  for (off_t done = 0; done < entry.size;) {
    const auto left = static_cast<std::size_t>(entry.size - done);
    const auto part = std::span(buffer).first(std::min(left, buffer.size()));
    read_fully(archive, entry.begin + done, part);
    const ssize_t written = write(file.get(), part.data(), part.size());
    if (written < 0) fail(path);
    done += written;
  }
  if (file.close() != 0) fail(path);
}

void unpack_entry(int archive, const update_entry& entry, const olm_directory& top,
                  const string& path) {
  constexpr mode_t open_to_all = 0755;
  const olm_directory directory = open_steps(top, get_directory(path));
  const int opened = directory.opened.get();
  const string name = get_name(path);
  const string& target = entry.target;
  bool is_made = true;
  switch (entry.type) {
    case kind::directory:
      is_made = mkdirat(opened, name.c_str(), open_to_all) == 0;
      break;
    case kind::file:
      unpack_file(archive, entry, directory, name);
      break;
    case kind::hard_link: {
      const olm_directory other = open_steps(top, get_directory(target));
      is_made = linkat(other.opened.get(), get_name(target).c_str(), opened, name.c_str(), 0) == 0;
      break;
    }
    case kind::symbolic_link:
      is_made = symlinkat(target.c_str(), opened, name.c_str()) == 0;
  }
  if (!is_made) fail(directory.path + '/' + name);
}

}  // namespace

olm_contents read_archive(int archive) {
  struct stat status {};
  if (fstat(archive, &status) != 0) fail("the archive");
  if (status.st_size > most_bytes)
    refuse("is longer than " + std::to_string(most_bytes) + " bytes");
  olm_contents contents;
  off_t offset = 0;
  const auto read_header = [&] {
    const olm_header header(archive, offset);
    offset += block_size;
    return header;
  };
  for (olm_header header = read_header(); !header.is_empty(); header = read_header()) {
    const off_t size = add_entry(header, offset, contents);
    offset += (size + block_size - 1) / block_size * block_size;
  }
  // Two empty blocks end it; what fills it up then is empty, too.
  do {
    if (!read_header().is_empty()) refuse("goes on after its end");
  } while (offset < status.st_size);
  contents.require_whole();
  return contents;
}

void unpack(int archive, const olm_contents& contents, const olm_directory& directory) {
  // Names are in order, so that a directory stands before what is in it. What links lead to comes
  // before them, and nothing is written any more when there are symbolic ones.
  for (const kind type : {kind::directory, kind::file, kind::hard_link, kind::symbolic_link}) {
    for (const auto& [name, entry] : contents.get_entries())
      if (entry.type == type) unpack_entry(archive, entry, directory, name);
  }
}
