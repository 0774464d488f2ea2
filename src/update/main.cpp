// Takes a time-zone update for the next start of a device, or takes that back.
#include <err.h>
#include <fcntl.h>
#include <getopt.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <span>
#include <string>

#include "answer/answer.h"
#include "dataset/olm_dataset.h"
#include "driver/process.h"
#include "update/failure.h"
#include "update/update.h"

namespace {

using std::string;

constexpr const char* usage =
    "usage: tzdata-update [--older] ARCHIVE\n"
    "       tzdata-update [--older] DIRECTORY\n"
    "       tzdata-update --back\n";
constexpr const char* help =
    "Has the next start of a device use a time-zone update. ARCHIVE is NAME.tar, with the sum of "
    "its\n"
    "bytes beside it in NAME.sha256; DIRECTORY stands below /var/db/timezone/tz already. The data\n"
    "set in use stays in use until then.\n\n"
    "  --older    take it even if a newer one is waiting\n"
    "  --back     drop the update that is waiting; if none is, go back to the data set before\n"
    "  --help     print this help\n"
    "  --version  print the version\n\n"
    "Exit status: 0 if the next start uses it, or it is in use already; 1 if it is refused; 2 if\n"
    "that could not be done.\n";

struct request {
  bool allows_older = false;
  bool goes_back = false;
  string update;
};

request read_request(int count, char** arguments) {
  const std::array<option, 5> options = {{{"older", no_argument, nullptr, 'o'},
                                          {"back", no_argument, nullptr, 'b'},
                                          {"help", no_argument, nullptr, 'h'},
                                          {"version", no_argument, nullptr, 'v'},
                                          {nullptr, 0, nullptr, 0}}};
  request asked;
  for (int next = 0; (next = getopt_long(count, arguments, "", options.data(), nullptr)) != -1;) {
    switch (next) {
      case 'o':
        asked.allows_older = true;
        break;
      case 'b':
        asked.goes_back = true;
        break;
      case 'h':
        print_and_exit(string(usage) + '\n' + help);
      case 'v':
        print_and_exit("tzdata-update " VERSION "\n");
      default:
        refuse_usage(usage);
    }
  }
  const auto operands = std::span(arguments, static_cast<std::size_t>(count))
                            .subspan(static_cast<std::size_t>(optind));
  if (operands.size() != (asked.goes_back ? 0 : 1) || (asked.goes_back && asked.allows_older))
    refuse_usage(usage);
  if (asked.goes_back) return asked;
  asked.update = operands.front();
  while (asked.update.ends_with('/')) asked.update.pop_back();
  if (asked.update.empty()) refuse_usage(usage);
  return asked;
}

// The programs that are asked for help must be the system's own, whoever calls.
void prepare_process() {
  prepare_warnings();
  // A stream that is closed must not become one of the files that are opened here.
  for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
    if (fcntl(stream, F_GETFD) == -1) static_cast<void>(open("/dev/null", O_RDWR));
  constexpr mode_t kept_from_others = 022;
  umask(kept_from_others);
  clearenv();
  setenv("PATH", "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin", 1);
}

string fulfil(const request& asked) {
  if (geteuid() != 0) errx(cannot_be_told, "only root may update a device");
  if (!std::filesystem::is_directory(update_area))
    errx(cannot_be_told, "this is no device: there is no directory %s", update_area);
  if (asked.goes_back) return go_back();
  const bool is_directory = std::filesystem::is_directory(asked.update);
  return (is_directory ? take_directory : take_archive)(asked.update, asked.allows_older);
}

}  // namespace

int main(int count, char* arguments[]) {
  prepare_process();
  const request asked = read_request(count, arguments);
  try {
    std::printf("%s\n", clean(fulfil(asked)).c_str());
    flush_output();
    return EXIT_SUCCESS;
  } catch (const olm_refusal& refusal) {
    for (const string& reason : refusal.reasons) std::printf("%s\n", clean(reason).c_str());
    flush_output();
    return EXIT_FAILURE;
  } catch (const std::exception& failure) {
    errx(cannot_be_told, "%s", clean(failure.what()).c_str());
  }
}
