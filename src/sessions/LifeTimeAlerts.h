// The process-wide switch that makes object lifetimes audible while debugging.
#pragma once

namespace sm {

bool AudibleLifeTimeAlertsEnabled();
void SetAudibleLifeTimeAlerts(bool enabled);
// Sounds one tone when the alerts are on at this moment.
void LifeTimeAlert(unsigned frequency, unsigned milliseconds);

}  // namespace sm
