#include <gtest/gtest.h>

#include "app/CAllBoards.h"

TEST(AllBoards, VersionsCompareByTheirNumbersWhateverTheirLength) {
  const struct {
    const char* a;
    const char* b;
    bool same;
  } cases[] = {
      {"1.10", "1.10", true}, {"1.10", "1.10.0", true}, {"1.30", "1.20", false},
      {"1.10", "1.1", false}, {"2.0", "2", true},       {"", "", false},
      {"1.10", "", false},    {"0.03", "0.3", true},    {"1.10.1", "1.10", false},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(CAllBoards::SameVersion(c.a, c.b), c.same) << c.a << " vs " << c.b;
  }
}

// Only boards that are found and have a file go to the run; the order is
// the product's, pen first and scalar last, and a scalar takes -s.
TEST(AllBoards, PlansTheBoardsFoundWithAFileInTheirOrder) {
  CListCommand::SProductLine product;
  product.name = "Tablet";
  product.boards = {{"pen", "1:2:3:4:5", "HID", "1.00", "no-such.pen"},
                    {"touch", "", "HID", "", "no-such.hex"},
                    {"bluetooth", "1:2:4:4:5", "HID", "1.00", ""},
                    {"scalar", "1:9:S1:255", "FTDI", "1.00", "no-such.bin"}};
  const CAllBoards::SPlan plan = CAllBoards::Plan({product, product}, "/nonexistent/fw_loader.ini");
  const std::vector<std::string> once = {"-p", "1:2:3:4:5", "-s", "1:9:S1:255"};
  std::vector<std::string> twice = once;
  twice.insert(twice.end(), once.begin(), once.end());
  EXPECT_EQ(plan.arguments, twice);
  EXPECT_TRUE(plan.skipped.empty());
  EXPECT_EQ(plan.productCount, 2u);
}
