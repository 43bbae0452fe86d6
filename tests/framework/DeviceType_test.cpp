#include "framework/DeviceType.h"

#include <gtest/gtest.h>

#include "framework/Calibrator.h"

namespace {

int typeOf(const std::string& name) {
  return static_cast<int>(Calibrator::Arguments::DeviceNameToDeviceType(name));
}

struct FamilyCase {
  int type;
  std::vector<std::string> names;
};

class DeviceFamily : public testing::TestWithParam<FamilyCase> {};

TEST_P(DeviceFamily, IsFoundByEachOfItsCodenamesInAnyCase) {
  for (const std::string& name : GetParam().names) {
    EXPECT_EQ(typeOf(name), GetParam().type) << name;
    std::string upper = name;
    for (char& c : upper) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    EXPECT_EQ(typeOf(upper), GetParam().type) << upper;
  }
}

INSTANTIATE_TEST_SUITE_P(All, DeviceFamily,
                         testing::Values(FamilyCase{0, {"o1v1", "o1", "v1", "ostvin", "ostrel", "vintrey"}},
                                         FamilyCase{1, {"p2m2", "p2", "m2", "pyrmar", "pyrle", "marlo"}},
                                         FamilyCase{1, {"k3", "quillon"}},
                                         FamilyCase{2, {"e4d4", "e4", "d4", "sabrel", "dunlet"}},
                                         FamilyCase{3, {"t5h5", "t5", "h5", "thornet", "helian"}},
                                         FamilyCase{4, {"g3", "rufael"}}, FamilyCase{5, {"w9", "whiskel"}}));

TEST(DeviceType, AnyOtherTextIsInvalid) {
  for (const char* name : {"", " ostrel", "ostrel ", "ostre", "ostrelx", "0", "\xc3\x96strel"}) {
    EXPECT_EQ(typeOf(name), 6) << name;
  }
}

TEST(DeviceType, MixedCaseIsFound) { EXPECT_EQ(typeOf("Ostrel"), 0); }

}  // namespace
