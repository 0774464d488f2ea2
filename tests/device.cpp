#include "device.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/mount.h>
#include <sys/wait.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string_view>
#include <system_error>

namespace {

namespace files = std::filesystem;

constexpr std::array roots = {"/var/db", "/usr/share"};

// What stands at a path, if no file.
constexpr std::string_view arrow = "-> ";
constexpr const char* directory = "(directory)";
constexpr const char* nothing = "(nothing)";

constexpr const char* boot_program = "/tzdata-boot";

constexpr std::uintmax_t large = 3ULL << 30U;

std::string read_file(const files::path& path) {
  return (std::ostringstream() << std::ifstream(path).rdbuf()).str();
}

// Runs a command with an empty environment, and gives how it ended.
std::string run(report command) {
  std::vector<char*> words(command.size() + 1);
  std::transform(command.begin(), command.end(), words.begin(),
                 [](std::string& word) { return word.data(); });
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, 1, output.c_str(), O_CREAT | O_TRUNC | O_WRONLY, 0644);
  posix_spawn_file_actions_adddup2(&actions, 1, 2);
  pid_t pid = 0;
  // The command's end is also an empty environment.
  int status = posix_spawnp(&pid, words[0], &actions, nullptr, words.data(), &words.back());
  posix_spawn_file_actions_destroy(&actions);
  waitpid(pid, &status, 0);
  return WIFEXITED(status) ? "exit " + std::to_string(WEXITSTATUS(status))
                           : "signal " + std::to_string(WTERMSIG(status));
}

// What runs a program under strace, if there are options for it.
report trace(const report& options) {
  if (options.empty()) return {};
  // A leak checker cannot do its work in a traced process.
  return report{"strace", "--quiet=path-resolution",    "-o", "/dev/null",
                "-E",     "ASAN_OPTIONS=detect_leaks=0"} +
         options;
}

}  // namespace

entries file(const std::string& path, const std::string& words) { return {{path, words}}; }
entries link_to(const std::string& path, const std::string& target) {
  return {{path, std::string(arrow) + target}};
}
entries folder(const std::string& path) { return {{path, directory}}; }
entries gone(const std::string& path) { return {{path, nothing}}; }

device change(device before, const entries& changes) {
  for (const auto& [path, what] : changes) {
    std::erase_if(before, [&, name = path](const auto& there) {
      return there.first == name || there.first.starts_with(name + "/");
    });
    if (what != nothing) before[path] = what;
  }
  return before;
}

void lay_out(const entries& contents) {
  static bool is_laid_out = false;
  if (!files::exists("/var/private-root")) throw std::logic_error("not inside a private root");
  for (const char* root : roots) {
    if (is_laid_out) umount2(root, MNT_DETACH);
    if (mount("tmpfs", root, "tmpfs", 0, "mode=755") != 0)
      throw std::system_error(errno, std::generic_category(), root);
  }
  is_laid_out = true;
  for (const auto& [name, what] : change({}, contents)) {
    const files::path path = name;
    files::create_directories(what == directory ? path : path.parent_path());
    if (what.starts_with(arrow)) {
      files::create_symlink(what.substr(arrow.size()), path);
    } else if (what != directory) {
      std::ofstream(path) << what;
    }
    if (path.extension() == ".dat" && files::is_regular_file(path)) {
      files::resize_file(path, large);
      files::last_write_time(path, files::last_write_time(path) + std::chrono::years(34));
    }
  }
}

device look() {
  device found;
  for (const char* root : roots) {
    for (const auto& there : files::recursive_directory_iterator(root)) {
      if (there.is_symlink()) {
        found[there.path()] = std::string(arrow) + files::read_symlink(there).string();
      } else if (there.is_regular_file() && there.file_size() == large) {
        found[there.path()];
      } else if (!there.is_directory()) {
        found[there.path()] = read_file(there.path());
      } else if (files::is_empty(there)) {
        found[there.path()] = directory;
      }
    }
  }
  return found;
}

namespace {

report run_program(const std::string& program, const report& tracing) {
  const char* emulator = std::getenv("TZDATA_EMULATOR");
  const char* programs = std::getenv("TZDATA_PROGRAMS");
  report command = {"setpriv", "--bounding-set=-all", "--inh-caps=-all"};
  // A leak checker cannot do its work in a process that confines itself.
  if (program == boot_program) command = command + report{"env", "ASAN_OPTIONS=detect_leaks=0"};
  command = command + trace(tracing);
  if (emulator != nullptr) command.emplace_back(emulator);
  command.push_back((programs != nullptr ? programs : PROGRAMS) + program);
  report heard = {run(command)};
  const std::string name = "\ntzdata-select: ";
  std::string text = "\n";
  text += read_file(output);
  text.erase(std::min(text.find("\nprofiling:"), text.size() - 1));
  for (std::size_t at = 0; (at = text.rfind(name)) != std::string::npos; text.erase(at)) {
    const std::string warning = text.substr(at + name.size());
    // One that lacks the text of errno altogether is passed on with all that surrounds it.
    const bool is_whole = warning.find(": ") != std::string::npos;
    heard.insert(heard.begin(), is_whole ? warning.substr(0, warning.rfind(": ")) : text);
  }
  if (!text.empty()) heard.insert(heard.begin(), text);
  return heard;
}

}  // namespace

report start(const report& tracing) { return run_program("/tzdata-select", tracing); }

report boot(const report& tracing) {
  report heard = run_program(boot_program, tracing);
  if (heard.front().starts_with("\ntzdata-boot: ")) heard.erase(heard.begin());
  return heard;
}

report hear(const report& command) {
  const std::string end = run(command);
  report heard;
  std::ifstream lines(output);
  // Confined, a program that counts its lines cannot write the counts down, and says so.
  for (std::string line; std::getline(lines, line);)
    if (!line.starts_with("profiling:")) heard.push_back(line);
  heard.push_back(end);
  return heard;
}

report ask(const report& arguments, const report& tracing, const std::string& program) {
  return hear(trace(tracing) + report{PROGRAMS "/" + program} + arguments);
}
