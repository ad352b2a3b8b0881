#include "storage/selectors.h"

namespace tbdaily {

namespace {

constexpr STXSelectorPair statsSelector = {13, 13};
constexpr STXSelectorPair defectsListSelector = {15, 15};
constexpr STXSelectorPair telemetryListSelectors = {17, 17};
constexpr STXSelectorPair taskSchedulerSelectors = {39, 39};
constexpr STXSelectorPair snapshotSelectors = {22, 22};
constexpr STXSelectorPair snapshotHeaderSelectors = {145, 145};
constexpr STXSelectorPair bandStatsSelector = {11, 11};

}  // namespace

const STXSelectorPair* STXGetStatsSelectors() {
  return &statsSelector;
}
const STXSelectorPair* STXGetDefectsListSelectors() {
  return &defectsListSelector;
}
const STXSelectorPair* STXGetTelemetryListSelectors() {
  return &telemetryListSelectors;
}
const STXSelectorPair* STXGetTaskSchedulerSelectors() {
  return &taskSchedulerSelectors;
}
const STXSelectorPair* STXGetSnapshotSelectors() {
  return &snapshotSelectors;
}
const STXSelectorPair* STXGetSnapshotHeaderSelectors() {
  return &snapshotHeaderSelectors;
}
const STXSelectorPair* STXGetBandStatsSelectors() {
  return &bandStatsSelector;
}

}  // namespace tbdaily
