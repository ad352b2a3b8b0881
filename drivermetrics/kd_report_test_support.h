// What a test of a program that reads driver metrics needs in place of a device: a registry of scripted
// drivers, a scripted hub, and builders of what drivers publish and the hub's buffer holds.
//
//   FakeDriverRegistry registry;
//   ScriptedHub hub(registry);
//   registry.drivers.push_back(
//       publishingDriver(7, "Fan", {legendGroup("Cooling", {}, {}, {legendEntry(0x52504D, type)})}));
//   appendElement(hub.buffer, 7, 0x52504D, type, {.words = {1200}});
#pragma once

#include "drivermetrics/kd_report.h"
#include "platform/byte_writer.h"
#include "testing/fake_driver_registry.h"
#include "testing/scripted_driver.h"
#include "testing/scripted_hub.h"

namespace kdreport::fakes {

using tbdaily::testing::FakeDriverRegistry;
using tbdaily::testing::ScriptedDriver;
using tbdaily::testing::ScriptedHub;

constexpr ChannelType channelType(unsigned format, unsigned elements = 1, unsigned categories = 0) {
  return {std::uint64_t{format} | std::uint64_t{categories} << 16 | std::uint64_t{elements} << 32};
}

// A legend's entry for one channel.
inline PlistValue legendEntry(std::int64_t channel, ChannelType type, KdReportText name = {}) {
  PlistArray entry{PlistValue::int64(channel), PlistValue::int64(static_cast<std::int64_t>(type.bits))};
  if (name.get()) entry.push_back(PlistValue::string(std::string(*name.get())));
  return PlistValue::array(std::move(entry));
}

// The entries of channels that have their names and their information in common; the latter as
// KdReportCreateUnitInfo makes it, or none.
inline PlistValue legendGroup(KdReportText group, KdReportText subGroup, PlistValue info,
                              PlistArray entries) {
  PlistDictionary fields;
  fields.set(kd_report_key::kChannels, PlistValue::array(std::move(entries)));
  if (!info.isNone()) fields.set(kd_report_key::kChannelInfo, std::move(info));
  if (group.get()) fields.set(kd_report_key::kGroupName, PlistValue::string(std::string(*group.get())));
  if (subGroup.get())
    fields.set(kd_report_key::kSubGroupName, PlistValue::string(std::string(*subGroup.get())));
  return PlistValue::dictionary(std::move(fields));
}

// A driver of the class "Driver" that publishes these groups. The hub's identifier is 1.
inline ScriptedDriver publishingDriver(std::uint64_t identifier, std::string name, PlistArray groups) {
  PlistDictionary properties;
  properties.set(kd_report_key::kLegendPublic, PlistValue::boolean(true));
  properties.set(kd_report_key::kLegend, PlistValue::array(std::move(groups)));
  return {.identifier = identifier,
          .name = std::move(name),
          .serviceClass = "Driver",
          .properties = std::move(properties),
          .parent = {}};
}

struct Element {
  std::uint64_t stamp = 0;
  std::vector<std::int64_t> words = {};  // those behind are 0
};

// A channel of several elements has them one after the other.
inline void appendElement(PlistData& buffer, std::int64_t driver, std::int64_t channel, ChannelType type,
                          const Element& element = {}) {
  for (const std::uint64_t field :
       {static_cast<std::uint64_t>(driver), static_cast<std::uint64_t>(channel), type.bits, element.stamp})
    tbdaily::appendLittleEndian(buffer, field);
  for (std::size_t i = 0; i < kElementWords; ++i)
    tbdaily::appendLittleEndian(buffer,
                                i < element.words.size() ? static_cast<std::uint64_t>(element.words[i]) : 0);
}

}  // namespace kdreport::fakes
