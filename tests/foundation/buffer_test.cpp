#include "foundation/buffer.h"

#include "foundation/fault.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;

constexpr std::uint64_t kHeader = BasicBuffer::kHeaderSize;

class Buffers : public testing::Test {
 protected:
  unsigned CodeOf(const BasicBuffer& buffer) const { return buffer.GetErrorState().code; }

  test::TemporaryDirectory directory_;
  const fs::path path_ = directory_.Path() / "numbers";
  const String name_{path_.string()};
};

struct Item {
  double low, high;
  std::uint32_t bins, reserved;
};

TEST_F(Buffers, AFileIsTheHeaderAndThenTheElements) {
  Buffer<Item> buffer(name_, ArrayDims(2, 3));
  EXPECT_EQ(CodeOf(buffer), BufferWarningNoHeaderData::Code);
  EXPECT_TRUE(buffer.IsValid());
  EXPECT_EQ(buffer.Count(), 0U);
  EXPECT_EQ(buffer.GetDims(), ArrayDims(2, 3));
  buffer.Header()[3] = 'x';
  buffer.Ref(1) = {1.0, 2.0, 3, 4};
  EXPECT_EQ(buffer.Count(), 2U);
  EXPECT_EQ(FileBytes(path_)[3], '\0');
  EXPECT_TRUE(buffer.Close());
  EXPECT_TRUE(buffer.Close());
  std::string want(kHeader + 24, '\0');
  want[3] = 'x';
  const Item item{1.0, 2.0, 3, 4};
  want.append(reinterpret_cast<const char*>(&item), sizeof item);
  EXPECT_EQ(FileBytes(path_), want);
}

TEST_F(Buffers, WritesThroughAReferenceAfterCountAndFlushAreKept) {
  {
    Buffer<unsigned> buffer(name_, ArrayDims(8), 16);
    unsigned& first = buffer.Ref(0);
    unsigned& third = buffer.Ref(2);
    first = 1;
    EXPECT_EQ(buffer.Count(), 3U);
    third = 30;
    EXPECT_TRUE(buffer.Flush());
    first = 10;
    EXPECT_EQ(buffer.At(5000), 0U);  // the window moves
    unsigned& far = buffer.Ref(5000);
    EXPECT_EQ(buffer.Count(), 5001U);
    far = 7;
    EXPECT_EQ(buffer.Count(), 5001U);
    EXPECT_TRUE(buffer.Flush());
    far = 8;
    EXPECT_TRUE(buffer.Close());
  }
  Buffer<unsigned> again(name_, 16, BasicBuffer::kReadOnly);
  EXPECT_EQ(again.At(0), 10U);
  EXPECT_EQ(again.At(2), 30U);
  EXPECT_EQ(again.At(5000), 8U);
}

TEST_F(Buffers, SizeOfTheHeader) {
  Buffer<unsigned>(name_, ArrayDims(1)).Ref(0) = 7;
  EXPECT_EQ(fs::file_size(path_), 65540U);
  Buffer<unsigned>(name_, ArrayDims(1), 1024).Ref(0) = 7;
  EXPECT_EQ(fs::file_size(path_), kHeader + 4);
}

TEST_F(Buffers, AWriteFarBehindTheEndLeavesZeros) {
  {
    Buffer<float> buffer(name_, ArrayDims(1), 1024);
    buffer.Ref(0) = 1.0F;
    buffer.Ref(5000) = 2.0F;
    EXPECT_EQ(buffer.At(70000), 0.0F);
    EXPECT_EQ(buffer.Count(), 5001U);
  }
  Buffer<float> buffer(name_, 1024, BasicBuffer::kReadOnly);
  for (std::uint64_t i = 0; i < 5001; ++i) {
    ASSERT_EQ(buffer.At(i), i == 0 ? 1.0F : i == 5000 ? 2.0F : 0.0F) << i;
  }
}

/// Elements at the borders of pages and windows, in an order that moves the window to and fro; each
/// page size has borders of its own.
TEST_F(Buffers, KeepsElementsAtTheBordersOfWindows) {
  for (const unsigned page : {1U, 1000U, 1024U, 16384U}) {
    std::vector<std::uint64_t> places;
    for (std::uint64_t k = 0; k < 5; ++k) {
      for (const int step : {-1025, -1024, -1023, -1, 0, 1, 1023, 1024, 1025}) {
        const auto place = static_cast<std::int64_t>(k * page) + step;
        if (place >= 0) places.push_back(static_cast<std::uint64_t>(place));
      }
    }
    Buffer<double> buffer(name_, ArrayDims(1), page);
    for (std::size_t i = 0; i < places.size(); ++i) {
      const std::uint64_t place = places[i * 7 % places.size()];
      buffer.Ref(place) = static_cast<double>(place) + 0.5;
    }
    for (const std::uint64_t place : places) {
      ASSERT_EQ(buffer.At(place), static_cast<double>(place) + 0.5) << page;
    }
    ASSERT_TRUE(buffer.Close());
    const std::string bytes = FileBytes(path_);
    for (const std::uint64_t place : places) {
      double value = 0;
      std::memcpy(&value, &bytes[kHeader + place * 8], 8);
      ASSERT_EQ(value, static_cast<double>(place) + 0.5) << page;
    }
  }
}

TEST_F(Buffers, ElementsBeyondFourGigabytes) {
  constexpr std::uint64_t kFar = (std::uint64_t{1} << 32U) + 12345;
  {
    Buffer<double> buffer(name_, ArrayDims(1));
    buffer.Ref(3) = 3.0;
    buffer.Ref(kFar) = 4.0;
    EXPECT_EQ(buffer.Count(), kFar + 1);
    EXPECT_TRUE(buffer.Close());
  }
  EXPECT_EQ(fs::file_size(path_), kHeader + (kFar + 1) * 8);
  Buffer<double> buffer(name_, 1024, BasicBuffer::kReadWrite);
  EXPECT_EQ(buffer.At(kFar), 4.0);
  EXPECT_EQ(buffer.At(kFar - (std::uint64_t{1} << 29U)), 0.0);
  EXPECT_EQ(buffer.At(3), 3.0);
  EXPECT_EQ(buffer.At(UINT64_MAX), 0.0);
  EXPECT_EQ(CodeOf(buffer), ObjectErrorIO::Code);
}

TEST_F(Buffers, ReadingLeavesTheFileAsItIs) {
  Buffer<float>(name_, ArrayDims(1)).Ref(2) = 5.0F;
  const std::string before = FileBytes(path_);
  Buffer<float> buffer(name_, 1024, BasicBuffer::kReadOnly);
  EXPECT_EQ(CodeOf(buffer), 0U);
  buffer.Ref(2) = 6.0F;
  buffer.Header()[0] = 1;
  buffer.Flush();
  EXPECT_EQ(CodeOf(buffer), BufferWarningReadOnly::Code);
  EXPECT_FALSE(buffer.WriteHeader());
  EXPECT_EQ(buffer.At(100000), 0.0F);
  EXPECT_EQ(buffer.At(2), 5.0F);
  EXPECT_TRUE(buffer.IsValid());
  EXPECT_TRUE(buffer.Close());
  EXPECT_EQ(FileBytes(path_), before);
  // One that is looked at for writing stays too, however short it is.
  for (const std::string& bytes : {before, std::string("short")}) {
    std::ofstream(path_, std::ios::binary) << bytes;
    Buffer<float> writer(name_, 1024, BasicBuffer::kReadWrite);
    writer.At(1);
    EXPECT_TRUE(writer.Close());
    EXPECT_EQ(FileBytes(path_), bytes);
  }
}

TEST_F(Buffers, AFileThatIsNotThereIsMade) {
  for (const BasicBuffer::Mode mode : {BasicBuffer::kReadOnly, BasicBuffer::kReadWrite}) {
    Buffer<float> buffer(name_, 1024, mode);
    EXPECT_TRUE(buffer.IsValid());
    EXPECT_EQ(CodeOf(buffer), BufferWarningNoHeaderData::Code);
    EXPECT_EQ(fs::file_size(path_), 0U);
    fs::remove(path_);
  }
  Buffer<float> nowhere(String((directory_.Path() / "no" / "file").string()), ArrayDims(1));
  EXPECT_EQ(CodeOf(nowhere), ObjectErrorIO::Code);
  EXPECT_EQ(TakeFault().ToUTF8(),
            (directory_.Path() / "no" / "file: No such file or directory").string());
  nowhere.Ref(3) = 1.0F;
  EXPECT_EQ(nowhere.Ref(4), 0.0F);
  EXPECT_EQ(nowhere.Count(), 0U);
  EXPECT_FALSE(nowhere.Close());
  Buffer<float> folder(String(directory_.Path().string()), 1024, BasicBuffer::kReadOnly);
  EXPECT_EQ(CodeOf(folder), ObjectErrorIO::Code);
}

TEST_F(Buffers, TheHeaderIsAwayWhileChangesAreUnderWay) {
  {
    Buffer<float> made(name_, ArrayDims(1));
    made.Header()[0] = 'm';
    made.Ref(0) = 1.0F;
  }
  test::DoAndBeKilled([&] {
    Buffer<float> writer(name_, 1024, BasicBuffer::kReadWrite);
    writer.Ref(0) = 2.0F;
    writer.Flush();
    writer.ReadHeader();
    if (writer.Header()[0] == 'm') raise(SIGKILL);
  });
  EXPECT_TRUE(FileBytes(path_).substr(0, kHeader) == std::string(kHeader, '\0'));
  Buffer<float> writer(name_, ArrayDims(1));
  writer.Header()[0] = 'm';
  writer.Ref(0) = 1.0F;
  EXPECT_TRUE(writer.WriteHeader());
  EXPECT_EQ(FileBytes(path_)[0], 'm');
  writer.Ref(5000) = 1.0F;
  EXPECT_TRUE(writer.Flush());
  EXPECT_EQ(FileBytes(path_)[0], '\0');
  EXPECT_TRUE(writer.Close());
  EXPECT_EQ(FileBytes(path_)[0], 'm');
}

TEST_F(Buffers, AFullDiskIsTold) {
  for (const std::uint64_t element : {1000U, 40000U}) {
    Buffer<double> buffer(name_, ArrayDims(1));
    buffer.Header()[0] = 'm';
    buffer.Ref(1) = 1.0;
    {
      const test::FileSizeLimit limit(kHeader + 800);
      buffer.Ref(element) = 1.0;
      buffer.Ref(100000) = 1.0;  // the first window, or the one round the element, can't be kept
      EXPECT_FALSE(buffer.Close());
    }
    EXPECT_EQ(CodeOf(buffer), ObjectErrorIO::Code);
    EXPECT_EQ(TakeFault().ToUTF8(), path_.string() + ": File too large");
    EXPECT_EQ(FileBytes(path_).substr(0, 1), std::string(1, '\0').substr(0, fs::file_size(path_)));
  }
  Buffer<double> buffer(name_, ArrayDims(1));
  {
    const test::FileSizeLimit limit(100);
    EXPECT_FALSE(buffer.Close());
  }
  EXPECT_EQ(CodeOf(buffer), BufferWarningNoHeaderData::Code);
}

TEST_F(Buffers, AFileThatWasDeletedIsTold) {
  Buffer<double> buffer(name_, ArrayDims(1));
  buffer.Ref(1) = 1.0;
  fs::remove(path_);
  EXPECT_FALSE(buffer.Close());
  EXPECT_EQ(CodeOf(buffer), ObjectErrorIO::Code);
}

TEST_F(Buffers, AWindowWithoutMemory) {
  std::ofstream(path_, std::ios::binary) << "stays";
  Buffer<Item> buffer(name_, UINT32_MAX, BasicBuffer::kReadWrite);
  if (buffer.IsValid()) GTEST_SKIP() << "this machine gives 100 GB";
  EXPECT_EQ(CodeOf(buffer), BufferErrorBadBuffer::Code);
  buffer.Ref(0) = {};
  EXPECT_FALSE(buffer.Close());
  EXPECT_EQ(FileBytes(path_), "stays");
}

}  // namespace
}  // namespace lumo
