// Hash, list and error details of the contract.
#include "host/utility/error.h"
#include "host/utility/sz_hash.h"
#include "host/utility/sz_list.h"

#include <gmock/gmock.h>

#include <cstdint>
#include <limits>
#include <thread>

namespace {

using testing::ElementsAre;
using testing::Pair;

std::vector<std::pair<std::string, std::string>> PairsOf(const QARDCSzHash *hash) {
  std::vector<std::pair<std::string, std::string>> out;
  for (const auto &[key, value] : hash->Pairs()) {
    out.emplace_back(key, value);
  }
  return out;
}

class SzHash : public testing::Test {
protected:
  void SetUp() override { ASSERT_NE(hash_, nullptr); }
  void TearDown() override { QARDCSzHashFree(hash_); }
  QARDCSzHash *hash_ = QARDCSzHashAlloc(1024);
};

TEST_F(SzHash, KeepsTheOrderInWhichKeysWereFirstSet) {
  for (const char *key : {"zeta", "alpha", "mid", "alpha"}) {
    ASSERT_EQ(QARDCSzHashSetValue(hash_, key, "1"), 0);
  }
  ASSERT_EQ(QARDCSzHashSetValue(hash_, "zeta", "2"), 0);
  EXPECT_THAT(PairsOf(hash_), ElementsAre(Pair("zeta", "2"), Pair("alpha", "1"), Pair("mid", "1")));
}

TEST_F(SzHash, CopiesTheTexts) {
  char key[] = "key";
  char value[] = "value";
  ASSERT_EQ(QARDCSzHashSetValue(hash_, key, value), 0);
  key[0] = value[0] = 'X';
  EXPECT_STREQ(QARDCSzHashGetValue(hash_, "key"), "value");
  EXPECT_EQ(QARDCSzHashGetValue(hash_, "Xey"), nullptr);
}

TEST_F(SzHash, SetsAKeyToItsOwnValue) {
  const std::string text(100, 'v');
  ASSERT_EQ(QARDCSzHashSetValue(hash_, "key", text.c_str()), 0);
  ASSERT_EQ(QARDCSzHashSetValue(hash_, "key", QARDCSzHashGetValue(hash_, "key")), 0);
  EXPECT_EQ(QARDCSzHashGetValue(hash_, "key"), text);
}

TEST_F(SzHash, ValueStaysValidWhileOtherKeysCome) {
  ASSERT_EQ(QARDCSzHashSetValue(hash_, "key", "value"), 0);
  const char *value = QARDCSzHashGetValue(hash_, "key");
  for (int number = 0; number < 5000; ++number) {
    ASSERT_EQ(QARDCSzHashSetValue(hash_, std::to_string(number).c_str(), "x"), 0);
  }
  EXPECT_EQ(QARDCSzHashGetValue(hash_, "key"), value);
  EXPECT_STREQ(value, "value");
}

TEST_F(SzHash, RemoveGivesTheOldValueAndForgetsTheKey) {
  QARDCSzHashSetValue(hash_, "a", "1");
  QARDCSzHashSetValue(hash_, "b", "2");
  const char *removed = QARDCSzHashRemoveKey(hash_, "a");
  ASSERT_NE(removed, nullptr);
  QARDCSzHashSetValue(hash_, "c", "3");
  EXPECT_STREQ(removed, "1");
  EXPECT_EQ(QARDCSzHashGetValue(hash_, "a"), nullptr);
  EXPECT_EQ(QARDCSzHashRemoveKey(hash_, "a"), nullptr);
  QARDCSzHashSetValue(hash_, "a", "4");
  EXPECT_THAT(PairsOf(hash_), ElementsAre(Pair("b", "2"), Pair("c", "3"), Pair("a", "4")));
}

TEST_F(SzHash, RefusesNullAndTheEmptyKey) {
  EXPECT_LT(QARDCSzHashSetValue(nullptr, "k", "v"), 0);
  EXPECT_LT(QARDCSzHashSetValue(hash_, nullptr, "v"), 0);
  EXPECT_LT(QARDCSzHashSetValue(hash_, "k", nullptr), 0);
  EXPECT_LT(QARDCSzHashSetValue(hash_, "", "v"), 0);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
  EXPECT_EQ(QARDCSzHashGetValue(nullptr, "k"), nullptr);
  EXPECT_EQ(QARDCSzHashGetValue(hash_, nullptr), nullptr);
  EXPECT_EQ(QARDCSzHashRemoveKey(nullptr, "k"), nullptr);
  EXPECT_EQ(QARDCSzHashRemoveKey(hash_, nullptr), nullptr);
  EXPECT_TRUE(hash_->Pairs().empty());
  QARDCSzHashFree(nullptr);
}

TEST(SzHash_Alloc, TakesAWildSizeAsAHint) {
  for (const size_t size : {size_t{0}, std::numeric_limits<size_t>::max()}) {
    QARDCSzHash *hash = QARDCSzHashAlloc(size);
    ASSERT_NE(hash, nullptr);
    EXPECT_EQ(QARDCSzHashSetValue(hash, "k", "v"), 0);
    QARDCSzHashFree(hash);
  }
}

TEST(SzList, GivesTheTextsByIndex) {
  QARDCSzList *list = QARDCSzListAlloc(std::numeric_limits<size_t>::max());
  ASSERT_NE(list, nullptr);
  list->Append("first");
  list->Append("");
  EXPECT_STREQ(QARDCSzListGet(list, 0), "first");
  EXPECT_STREQ(QARDCSzListGet(list, 1), "");
  EXPECT_EQ(QARDCSzListGet(list, 2), nullptr);
  EXPECT_EQ(QARDCSzListGet(list, -1), nullptr);
  EXPECT_EQ(QARDCSzListGet(list, std::numeric_limits<int>::max()), nullptr);
  EXPECT_EQ(QARDCSzListGet(nullptr, 0), nullptr);
  QARDCSzListFree(list);
  QARDCSzListFree(nullptr);
}

TEST(Error, BelongsToTheThreadAndOutlivesASuccess) {
  std::thread([] {
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NONE);
    EXPECT_STREQ(QARDCErrorGetFile(), "");
    EXPECT_EQ(QARDCErrorGetLine(), 0);
    EXPECT_LT(QARDCSzHashSetValue(nullptr, "k", "v"), 0);
    const int line = QARDCErrorGetLine();
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
    EXPECT_STREQ(QARDCErrorGetFile(), "sz_hash.cpp");
    EXPECT_GT(line, 0);
    QARDCSzHashFree(QARDCSzHashAlloc(1));
    EXPECT_EQ(QARDCErrGet(), QARDC_ERR_BAD_ARGUMENT);
    EXPECT_EQ(QARDCErrorGetLine(), line);
    std::thread([] { EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NONE); }).join();
  }).join();
}

TEST(Error, AnExceptionBecomesACode) {
  const auto fail = [](auto thrown) { return vornhost::Guarded(-7, [&thrown]() -> int { throw thrown; }); };
  EXPECT_EQ(fail(std::bad_alloc()), -7);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_NO_MEMORY);
  EXPECT_EQ(fail(std::runtime_error("x")), -7);
  EXPECT_EQ(QARDCErrGet(), QARDC_ERR_IO);
}

} // namespace
