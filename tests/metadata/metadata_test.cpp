#include "metadata/metadata.h"

#include <atomic>
#include <thread>

namespace lumo {
namespace {

std::vector<std::string> Names(const Metadata& metadata, const String& path, bool isPrivate) {
  List<String> names;
  isPrivate ? metadata.GetNamesPrivate(path, names) : metadata.GetNames(path, names);
  std::vector<std::string> texts;
  for (const String& name : names) texts.push_back(name.ToUTF8());
  return texts;
}

TEST(Metadata, KeepsEachScalarTypeUnderItsWordAndCode) {
  Metadata metadata;
  const auto check = [&]<typename T>(T value, const char* word, unsigned code) {
    SCOPED_TRACE(word);
    const String path = String("/types/") + word;
    EXPECT_TRUE(metadata.Set(path, value));
    T back{};
    EXPECT_TRUE(metadata.Get(path, back));
    EXPECT_TRUE(back == value);
    MetadataProperties properties;
    EXPECT_TRUE(metadata.GetProperties(path, properties));
    EXPECT_EQ(properties.typeName.ToUTF8(), word);
    EXPECT_EQ(properties.typeCode, code);
    EXPECT_EQ(properties.count, 1U);
    EXPECT_FALSE(properties.isArray);
    std::uint8_t byte = 0;
    EXPECT_EQ(metadata.Get(path, byte), code == 1U);  // no conversion
  };
  check(std::uint8_t{200}, "uchar", 1);
  check(std::int16_t{-3}, "short", 2);
  check(std::int32_t{-70000}, "int", 3);
  check(0.5F, "float", 4);
  check(0.1, "double", 5);
  check(String("text, Ünicode"), "string", 7);
  check(std::uint16_t{65535}, "ushort", 12);
  check(std::uint32_t{4000000000U}, "uint", 13);
  check(std::int64_t{-5000000000}, "long64", 14);
  check(std::uint64_t{1} << 63U, "ulong64", 15);
  EXPECT_TRUE(metadata.SetUndefined("/types/u", 9));
  MetadataProperties properties;
  EXPECT_TRUE(metadata.GetProperties("/types/u", properties));
  EXPECT_EQ(properties.typeCode, 0U);
  EXPECT_TRUE(metadata.GetProperties("/types", properties));
  EXPECT_EQ(properties.typeCode, 20U);
  EXPECT_EQ(properties.count, 11U);
}

TEST(Metadata, PathsDropEmptyPiecesAndContainersAreNoValues) {
  Metadata metadata;
  EXPECT_TRUE(metadata.Set("/a/b", 1));
  EXPECT_FALSE(metadata.Set("/a/b/c", 2));
  EXPECT_FALSE(metadata.Set("/a/b/c/d/e", 2));
  EXPECT_FALSE(metadata.Set("//", 1));
  int value = 0;
  EXPECT_FALSE(metadata.Get("/a", value));
  EXPECT_FALSE(metadata.Exists("/a"));
  EXPECT_FALSE(metadata.Exists("/"));
  EXPECT_FALSE(metadata.Exists("/A/b"));
  EXPECT_TRUE(metadata.Get("a//b///", value));
  EXPECT_EQ(value, 1);
  EXPECT_TRUE(metadata.Set("a/b", String("now a text")));
  EXPECT_FALSE(metadata.Get("/a/b", value));
  metadata.Remove("/nothing/here");
  metadata.Remove("/a");
  EXPECT_FALSE(metadata.Exists("/a/b"));
}

TEST(Metadata, ArraysKeepTheirShape) {
  Metadata metadata;
  int numbers[] = {1, 2, 3, 4, 5, 6};
  EXPECT_TRUE(metadata.SetArray("/flat", Array<int>(numbers, ArrayDims(6))));
  EXPECT_TRUE(metadata.SetArray("/grid", Array<int>(numbers, ArrayDims(2, 3))));
  EXPECT_FALSE(metadata.SetArray("/cube", Array<int>(numbers, ArrayDims(1, 2, 3))));
  EXPECT_FALSE(metadata.SetArray("/none", Array<int>()));
  Array<int> back;
  EXPECT_TRUE(metadata.GetArray("/flat", back));
  EXPECT_TRUE(back.GetDims() == ArrayDims(6));
  EXPECT_TRUE(metadata.GetArray("/grid", back));
  EXPECT_TRUE(back.GetDims() == ArrayDims(2, 3));
  EXPECT_TRUE(std::equal(back.begin(), back.end(), numbers));
  Array<double> wrong;
  EXPECT_FALSE(metadata.GetArray("/grid", wrong));
  int first = 0;
  EXPECT_TRUE(metadata.Get("/grid", first));
  EXPECT_EQ(first, 1);
}

TEST(Metadata, CopiesShareUntilOneIsWritten) {
  Metadata original;
  original.Set("/a", 1);
  Metadata copy(original);
  Metadata third;
  third = copy;
  copy.Set("/a", 2);
  third.Remove("/a");
  int value = 0;
  EXPECT_TRUE(original.Get("/a", value));
  EXPECT_EQ(value, 1);
  EXPECT_TRUE(copy.Get("/a", value));
  EXPECT_EQ(value, 2);
  EXPECT_FALSE(third.Exists("/a"));
}

TEST(Metadata, NamesAreFullPathsInOrderAndPrivateOnesApart) {
  Metadata metadata;
  for (const char* path : {"/b/y", "/b/x", "/a", "/private/key", "/b/private/z"}) {
    metadata.Set(path, 1);
  }
  EXPECT_EQ(Names(metadata, "/", false), (std::vector<std::string>{"/a/", "/b/x/", "/b/y/"}));
  EXPECT_EQ(Names(metadata, "b", false), (std::vector<std::string>{"/b/x/", "/b/y/"}));
  EXPECT_EQ(Names(metadata, "", true),
            (std::vector<std::string>{"/b/private/z/", "/private/key/"}));
  EXPECT_TRUE(Names(metadata, "/a", false).empty());
  EXPECT_TRUE(Names(metadata, "/none", false).empty());
}

TEST(Metadata, DescribeHasFixedColumns) {
  Metadata metadata;
  double grid[] = {0.1, 2, 3, 4};
  metadata.SetArray("/m", Array<double>(grid, ArrayDims(2, 2)));
  metadata.Set("/box/n", std::uint8_t{7});
  const std::string blanks(100, ' ');
  const std::string want = "/box/n/" + blanks.substr(0, 73) + "    = (uchar        1)" +
                           blanks.substr(0, 47) + " = 7\n" + "/m/" + blanks.substr(0, 77) +
                           "    = (double      2,2)" + blanks.substr(0, 47) + " = 0.1, 2, 3, 4\n";
  EXPECT_EQ(metadata.Describe().ToUTF8(), want);
}

TEST(Metadata, ThreadsMayCopyReadAndWriteOneStore) {
  Metadata shared;
  shared.Set("/n", 0);
  std::atomic<int> failures{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 200; ++i) {
        Metadata copy(shared);
        copy.Set("/n", t * 1000 + i);
        int value = -1;
        if (!copy.Get("/n", value) || value != t * 1000 + i) ++failures;
        if (t == 0) shared.Set("/other", i);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  int value = -1;
  EXPECT_TRUE(shared.Get("/n", value));
  EXPECT_EQ(value, 0);
  EXPECT_EQ(failures, 0);
}

}  // namespace
}  // namespace lumo
