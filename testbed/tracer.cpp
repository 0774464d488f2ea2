#include "testbed/tracer.h"

#include <fstream>
#include <map>

#include "testbed/device.h"

namespace {

// A leak checker cannot do its work in a traced process.
constexpr const char* tracer = "exec env -i ASAN_OPTIONS=detect_leaks=0 strace -a0 ";

}  // namespace

std::vector<traced_call> trace_start(const std::string& entries) {
  const std::string log = "/tmp/calls";
  new_device(entries);
  start(tracer + ("-y -o " + log));
  std::map<std::string, int> numbers;
  std::vector<traced_call> calls;
  std::ifstream lines(log);
  for (std::string line; std::getline(lines, line);) {
    const std::string name = line.substr(0, line.find('('));
    const int number = ++numbers[name];
    const auto mentions = [&](const char* path) { return line.find(path) != std::string::npos; };
    if (line.starts_with("write(2")) continue;  // a warning about a file
    if (mentions("/var/db") || mentions("/usr/share")) calls.push_back({line, name, number});
  }
  return calls;
}

std::string start_with(const std::string& injection, const traced_call& at,
                       const std::string& entries) {
  new_device(entries);
  const std::string inject = "-e inject=" + at.name + ":" + injection;
  return start(tracer + ("-o /dev/null -e trace=" + at.name) + " " + inject +
               ":when=" + std::to_string(at.number))
      .back();
}
