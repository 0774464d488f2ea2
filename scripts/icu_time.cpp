// Prints a time as a program that uses ICU has it, in the words of date(1), and with what data.
// usage: icu_time ZONE SECONDS
#include <unicode/smpdtfmt.h>
#include <unicode/timezone.h>

#include <cstdlib>
#include <iostream>
#include <memory>
#include <string>

int main(int count, char** arguments) {
  if (count != 3) return 2;
  std::unique_ptr<icu::TimeZone> zone(icu::TimeZone::createTimeZone(arguments[1]));
  if (*zone == icu::TimeZone::getUnknown()) return 1;
  UErrorCode error = U_ZERO_ERROR;
  icu::SimpleDateFormat format("EEE y-MM-dd HH:mm 'UTC'xxx", icu::Locale::getEnglish(), error);
  format.adoptTimeZone(zone.release());
  icu::UnicodeString time;
  format.format(std::strtod(arguments[2], nullptr) * U_MILLIS_PER_SECOND, time, nullptr, error);
  const char* release = icu::TimeZone::getTZDataVersion(error);
  if (U_FAILURE(error)) return 1;
  std::string text;
  std::cout << time.toUTF8String(text) << " (ICU " U_ICU_VERSION ", tzdata " << release << ")\n";
  return std::cout.flush() ? 0 : 1;
}
