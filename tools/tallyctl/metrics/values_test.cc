#include "tools/tallyctl/metrics/values.h"

#include <gmock/gmock.h>

#include "drivermetrics/metrics_test_support.h"
#include "tools/tallyctl/metrics/channel_text.h"
#include "tools/tallyctl/metrics/json.h"
#include "tools/tallyctl/metrics/selection.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily::testing {
namespace {

using namespace kdreport;
using ::testing::HasSubstr;

constexpr std::int64_t kNanoseconds = 0x0100007600000000;

using kdreport::testing::Element;

// A channel of a sample, which may carry other elements than its type announces.
std::vector<ChannelValues> valuesOf(unsigned format, unsigned announced,
                                    const std::vector<Element>& elements) {
  const KdReportChannel channel =
      kdreport::testing::sampled(kdreport::testing::channelType(format, announced), elements);
  return readChannels(kdreport::testing::collectionOf({channel}).get(), ChannelContents::Values).value();
}

TEST(MetricsValuesTest, CodesAreDecimalNegativeOrHexadecimal) {
  const std::pair<std::string_view, std::uint64_t> codes[] = {
      {"18446744073709551615", UINT64_MAX},
      {"-1", UINT64_MAX},
      {"-9223372036854775808", std::uint64_t{1} << 63},
      {"0x0100007600000000", kNanoseconds},
      {"0XfF", 255}};
  for (const auto& [text, code] : codes) EXPECT_EQ(parseCode(text), code) << text;
  for (const char* bad : {"18446744073709551616", "-9223372036854775809", "0x10000000000000000", "", "0x",
                          "0x-1", "--1", "+1", "1 "})
    EXPECT_EQ(parseCode(bad), std::nullopt) << bad;
}

// A channel that runs over the end of the hub's buffer keeps its place without elements.
TEST(MetricsValuesTest, ChannelsWithoutTheElementsThatTheirTypeAnnounces) {
  const auto json = [](unsigned format, unsigned announced, const std::vector<Element>& elements) {
    JsonWriter writer(JsonLayout::OneLine);
    writeChannels(writer, valuesOf(format, announced, elements), ChannelContents::Values);
    return writer.take();
  };
  EXPECT_THAT(json(1, 1, {}), HasSubstr(R"("value": null})"));
  EXPECT_THAT(json(1, 2, {{1, {5}}, {1, {6}}}), HasSubstr(R"("value": null})"));
  EXPECT_THAT(json(4, 3, {{1, {5}}}), HasSubstr(R"("values": [5, 0, 0, 0]})"));
  EXPECT_THAT(json(4, 3, {}), HasSubstr(R"("values": []})"));
  EXPECT_THAT(json(2, 2, {{1, {5, 6, 7}}}),
              HasSubstr(R"("states": [{"id": null, "name": null, "entries": null, "residency": null, )"
                        R"("dutyCycle": null}, {"id": null, )"));
  EXPECT_THAT(json(3, 1, {}),
              HasSubstr(R"("buckets": [{"lower": null, "upper": null, "hits": null, "minimum": null, )"
                        R"("maximum": null, "sum": null}], "minimum": null, "maximum": null})"));
}

// Each state asks for all names and for the sum of all residencies: as many as there can be must not take
// their square.
TEST(MetricsValuesTest, AsManyStatesAsThereCanBe) {
  std::vector<Element> elements(65535, {1, {0x4F4E, 1, 1}});
  elements.back() = {2, {0x01, 1, 65536}};
  const auto channels = valuesOf(2, 65535, elements);
  ASSERT_EQ(channels[0].states.size(), 65535U);
  EXPECT_EQ(channels[0].states[0].name, std::nullopt);
  EXPECT_EQ(channels[0].states.back().dutyCycle, 65536.0 / (65534 + 65536));
  EXPECT_EQ(channels[0].currentState, 65534U);
}

TEST(MetricsValuesTest, NamesThatAreNotAloneAreWrittenWhole) {
  std::vector<ChannelValues> channels(3);
  for (ChannelValues& channel : channels) {
    channel.format = kKdReportSimple;
    channel.driver = "d\n <id 0x1>";
    channel.name = "n";
    channel.value = -1;
  }
  channels[0].group = "g";
  channels[0].unitLabel = "ns";
  channels[2].name = "other";
  EXPECT_EQ(ShownText(valuesLine(PlistDate{0}, channels)).bytes(),
            "2001-01-01T00:00:00.000Z  d\\x0a <id 0x1>/g/n=-1 ns  d\\x0a <id 0x1>/n=-1  other=-1");
}

}  // namespace
}  // namespace tbdaily::testing
