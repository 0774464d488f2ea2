#include "update/command.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <sstream>

#include "fs/olm_descriptor.h"
#include "update/failure.h"

namespace {

struct actions_destroyer {
  void operator()(posix_spawn_file_actions_t* actions) const {
    posix_spawn_file_actions_destroy(actions);
  }
};

// Empty where no directory in PATH has it.
std::string find_program(const std::string& name) {
  const char* const path = getenv("PATH");
  std::istringstream directories(path == nullptr ? "" : path);
  std::string found;
  for (std::string directory; found.empty() && std::getline(directories, directory, ':');) {
    const auto program = std::filesystem::path(directory) / name;
    if (std::filesystem::exists(program)) found = program;
  }
  return found;
}

}  // namespace

std::optional<command_result> run_command(std::vector<std::string> words, int input) {
  const std::string program = find_program(words[0]);
  if (program.empty()) return {};
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) fail(words[0]);
  const olm_descriptor reader(ends[0]);
  olm_descriptor writer(ends[1]);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  const std::unique_ptr<posix_spawn_file_actions_t, actions_destroyer> owner(&actions);
  posix_spawn_file_actions_adddup2(&actions, input, STDIN_FILENO);
  posix_spawn_file_actions_adddup2(&actions, writer.get(), STDOUT_FILENO);
  posix_spawn_file_actions_adddup2(&actions, writer.get(), STDERR_FILENO);
  std::vector<char*> arguments(words.size() + 1);
  std::transform(words.begin(), words.end(), arguments.begin(),
                 [](std::string& word) { return word.data(); });
  pid_t process = 0;
  errno = posix_spawn(&process, program.c_str(), &actions, nullptr, arguments.data(), environ);
  if (errno != 0) fail(words[0]);
  static_cast<void>(writer.close());

  std::string output;
  std::array<char, BUFSIZ> part{};
  ssize_t length = 0;
  while ((length = read(reader.get(), part.data(), part.size())) > 0)
    output.append(part.data(), static_cast<std::size_t>(length));
  if (length < 0) fail(words[0]);
  command_result result;
  std::istringstream all(output);
  for (std::string line; std::getline(all, line);) result.lines.push_back(line);
  int status = 0;
  if (waitpid(process, &status, 0) == -1) fail(words[0]);
  constexpr int by_signal = 128;
  result.status = WIFEXITED(status) ? WEXITSTATUS(status) : by_signal + WTERMSIG(status);
  return result;
}
