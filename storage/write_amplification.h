// Write amplification: what the flash erased or wrote for each unit that the host wrote.
#pragma once

#include <optional>

#include "platform/preferences_store.h"
#include "storage/stats_context.h"

namespace tbdaily {

// Dimensionless; a host that wrote nothing gives figures that are not finite, which are compared as they are.
struct WriteAmplification {
  double user = 0;    // erased user bands, in units of 4 KiB, for each unit that the host wrote
  double system = 0;  // the same for the intermediate partition
};

// From "bandErases", the geometry and "hostWrites"; each rounded to single precision. A context without the
// statistics involved gives zeros for the system figure.
WriteAmplification computeWriteAmplification(const StatsContext& context);

// The limit above which the band validity lists are logged: the preference "userWAmp", when it is a real
// number above 0 and below 10; else nothing, and kDefaultWriteAmplificationThreshold applies.
std::optional<float> preferredWriteAmplificationThreshold(PreferencesStore& preferences);
inline constexpr double kDefaultWriteAmplificationThreshold = 2.0;

// Whether the user figure is above the limit that applies.
bool isAboveThreshold(double user, PreferencesStore& preferences);

}  // namespace tbdaily
