// Tells whether a time-zone data set is sound, and if it is not, why.
#include <err.h>
#include <getopt.h>
#include <unistd.h>

#include <array>
#include <charconv>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>

#include "answer/answer.h"
#include "check/check.h"

namespace {

using std::string;

constexpr int usual_since = 1970;

constexpr const char* usage =
    "usage: tzdata-check [--since=YEAR] [--replaces=DIRECTORY] DIRECTORY\n"
    "       tzdata-check [--since=YEAR] [--replaces=DIRECTORY] ZONEINFO ICU\n";
constexpr const char* help =
    "Tells whether a time-zone data set is sound: each file whole, and the zone files and ICU's\n"
    "files the same. DIRECTORY has both, in zoneinfo and icutz; else ZONEINFO has the zone files,\n"
    "and ICU those of ICU. Prints a line for each reason why it is not sound.\n\n"
    "  --since=YEAR          do not compare times before YEAR (1970)\n"
    "  --replaces=DIRECTORY  no zone of the data set in DIRECTORY may be missing\n"
    "  --help                print this help\n"
    "  --version             print the version\n\n"
    "Exit status: 0 if it is sound, 1 if it is not, 2 if that cannot be told.\n";

// Shows on a terminal what takes longer than a second.
class olm_progress {
 public:
  void show(const string& step) {
    if (!is_terminal_ || clock::now() - begin_ < std::chrono::seconds(1)) return;
    constexpr int width = 60;
    is_shown_ = true;
    static_cast<void>(std::fprintf(stderr, "\rchecking %-*.*s", width, width, clean(step).c_str()));
  }

  void clear() {
    if (is_shown_) static_cast<void>(std::fputs("\r\033[K", stderr));
    is_shown_ = false;
  }

 private:
  using clock = std::chrono::steady_clock;
  clock::time_point begin_ = clock::now();
  bool is_terminal_ = isatty(STDERR_FILENO) != 0;
  bool is_shown_ = false;
};

int read_year(const string& text) {
  constexpr int first = 1;
  constexpr int last = 2100;
  int year = 0;
  const char* const end = std::to_address(text.end());
  const auto [rest, error] = std::from_chars(text.data(), end, year);
  if (error != std::errc() || rest != end || year < first || year > last)
    errx(cannot_be_told, "--since=%s: no year from %d to %d", clean(text).c_str(), first, last);
  return year;
}

check_request read_request(int count, char** arguments) {
  const std::array<option, 5> options = {{{"since", required_argument, nullptr, 's'},
                                          {"replaces", required_argument, nullptr, 'r'},
                                          {"help", no_argument, nullptr, 'h'},
                                          {"version", no_argument, nullptr, 'v'},
                                          {nullptr, 0, nullptr, 0}}};
  check_request request;
  request.since = usual_since;
  for (int next = 0; (next = getopt_long(count, arguments, "", options.data(), nullptr)) != -1;) {
    switch (next) {
      case 's':
        request.since = read_year(optarg);
        break;
      case 'r':
        request.replaced = optarg;
        if (request.replaced.empty()) refuse_usage(usage);
        break;
      case 'h':
        print_and_exit(string(usage) + '\n' + help);
      case 'v':
        print_and_exit("tzdata-check " VERSION "\n");
      default:
        refuse_usage(usage);
    }
  }
  const auto operands = std::span(arguments, static_cast<std::size_t>(count))
                            .subspan(static_cast<std::size_t>(optind));
  if (operands.size() == 1) {
    request.directory = operands.front();
  } else if (operands.size() == 2) {
    request.zoneinfo = operands.front();
    request.icu = operands.back();
  } else {
    refuse_usage(usage);
  }
  return request;
}

}  // namespace

int main(int count, char* arguments[]) {
  const check_request request = read_request(count, arguments);
  olm_progress progress;
  int status = EXIT_SUCCESS;
  const canary_report report = {.add_reason =
                                    [&](const string& reason) {
                                      progress.clear();
                                      std::printf("%s\n", clean(reason).c_str());
                                      flush_output();
                                      status = EXIT_FAILURE;
                                    },
                                .begin_step = [&](const string& step) { progress.show(step); }};
  try {
    check_data_set(request, report);
  } catch (const std::invalid_argument& damage) {
    report.add_reason(damage.what());
  } catch (const std::exception& failure) {
    progress.clear();
    warnx("cannot be told: %s", clean(failure.what()).c_str());
    // One reason is enough, even if there may be others.
    return status == EXIT_SUCCESS ? cannot_be_told : status;
  }
  progress.clear();
  flush_output();
  return status;
}
