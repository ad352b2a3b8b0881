#include "platform/plist/codec.h"

#include <gmock/gmock.h>

#include <cmath>

#include "platform/plist_text.h"
#include "testing/binary_plist_builder.h"

namespace tbdaily {
namespace {

using namespace std::string_literals;
using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::StartsWith;
using Builder = testing::BinaryPlistBuilder;

constexpr std::string_view kHeader = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\">\n";

PlistParseResult parse(std::string_view text) {
  return PlistCodec().parse(std::as_bytes(std::span(text)));
}

// The document around one value, all in the first line.
std::string plist(std::string_view value) {
  return std::string("<plist>").append(value).append("</plist>");
}

std::string repeated(std::string_view text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) all += text;
  return all;
}

std::string binaryOf(const std::string& rootObject) {
  Builder builder;
  builder.add(rootObject);
  return builder.build();
}

TEST(PropertyListCodec, WritesOneElementALineInTheFormAskedFor) {
  const PlistValue everything = PlistValue::dictionary(
      {{"b<", PlistValue::array({PlistValue::int8(-5), PlistValue::int64(3), PlistValue::array({})})},
       {"a", PlistValue::dictionary({{"single", PlistValue::float32(0.1F)},
                                     {"no", PlistValue::float64(std::nan(""))},
                                     {"up", PlistValue::float64(HUGE_VAL)}})},
       {"when", PlistValue(PlistDate{817376824.25})},
       {"bytes", PlistValue::data({std::byte{1}, std::byte{2}, std::byte{3}, std::byte{4}})},
       {"text", PlistValue::string("a\r&b")},
       {"yes", PlistValue::boolean(true)},
       {"empty", PlistValue::dictionary({})}});
  const std::string plain =
      std::string(kHeader) +
      "<dict>\n\t<key>b&lt;</key>\n\t<array>\n\t\t<integer>-5</integer>\n\t\t<integer>3</"
      "integer>\n\t\t<array/>\n"
      "\t</array>\n\t<key>a</key>\n\t<dict>\n\t\t<key>single</key>\n\t\t<real>0.10000000149011612</real>\n"
      "\t\t<key>no</key>\n\t\t<real>nan</real>\n\t\t<key>up</key>\n\t\t<real>+infinity</real>\n\t</dict>\n"
      "\t<key>when</key>\n\t<date>2026-11-26T09:07:04Z</date>\n\t<key>bytes</key>\n\t<data>AQIDBA==</data>\n"
      "\t<key>text</key>\n\t<string>a&#13;&amp;b</string>\n\t<key>yes</key>\n\t<true/>\n\t<key>empty</key>\n"
      "\t<dict/>\n</dict>\n</plist>\n";
  EXPECT_EQ(PlistCodec().write(everything, PlistForm::Plain).bytes, plain);

  const std::string exact = PlistCodec().write(everything).bytes;
  for (const char* element : {"<integer bits=\"8\">-5<", "<integer>3<", "<real bits=\"32\">0.1<", "04.25Z<"})
    EXPECT_THAT(exact, HasSubstr(element));
}

TEST(PropertyListCodec, TheExactFormKeepsValueAndKindAndOrder) {
  using Single = std::numeric_limits<float>;
  using Double = std::numeric_limits<double>;
  using Integer = std::numeric_limits<std::int64_t>;
  PlistArray all{PlistValue::boolean(true), PlistValue::boolean(false),
                 PlistValue::array({}),     PlistValue::dictionary({}),
                 PlistValue::int8(-128),    PlistValue::int32(std::numeric_limits<std::int32_t>::min())};
  for (const std::int64_t v : {Integer::min(), Integer::max()}) all.push_back(PlistValue::int64(v));
  for (const float v : {0.1F, Single::max(), Single::denorm_min(), -Single::infinity()})
    all.push_back(PlistValue::float32(v));
  for (const double v :
       {0.1, -0.0, 3.0, 1e300, Double::denorm_min(), Double::infinity(), Double::quiet_NaN()})
    all.push_back(PlistValue::float64(v));
  for (const double v : {0.0, 1e-20, 817376824.123456, -0.1, -Double::denorm_min(), -1e12 - 0.5, 1e15})
    all.push_back(PlistValue(PlistDate{v}));
  for (const char* text : {"", " <a> & 'b' \"c\" ]]> \t\r\n\r ", "gr\u00fc\u00df \u6f22 \U0001F600"})
    all.push_back(PlistValue::string(text));
  for (const std::size_t size : {0U, 1U, 2U, 3U, 1000U})
    all.push_back(PlistValue::data(PlistData(size, std::byte{0xFB})));
  const std::vector<std::string> keys{"zebra", "", "a & b", "Mango\r\n", "apple"};
  PlistDictionary dictionary;
  for (const std::string& key : keys) dictionary.set(key, PlistValue::array(all));
  all.push_back(PlistValue::dictionary(dictionary));

  PlistParseResult read;
  for (const PlistValue& value : all) {
    const PlistWriteResult written = PlistCodec().write(value);
    ASSERT_TRUE(written.ok) << written.error;
    read = parse(written.bytes);
    EXPECT_TRUE(read.value == value) << written.bytes << read.error;
  }
  ASSERT_NE(read.value.asDictionary(), nullptr);
  std::vector<std::string> keysRead;
  for (const auto& [key, value] : *read.value.asDictionary()) keysRead.push_back(key);
  EXPECT_EQ(keysRead, keys);
}

TEST(PropertyListCodec, GarbageAndAbsentValuesAreErrors) {
  for (const std::string_view text : {"", "garbage", "<plist", "bplist00", "\xFF\xFE<\0"}) {
    EXPECT_TRUE(parse(text).value.isNone()) << text;
    EXPECT_NE(parse(text).error, "") << text;
  }
  for (const PlistForm form : {PlistForm::Exact, PlistForm::Plain}) {
    const PlistWriteResult written = PlistCodec().write(PlistValue(), form);
    EXPECT_TRUE(!written.ok && written.bytes.empty() && !written.error.empty());
  }
}

TEST(PropertyListCodec, ReplacesWhatXmlCannotCarryOrRefusesItInTheExactForm) {
  const std::pair<std::string, std::string> cases[] = {
      {std::string("a\0b", 3), "a\uFFFDb"},   {"\x1F", "\uFFFD"},
      {"\uFFFE|\uFFFF", "\uFFFD|\uFFFD"},     {"\xC3(", "\uFFFD("},
      {"\xED\xA0\x80", "\uFFFD\uFFFD\uFFFD"}, {"x\xF0\x9F\x98", "x\uFFFD\uFFFD\uFFFD"},
      {"\xC0\x80", "\uFFFD\uFFFD"},           {"\xF4\x90\x80\x80", "\uFFFD\uFFFD\uFFFD\uFFFD"}};
  for (const auto& [text, written] : cases) {
    const auto plain = PlistCodec().write(PlistValue::string(text), PlistForm::Plain);
    EXPECT_EQ(plain.bytes, std::string(kHeader) + "<string>" + written + "</string>\n</plist>\n");
    EXPECT_FALSE(PlistCodec().write(PlistValue::dictionary({{text, PlistValue::int64(1)}})).ok);
  }
}

TEST(PropertyListCodec, ReadsEveryFormOfAScalar) {
  const std::pair<std::string, PlistValue> cases[] = {
      {"<integer>\n +7\t</integer>", PlistValue::int64(7)},
      {"<integer bits='8' other='x'>-128</integer>", PlistValue::int8(-128)},
      {"<real>-INF</real>", PlistValue::float64(-HUGE_VAL)},
      {"<real>Infinity</real>", PlistValue::float64(HUGE_VAL)},
      {"<real>+NaN</real>", PlistValue::float64(std::nan(""))},
      {"<real> 1.5e3 </real>", PlistValue::float64(1500)},
      {"<real>-1e-400</real>", PlistValue::float64(-0.0)},
      {"<real bits='32'>0.1</real>", PlistValue::float32(0.1F)},
      {"<date>2000-02-29T23:59:59Z</date>", PlistValue(PlistDate{-26438401})},
      {"<date>+12000-01-01T00:00:00Z</date>", PlistValue(PlistDate{315537897600.0})},
      {"<data> AQ I\n=</data>", PlistValue::data({std::byte{1}, std::byte{2}})},
      {"<string>a<!-- - -->b<![CDATA[<&]]>&#x41;&quot;</string>", PlistValue::string("ab<&A\"")},
      {"<!-- x --><true></true><?y?>", PlistValue::boolean(true)},
      {"<dict><key>a</key><true/><key>b</key><true/><key>a</key><false/></dict>",
       PlistValue::dictionary({{"a", PlistValue::boolean(false)}, {"b", PlistValue::boolean(true)}})}};
  for (const auto& [text, value] : cases) {
    const PlistParseResult read = parse(plist(text));
    EXPECT_TRUE(read.value == value) << text << "\n" << read.error;
  }
}

TEST(PropertyListCodec, FaultsOfXmlAreErrorsWithTheirPlace) {
  const std::pair<const char*, const char*> cases[] = {
      {"no integer of that width", "<integer></integer>|<integer>1.5</integer>|<integer>+-1</integer>"},
      {"no integer of that width", "<integer>9223372036854775808</integer>|<integer>0x10</integer>"},
      {"no integer of that width", "<integer bits='8'>128</integer>"},
      {"no such width", "<integer bits='16'>1</integer>|<real bits='8'>1</real>"},
      {"no real number of that width",
       "<real></real>|<real>1,5</real>|<real>1e400</real>|<real>nan(1)</real>"},
      {"no real number of that width",
       "<real bits='32'>1e39</real>|<real>1e99999999999999999999</real>|<real>0x1p3</real>"},
      {"no date", "<date>2026-02-29T00:00:00Z</date>|<date>2026-01-01T24:00:00Z</date>"},
      {"no date", "<date>2026-01-01T00:00:00</date>|<date>2026-01-01T00:00:00.Z</date>"},
      {"no date", "<date>12026-01-01T00:00:00Z</date>|<date>+99999999-01-01T00:00:00Z</date>"},
      {"no base64 text", "<data>A</data>|<data>AQ=</data>|<data>AQ==AQ==</data>|<data>A*==</data>"},
      {"a second value", "<true/><true/>"},
      {"without a value", "|<dict><key>a</key></dict>"},
      {"text where only elements may be", "text|<true/>x|<true>x</true>|<array>x</array>"},
      {"a key", "<key>a</key>|<array><key>a</key></array>|<dict><true/></dict>"},
      {"a key", "<dict><key>a</key><key>b</key></dict>"},
      {"inside", "<string><true/></string>|<plist><true/></plist>"},
      {"that property lists do not have", "<unknown/>|<dict><string2/></dict>"},
      {"not well-formed", "<string>\xC3(</string>|<a b></a>"},
      {"", "<string>&nbsp;</string>|<string>&#0;</string>|<string a='&x;'/>|<array>"}};
  for (const auto& [reason, bodies] : cases) {
    std::istringstream lines(bodies);
    for (std::string body; std::getline(lines, body, '|');) {
      const PlistParseResult read = parse(plist(body));
      EXPECT_TRUE(read.value.isNone()) << body;
      EXPECT_THAT(read.error, AllOf(StartsWith("line 1, column "), HasSubstr(reason))) << body;
    }
  }
  EXPECT_THAT(parse("<dict/>").error, StartsWith("line 1, column 1: "));
  EXPECT_THAT(
      parse("<?xml version='1.0'?>\n<!DOCTYPE plist [\n<!ENTITY a 'b'>\n]> <plist>\n <oops/></plist>").error,
      StartsWith("line 5, column 2: "));
  EXPECT_THAT(parse("<!DOCTYPE \u00e9> <plist>x</plist>").error, StartsWith("line 1, column 21: "));
}

TEST(PropertyListCodec, PassesOverADocumentTypeDeclarationAndNeverExpandsWhatItDeclares) {
  const std::string subset =
      "[<!ENTITY a 'b>]'><!-- ]> ' --><?p ]> ' ?><!ENTITY f SYSTEM 'file:///etc/hostname'>"
      "<!ATTLIST integer bits CDATA '8'>]";
  for (const std::string& doctype :
       {std::string("<!DOCTYPE plist PUBLIC \"-//[>//\" 'http://localhost/x.dtd'>"),
        "<?xml version='1.0'?><!-- <!DOCTYPE --> <!DOCTYPE plist " + subset + " >",
        "\xEF\xBB\xBF<!DOCTYPE plist SYSTEM 'x' " + subset + ">"}) {
    EXPECT_TRUE(parse(doctype + plist("<integer>7</integer>")).value == PlistValue::int64(7)) << doctype;
    for (const char* use : {"<string>&a;</string>", "<string>&f;</string>", "<string b='&a;'/>"}) {
      EXPECT_THAT(parse(doctype + plist(use)).error, HasSubstr("undefined entity")) << doctype << use;
    }
  }
  std::string laughs = "<!DOCTYPE plist [<!ENTITY e0 'ha'>";
  for (int i = 1; i < 50000; ++i) {
    const std::string inner = "&e" + std::to_string(i - 1) + ";";
    laughs += "<!ENTITY e" + std::to_string(i) + " '" + (i < 20 ? repeated(inner, 10) : inner) + "'>";
  }
  EXPECT_NE(parse(laughs + "]>" + plist("<string a='&e49999;'>&e49999;</string>")).error, "");
  EXPECT_EQ(parse(laughs + "]>" + plist("<true/>")).error, "");
  EXPECT_NE(parse(laughs + plist("<true/>")).error, "");
  EXPECT_NE(parse("<!DOCTYPE a><!DOCTYPE b [<!ENTITY c 'd'>]>" + plist("<true/>")).error, "");
}

TEST(PropertyListCodec, RefusesEveryOtherEncodingOfText) {
  std::string littleEndian, bigEndian;
  for (const char c : "<?xml version='1.0'?><plist><true/></plist>"s) {
    littleEndian.append(1, c).append(1, '\0');
    bigEndian.append(1, '\0').append(1, c);
  }
  for (const std::string& text : {littleEndian, bigEndian, "\xFF\xFE" + littleEndian, "\xFE\xFF" + bigEndian,
                                  "<?xml version='1.0' encoding='ISO-8859-1'?>" + plist("<true/>")}) {
    EXPECT_THAT(parse(text).error, HasSubstr("UTF-8"));
  }
}

TEST(PropertyListCodec, NestingEndsAt512LevelsInEveryDirection) {
  for (const int depth : {512, 513}) {
    const bool allowed = depth == 512;
    const auto xml = parse(plist(repeated("<array>", depth) + repeated("</array>", depth)));
    EXPECT_EQ(xml.error.empty(), allowed) << xml.error;

    // In the second list an array that is shared is met first where it is not deep.
    Builder builder, shared;
    PlistValue value = PlistValue::array({});
    for (std::size_t i = 1; i < static_cast<std::size_t>(depth); ++i) {
      builder.add(Builder::array({i}));
      shared.add(i == 1 ? Builder::array({400, i}) : Builder::array({i}));
      value = PlistValue::array({value});
    }
    builder.add(Builder::array({}));
    shared.add(Builder::array({}));
    EXPECT_EQ(parse(builder.build()).error.empty(), allowed);
    EXPECT_EQ(parse(shared.build()).error.empty(), allowed);
    EXPECT_EQ(PlistCodec().write(value).ok, allowed);
  }
}

TEST(PropertyListCodec, WritesTheSameInPiecesAndSaysBeforehandWhatItCannotWrite) {
  PlistValue nested;
  for (int depth = 0; depth < 513; ++depth)
    nested = depth % 2 != 0 ? PlistValue::array({nested}) : PlistValue::dictionary({{"k", nested}});
  const PlistValue odd[] = {
      PlistValue(),
      PlistValue::array({PlistValue()}),
      PlistValue(PlistDate{HUGE_VAL}),
      nested,
      PlistValue::dictionary({{"k", PlistValue::array({PlistValue(PlistDate{1e300})})}}),
      PlistValue::string("\x01\xff"),
      PlistValue::array(PlistArray(20000, PlistValue::string("a & b")))};
  PlistCodec codec;
  for (const PlistValue& value : odd) {
    const PlistWriteResult whole = codec.write(value, PlistForm::Plain);
    EXPECT_EQ(codec.whyNotPlain(value), whole.error);
    std::string pieces;
    std::size_t count = 0;
    const auto take = [&](std::span<const std::byte> piece) {
      pieces.append(reinterpret_cast<const char*>(piece.data()), piece.size());
      return ++count < 100;
    };
    EXPECT_EQ(codec.writeInPieces(value, PlistForm::Plain, take).ok, whole.ok);
    EXPECT_EQ(whole.ok ? pieces : "", whole.bytes);
    EXPECT_FALSE(codec.writeInPieces(value, PlistForm::Plain, [](auto) { return false; }).ok);
  }
}

TEST(PropertyListCodec, ReadsEveryBinaryKind) {
  const std::pair<std::string, PlistValue> cases[] = {
      {"\x08", PlistValue::boolean(false)},
      {"\x09", PlistValue::boolean(true)},
      {"\x10\xFF", PlistValue::int64(255)},
      {"\x11\xFF\xFE", PlistValue::int64(65534)},
      {"\x12\xFF\xFF\xFF\xFF", PlistValue::int64(4294967295)},
      {Builder::integer(-2), PlistValue::int64(-2)},
      {"\x14"s + std::string(15, '\0') + "\x07", PlistValue::int64(7)},
      {"\x14"s + std::string(16, '\xFF'), PlistValue::int64(-1)},
      {"\x22\x3F\xC0\0\0"s, PlistValue::float32(1.5F)},
      {Builder::real(-0.1), PlistValue::float64(-0.1)},
      {"\x33\x41\xC8\0\0\0\0\0\0"s, PlistValue(PlistDate{805306368})},
      {"\x42\x01\x02", PlistValue::data({std::byte{1}, std::byte{2}})},
      {Builder::ascii("a string of twenty.."), PlistValue::string("a string of twenty..")},
      {"\x64\0a\0\xFC\xD8\x3D\xDE\0"s, PlistValue::string("a\u00fc\U0001F600")},
      {"\xA0", PlistValue::array({})},
      {"\xD0", PlistValue::dictionary({})}};
  for (const auto& [object, value] : cases) {
    const PlistParseResult read = parse(binaryOf(object));
    EXPECT_TRUE(read.value == value) << ::testing::PrintToString(object) << read.error;
  }
  // A key that comes twice keeps its first place and its last value; objects can be shared.
  Builder builder;
  builder.add(Builder::dictionary({1, 2, 1}, {2, 3, 3}));
  builder.add(Builder::ascii("z"));
  builder.add(Builder::ascii("a"));
  builder.add(Builder::array({2, 2}));
  EXPECT_EQ(plistText(parse(builder.build()).value), R"({"z": ["a", "a"], "a": ["a", "a"]})");
}

TEST(PropertyListCodec, FaultsOfTheBinaryEncodingAreErrorsWithTheirPlace) {
  const std::string huge = "\x13\x7F"s + std::string(7, '\xFF');
  const std::string longInteger = "\x14"s + std::string(8, '\0') + std::string(8, '\xFF');
  const std::pair<const char*, std::vector<std::string>> cases[] = {
      {"unknown marker", {"\0"s, "\x0F"s, "\x15"s + std::string(32, '\0'), "\x21\0\0"s}},
      {"unknown marker", {"\x70"s, "\x80\0"s, "\xC0"s, "\x32\0\0\0\0"s, "\x4F\x22\0\0\0\0"s}},
      {"more than 64 bits", {"\x14\x01"s + std::string(15, '\0'), longInteger}},
      {"outside of the calendar", {"\x33\x7F\xF0\0\0\0\0\0\0"s, "\x33\x7F\xE0\0\0\0\0\0\0"s}},
      {"outside of ASCII", {"\x52\x61\x80"s}},
      {"surrogate", {"\x61\xD8\0"s, "\x61\xDC\0"s, "\x62\xD8\0\0a"s}},
      {"cut off", {"\x4F"s + huge, "\x6F"s + huge, "\xAF"s + huge, "\xDF"s + huge}},
      {"cut off", {"\x13\0"s, "\x23\0"s, "\x33\0"s}},
      {"negative length", {"\x4F\x13"s + std::string(8, '\xFF')}},
      {"to no object", {"\xA1\0\0\x01"s}},
      {"holds itself", {"\xA1\0\0\0"s, "\xD1\0\0\0\0\0\0"s}}};
  for (const auto& [reason, objects] : cases) {
    for (const std::string& object : objects) {
      const PlistParseResult read = parse(binaryOf(object));
      EXPECT_TRUE(read.value.isNone());
      EXPECT_THAT(read.error, AllOf(StartsWith("byte "), HasSubstr(reason)))
          << ::testing::PrintToString(object);
    }
  }
  EXPECT_THAT(parse(binaryOf("\x70")).error, StartsWith("byte 8: "));
  Builder numberAsKey;
  numberAsKey.add(Builder::dictionary({1}, {1}));
  numberAsKey.add(Builder::integer(1));
  EXPECT_THAT(parse(numberAsKey.build()).error, StartsWith("byte 9: "));

  const std::uint64_t all = std::numeric_limits<std::uint64_t>::max();
  const std::string sound = "bplist00\x09\x08";  // the object, then a table of one byte
  EXPECT_EQ(parse(sound + Builder::trailer(1, 1, 1, 0, 9)).error, "");
  for (const std::string& trailer :
       {Builder::trailer(0, 1, 1, 0, 9), Builder::trailer(9, 1, 1, 0, 9), Builder::trailer(1, 0, 1, 0, 9),
        Builder::trailer(1, 255, 1, 0, 9), Builder::trailer(1, 1, 0, 0, 9), Builder::trailer(1, 1, 2, 0, 9),
        Builder::trailer(8, 1, all / 8 + 2, 0, 9), Builder::trailer(1, 1, 1, 1, 9),
        Builder::trailer(1, 1, 1, all, 9), Builder::trailer(1, 1, 1, 0, all), Builder::trailer(1, 1, 1, 0, 7),
        std::string(31, '\0')}) {
    EXPECT_THAT(parse(sound + trailer).error, StartsWith("byte ")) << ::testing::PrintToString(trailer);
  }
}

TEST(PropertyListCodec, CyclesAndExplosionsOfSharedObjectsAreErrors) {
  Builder cycle, explosion, wide;
  cycle.add(Builder::array({1}));
  cycle.add(Builder::dictionary({2}, {0}));
  cycle.add(Builder::ascii("k"));
  EXPECT_THAT(parse(cycle.build()).error, HasSubstr("holds itself"));

  for (std::size_t i = 1; i <= 400; ++i) explosion.add(Builder::array({i, i}));
  explosion.add(Builder::array({}));
  EXPECT_THAT(parse(explosion.build()).error, HasSubstr("too much"));

  // A quarter of a million references to an array of three are allowed; one more, or 300 to a mebibyte, are
  // not.
  wide.add(Builder::array(std::vector<std::size_t>(250000, 1)));
  wide.add(Builder::array({2, 2, 2}));
  wide.add(Builder::ascii("x"));
  EXPECT_THAT(parse(wide.build()).error, HasSubstr("too much"));
  wide.replace(0, Builder::array(std::vector<std::size_t>(249999, 1)));
  EXPECT_EQ(parse(wide.build()).error, "");
  wide.replace(0, Builder::array(std::vector<std::size_t>(300, 1)));
  wide.replace(2, Builder::ascii(std::string(1 << 20, 'x')));
  EXPECT_THAT(parse(wide.build()).error, HasSubstr("too much"));

  // Many objects that are encoded in the same bytes, so that the values share nothing.
  std::string bytes = "bplist00";
  const std::size_t data = bytes.size();
  bytes += Builder::marker(4, 1 << 20) + std::string(1 << 20, 'x');
  const std::size_t root = bytes.size();
  bytes += Builder::marker(10, 1000);
  for (std::uint64_t i = 1; i <= 1000; ++i) bytes += testing::bigEndian(i, 2);
  const std::size_t table = bytes.size();
  bytes += testing::bigEndian(root, 4) + repeated(testing::bigEndian(data, 4), 1000);
  EXPECT_THAT(parse(bytes + Builder::trailer(4, 2, 1001, 0, table)).error, HasSubstr("too much"));
}

}  // namespace
}  // namespace tbdaily
