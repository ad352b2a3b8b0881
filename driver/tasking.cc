#include "driver/tasking.h"

namespace tbdaily {

void HandleTaskingAndOSChange(Platform&) {}

}  // namespace tbdaily
