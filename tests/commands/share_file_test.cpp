#include "commands/share_file.h"

#include <numeric>

#include <gtest/gtest.h>

#include "foundation/fault.h"
#include "support/file_bytes.h"
#include "support/temporary_directory.h"

namespace lumo::test {
namespace {

/// Reads all numbers of a section back. @return none where the file is refused.
std::vector<std::uint32_t> ReadAll(const std::string& path, std::size_t rest,
                                   std::uint64_t section = 0) {
  ShareReader in;
  std::vector<std::uint32_t> numbers;
  if (!in.Open(path, "key", {1, 3}, section)) return numbers;
  EXPECT_EQ(in.Left() % sizeof(std::uint32_t), 0U);
  numbers.resize(in.Left() / sizeof(std::uint32_t));
  for (std::size_t at = 0; at < numbers.size(); at += rest) {
    EXPECT_TRUE(in.GetAll(&numbers[at], std::min(rest, numbers.size() - at)));
    in.Rest();
  }
  EXPECT_TRUE(in.IsAtEnd());
  std::uint32_t more = 0;
  EXPECT_FALSE(in.Get(more));
  return numbers;
}

/// A file has the same bytes whether it is written as the numbers come or at the end; sizes around
/// the pieces in which it is read.
TEST(ShareFile, HoldsWhatWasPutHoweverMuchItIs) {
  const TemporaryDirectory directory;
  for (const std::size_t count : {0U, 1U, 262143U, 262144U, 262145U, 1000000U}) {
    SCOPED_TRACE(count);
    std::vector<std::uint32_t> numbers(count);
    std::iota(numbers.begin(), numbers.end(), 5U);
    std::string files[2];
    for (const bool streams : {false, true}) {
      const std::string path = (directory.Path() / "a.share").string();
      ShareWriter out;
      ASSERT_TRUE(!streams || out.StreamTo(path));
      for (std::size_t at = 0; at < count; at += 100000) {
        out.PutAll(&numbers[at], std::min<std::size_t>(100000, count - at));
      }
      out.EndSection();
      out.EndSection();
      out.PutAll(numbers.data(), count / 2);
      ASSERT_TRUE(out.Write(path, "key", {1, 3})) << TakeFault().ToUTF8();
      files[streams] = FileBytes(path);
      EXPECT_EQ(ReadAll(path, 77777), numbers);
      EXPECT_TRUE(ReadAll(path, 77777, 1).empty());
      EXPECT_EQ(ReadAll(path, 77777, 2),
                std::vector<std::uint32_t>(numbers.begin(), numbers.begin() + count / 2));
      EXPECT_FALSE(ShareReader().Open(path, "key", {1, 3}, 3));
    }
    EXPECT_TRUE(files[0] == files[1]);
  }
}

TEST(ShareFile, IsRefusedWhereItIsDamagedOrAnother) {
  const TemporaryDirectory directory;
  const std::string path = (directory.Path() / "a.share").string();
  ShareWriter out;
  ASSERT_TRUE(out.StreamTo(path));
  const std::vector<std::uint64_t> numbers(400000, 3);
  out.PutAll(numbers.data(), numbers.size());
  ShareReader in;
  EXPECT_FALSE(in.Open(path, "key", {1, 3}));  // it isn't ended
  ASSERT_TRUE(out.Write(path, "key", {1, 3}));
  EXPECT_TRUE(in.Open(path, "key", {1, 3}));
  EXPECT_FALSE(in.Open(path, "other", {1, 3}));
  EXPECT_FALSE(in.Open(path, "key", {2, 3}));
  const std::string whole = FileBytes(path);
  for (const std::size_t at : {std::size_t{3}, whole.size() / 2, whole.size() - 1}) {
    std::string damaged = whole;
    damaged[at] ^= 1;
    std::ofstream(path, std::ios::binary) << damaged;
    EXPECT_FALSE(in.Open(path, "key", {1, 3})) << at;
  }
  std::ofstream(path, std::ios::binary) << whole.substr(0, whole.size() - 8);
  EXPECT_FALSE(in.Open(path, "key", {1, 3}));
  EXPECT_EQ(TakeFault().ToUTF8(), path + ": is no whole file of a share of this work");
}

}  // namespace
}  // namespace lumo::test
