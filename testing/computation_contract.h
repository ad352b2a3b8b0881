// What a platform computes, and the fakes do not. The subject is that of ContractTest.
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "platform/locale_settings.h"
#include "platform/message_digest.h"
#include "platform/system_log.h"
#include "testing/contract_test.h"

namespace tbdaily::testing {

template <typename Subject>
struct ComputationContract : ContractTest<Subject> {};
TYPED_TEST_SUITE_P(ComputationContract);

TYPED_TEST_P(ComputationContract, ChoosesTheBestLocalizations) {
  using Texts = std::vector<std::string>;
  struct Case {
    Texts available, preferred, best;
  };
  for (const Case& c : {
           Case{{"de", "en"}, {"en-GB"}, {"en"}},
           Case{{"en", "en-GB"}, {"en-GB", "en-US"}, {"en-GB", "en"}},
           Case{{"zh", "ZH_hant", "zh-Hant-HK"}, {"zh-Hant-TW"}, {"ZH_hant"}},
           Case{{"pt-BR"}, {"pt", "PT_br"}, {"pt-BR"}},
           Case{{"de", "en"}, {"en-GB", "de", "en-US"}, {"en", "de"}},
           Case{{"", "de"}, {"fr", ""}, {}},
       }) {
    EXPECT_EQ(this->services.localeSettings.bestLocalizations(c.available, c.preferred), c.best);
  }
}

TYPED_TEST_P(ComputationContract, DigestsAreMd5) {
  for (const auto& [message, digest] : {std::pair("", "<d41d8cd98f00b204e9800998ecf8427e>"),
                                        {"message digest", "<f96b697d7cb7938d525a2f31aaf161d0>"}}) {
    const Md5Digest md5 = this->services.messageDigest.md5(bytesOf(message));
    EXPECT_EQ(plistText(PlistValue::data({md5.begin(), md5.end()})), digest);
  }
}

REGISTER_TYPED_TEST_SUITE_P(ComputationContract, ChoosesTheBestLocalizations, DigestsAreMd5);

}  // namespace tbdaily::testing
