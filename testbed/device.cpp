#include "testbed/device.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string_view>

#include "testbed/private_root.h"

namespace {

namespace files = std::filesystem;

// As warn prints it.
constexpr std::string_view program_name = "tzdata-select: ";

std::string read(const files::path& file) {
  return (std::ostringstream() << std::ifstream(file).rdbuf()).str();
}

std::vector<std::string> split_lines(const std::string& text) {
  std::istringstream stream(text);
  std::vector<std::string> lines;
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  return lines;
}

std::string replace(const std::string& text, const std::string& what, const std::string& by) {
  std::string replaced = text;
  for (std::size_t at = 0; (at = replaced.find(what, at)) != std::string::npos; at += by.size())
    replaced.replace(at, what.size(), by);
  return replaced;
}

// An entry as lay_out takes it.
std::string describe(const files::directory_entry& entry, std::string name) {
  if (entry.is_symlink()) {
    name.append(" > ").append(files::read_symlink(entry));
  } else if (entry.is_directory()) {
    name.append(" /");
  } else {
    const std::string content = read(entry);
    name.append(content.empty() ? " =" : " = ").append(content);
  }
  return replace(name, "\n", "\\n");
}

bool reports_failed_call(const std::string& warning) {
  const auto begins = [&](const char* text) { return warning.starts_with(text); };
  return begins("remove: ") || begins("read_symlink: ") || begins("create_symlink: ") ||
         begins("tz_icu::") || begins("Cannot touch ");
}

// Keeps what is written on the standard error stream while it lives.
class stream_capture {
 public:
  stream_capture() { dup2(text_, STDERR_FILENO); }
  stream_capture(const stream_capture&) = delete;
  stream_capture& operator=(const stream_capture&) = delete;
  ~stream_capture() {
    dup2(stream_, STDERR_FILENO);
    close(stream_);
    close(text_);
  }

  [[nodiscard]] std::string get_text() const {
    return read("/proc/self/fd/" + std::to_string(text_));
  }

 private:
  int text_ = memfd_create("warnings", MFD_CLOEXEC);
  int stream_ = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 0);
};

// Runs `action`, which gives how it ended.
report listen(const std::function<std::string()>& action) {
  const stream_capture capture;
  const std::string end = action();
  report heard;
  for (const std::string& line : split_lines(capture.get_text())) {
    if (heard.empty() || line.starts_with(program_name)) {
      heard.push_back(line);
    } else {
      heard.back() += "\\n" + line;
    }
  }
  for (std::string& warning : heard) {
    if (!warning.starts_with(program_name)) continue;
    warning.erase(0, program_name.size());
    if (!reports_failed_call(warning)) warning = warning.substr(0, warning.rfind(": "));
  }
  heard.push_back(end);
  return heard;
}

}  // namespace

void lay_out(const std::string& entries) {
  private_root::require();
  for (const std::string& entry : split_lines(entries)) {
    std::istringstream words(entry);
    std::string name;
    char kind = 0;
    std::string content;
    std::getline(words >> name >> kind >> std::ws, content);
    content = replace(content, "\\n", "\n");
    const files::path path = files::path("/var/db/timezone") / replace(name, "\\n", "\n");
    files::create_directories(path.parent_path());
    files::remove_all(path);
    if (kind == '>') files::create_symlink(content, path);
    if (kind == '=') std::ofstream(path) << content;
    if (kind == '/') files::create_directory(path);
  }
}

void new_device(const std::string& entries) {
  private_root::renew_device();
  lay_out(entries);
}

std::set<std::string> look() {
  std::set<std::string> found;
  for (const files::path directory : {"/var/db/timezone", "/var/db"}) {
    std::error_code missing;
    for (const auto& entry : files::directory_iterator(directory, missing)) {
      const std::string leaf = entry.path().filename();
      if (leaf == "timezone" || leaf == "tz" || leaf == "tz_latest") continue;
      found.insert(describe(entry, directory == "/var/db" ? entry.path().string() : leaf));
    }
  }
  return found;
}

std::set<std::string> look_at_inputs() {
  std::set<std::string> found;
  std::error_code missing;
  for (const files::path directory : {"/var/db/timezone/tz", "/usr/share"}) {
    for (const auto& entry : files::recursive_directory_iterator(directory, missing))
      found.insert(describe(entry, entry.path()));
  }
  if (const files::path latest = "/var/db/timezone/tz_latest"; files::is_symlink(latest, missing))
    found.insert(describe(files::directory_entry(latest), latest));
  return found;
}

std::set<std::string> list(const std::string& entries) {
  const auto lines = split_lines(entries);
  return {lines.begin(), lines.end()};
}

report hear(const std::function<void()>& action) {
  return listen([&]() -> std::string {
    try {
      action();
      return "done";
    } catch (int value) {
      return "int " + std::to_string(value);
    } catch (const std::invalid_argument& failure) {
      return std::string("invalid_argument ") + failure.what();
    } catch (const std::out_of_range&) {
      return "out_of_range";
    }
  });
}

report start(const std::string& before, const std::string& after) {
  private_root::require();
  return listen([&] {
    // NOLINTNEXTLINE(cert-env33-c): the command is the tests' own
    const int status = std::system((before + " '" PROGRAM "' " + after).c_str());
    return WIFEXITED(status) ? "exit " + std::to_string(WEXITSTATUS(status))
                             : "signal " + std::to_string(WTERMSIG(status));
  });
}
