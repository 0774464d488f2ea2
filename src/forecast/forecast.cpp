#include "forecast/forecast.h"

#include <algorithm>

#include "boot/boot.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "driver/localtime.h"
#include "driver/start.h"
#include "fs/file_operations.h"

start_forecast forecast_start(const suppositions& supposed) {
  start_forecast forecast;
  olm_trial trial(supposed);
  // What the links are is told even if a start could not see it.
  trial.go_by_rights_of_user(true);
  forecast.zoneinfo.now = trial.find(zoneinfo_link);
  forecast.icutz.now = trial.find(icutz_link);
  forecast.localtime.now = trial.find(localtime_link);
  forecast.fit_now = do_halves_fit();
  forecast.restored = trial.find(fs::get_spare_path(zoneinfo_link)).target;
  if (forecast.restored == forecast.zoneinfo.now.target) forecast.restored.clear();
  trial.go_by_rights_of_user(false);
  const int status = run_boot();
  trial.require_told();
  forecast.record = trial.get_record();
  if (forecast.record.endless.empty()) forecast.status = status;
  const auto& written = forecast.record.written;
  forecast.installs = std::find(written.begin(), written.end(), version_record) != written.end();
  trial.go_by_rights_of_user(true);
  forecast.zoneinfo.next = trial.find(zoneinfo_link);
  forecast.icutz.next = trial.find(icutz_link);
  forecast.localtime.next = trial.find(localtime_link);
  forecast.fit_next = do_halves_fit();
  forecast.zone_exists = trial.find(localtime_link, true).is(S_IFREG);
  return forecast;
}
