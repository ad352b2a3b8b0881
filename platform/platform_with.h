// A platform with some of its services replaced.
#pragma once

#include <type_traits>

#include "platform/platform.h"

namespace tbdaily {

namespace platform_with {

template <typename Family>
Family& chosen(Family& own) {
  return own;
}
template <typename Family, typename First, typename... Rest>
Family& chosen(Family& own, First& first, Rest&... rest) {
  if constexpr (std::is_base_of_v<Family, First>) {
    return first;
  } else {
    return chosen<Family>(own, rest...);
  }
}

}  // namespace platform_with

// The platform's services, but for each one given that one in the place of its family's. Borrows all of them.
template <typename... Services>
Platform platformWith(const Platform& p, Services&... replacements) {
  const auto of = [&](auto& own) -> auto& {
    return platform_with::chosen(own, replacements...);
  };
  return {of(p.driverRegistry),    of(p.preferences),     of(p.deviceAnswers),
          of(p.logSubmission),     of(p.analyticsClient), of(p.analyticsHistory),
          of(p.propertyListCodec), of(p.stackSnapshot),   of(p.usageService),
          of(p.appRegistry),       of(p.localeSettings),  of(p.serviceListener),
          of(p.notifications),     of(p.systemLog),       of(p.kernel),
          of(p.fileSystem),        of(p.dynamicLoader),   of(p.messageDigest),
          of(p.diagnostics),

          of(p.analyticsHome)};
}

}  // namespace tbdaily
