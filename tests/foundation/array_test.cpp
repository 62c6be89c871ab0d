#include "foundation/array.h"

#include <limits>
#include <sstream>

#include "commands/value_text.h"

namespace lumo {
namespace {

TEST(ArrayDims, CountsRankAndElements) {
  const struct {
    ArrayDims dims;
    unsigned rank;
    unsigned count;
  } cases[] = {
      {ArrayDims(0), 0, 0},
      {ArrayDims(5), 1, 5},
      {ArrayDims(3, 0, 2), 3, 6},
      {ArrayDims(2, 3, 4, 5, 6, 7, 8, 9), 8, 362880},
      {ArrayDims(65536, 65536), 2, ArrayDims::kTooMany},  // not 0, as the product in 32 bits
      {ArrayDims(65537, 65535), 2, 4294967295U},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(c.dims.rank, c.rank);
    EXPECT_EQ(c.dims.count, c.count);
  }
}

TEST(Array, GrowsAndKeepsItsElements) {
  Array<int> array(ArrayDims(2, 3));
  for (int i = 0; i < 6; ++i) array[static_cast<unsigned>(i)] = i;
  ASSERT_TRUE(array.Resize(ArrayDims(6)));
  const int* const before = array.GetData();
  ASSERT_TRUE(array.Resize(ArrayDims(2)));
  EXPECT_EQ(array.GetCapacity(), 6U);
  EXPECT_EQ(array.GetData(), before);
  ASSERT_TRUE(array.Resize(ArrayDims(10, 10)));
  for (int i = 0; i < 6; ++i) EXPECT_EQ(array[static_cast<unsigned>(i)], i);

  Array<String> texts{ArrayDims(2)};
  texts[1] = "kept";
  ASSERT_TRUE(texts.Resize(ArrayDims(50)));
  EXPECT_TRUE(texts[1] == "kept");
}

TEST(Array, ChangesShapeOnlyInsideForeignMemory) {
  int memory[4] = {1, 2, 3, 4};
  Array<int> array(memory, ArrayDims(4));
  EXPECT_TRUE(array.Resize(ArrayDims(2, 2)));
  EXPECT_FALSE(array.Resize(ArrayDims(5)));
  EXPECT_EQ(array.GetRank(), 2U);
  EXPECT_TRUE(array.IsValid());
  Array<int> same(array);
  same[0] = 9;
  EXPECT_EQ(memory[0], 9);
  Array<int> owned(ArrayDims(1));
  Array<int> copy(owned);
  copy[0] = 1;
  owned[0] = 2;
  EXPECT_EQ(copy[0], 1);
}

/// An element that finds no memory beyond the first few.
struct Scarce {
  static inline int left = 0;
  Scarce() {
    if (left-- == 0) throw std::bad_alloc();
  }
};

template <typename T>
void ExpectLosesAll(Array<T>& array, const ArrayDims& dims) {
  EXPECT_FALSE(array.Resize(dims));
  EXPECT_FALSE(array.IsValid());
  EXPECT_EQ(array.GetErrorState().code, ObjectErrorOutOfMemory::Code);
  EXPECT_EQ(array.GetCount(), 0U);
  EXPECT_EQ(array.GetCapacity(), 0U);
}

TEST(Array, IsEmptyAndInvalidWhenMemoryFails) {
  Scarce::left = 10;
  Array<Scarce> scarce(ArrayDims(3));
  ASSERT_TRUE(scarce.IsValid());
  ExpectLosesAll(scarce, ArrayDims(20));
  Array<double> huge(ArrayDims(3));
  ExpectLosesAll(huge, ArrayDims(65536, 65536));  // more than the count can hold
}

TEST(Array, HasATextForm) {
  Array<int> array(ArrayDims(3));
  for (int i = 0; i < 3; ++i) array[static_cast<unsigned>(i)] = 10 * (i + 1);
  EXPECT_EQ(FormatValue(array).ToUTF8(), "1:3 [10 20 30] ");
  EXPECT_EQ(FormatValue(Array<int>()).ToUTF8(), "0:[] ");
  Array<unsigned char> bytes(ArrayDims(1, 2));
  bytes[0] = 65;
  bytes[1] = 255;
  EXPECT_EQ(FormatValue(bytes).ToUTF8(), "2:1 2 [65 255] ");

  const auto read = ParseValue<Array<double>>("2:2 2 [0.1 nan -inf 1e-7] ");
  ASSERT_TRUE(read.IsValid());
  EXPECT_EQ(read.GetExtent(1), 2U);
  EXPECT_EQ(read[0], 0.1);
  EXPECT_EQ(read[2], -std::numeric_limits<double>::infinity());
  EXPECT_EQ(ParseValue<Array<int>>("9:1 1 1 1 1 1 1 2 [5 6]").GetCount(), 2U);
}

TEST(Array, RefusesABrokenText) {
  for (const char* text :
       {"1:3 [1 2", "1:3 [1 x 3] ", "1:4000000000 [1] ", "8:99999 99999 9 9 9 9 9 9 [", "1:3"}) {
    const auto array = ParseValue<Array<double>>(text);
    EXPECT_EQ(array.GetCount(), 0U) << text;
    EXPECT_EQ(array.GetErrorState().code, ArrayErrorInvalidArray::Code) << text;
  }
}

TEST(Inverse, TimesTheMatrixIsTheIdentity) {
  // The zero at the head needs a row exchange; the rows differ widely in scale.
  const double rows[] = {0, 2e6, 1e6, 3, 1, -1, 1e-4, 2e-4, 5e-4};
  Array<double> matrix(ArrayDims(3, 3));
  std::copy(std::begin(rows), std::end(rows), matrix.begin());
  const Array<double> inverse = Inverse(matrix);
  ASSERT_TRUE(inverse.IsValid());
  for (unsigned i = 0; i < 3; ++i) {
    for (unsigned j = 0; j < 3; ++j) {
      double sum = 0.0;
      for (unsigned k = 0; k < 3; ++k) sum += matrix[i * 3 + k] * inverse[k * 3 + j];
      EXPECT_NEAR(sum, i == j ? 1.0 : 0.0, 1e-9);
    }
  }
  for (double& element : matrix) element = 0.0;
  EXPECT_EQ(Inverse(matrix).GetErrorState().code, MatrixErrorSingular::Code);
}

}  // namespace
}  // namespace lumo
