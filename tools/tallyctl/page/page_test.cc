#include <gtest/gtest.h>

#include "tools/tallyctl/page/html.h"
#include "tools/tallyctl/page/report_page.h"
#include "tools/tallyctl/page/wear_page.h"

namespace tbdaily {
namespace {

TEST(X, Y) {}

}  // namespace
}  // namespace tbdaily
