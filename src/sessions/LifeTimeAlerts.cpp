#include "sessions/LifeTimeAlerts.h"

#include <windows.h>

#include <atomic>

namespace sm {
namespace {
std::atomic<bool> alertsEnabled{false};
}

bool AudibleLifeTimeAlertsEnabled() { return alertsEnabled.load(); }
void SetAudibleLifeTimeAlerts(bool enabled) { alertsEnabled.store(enabled); }

void LifeTimeAlert(unsigned frequency, unsigned milliseconds) {
    if (alertsEnabled.load()) ::Beep(frequency, milliseconds);
}

}  // namespace sm
