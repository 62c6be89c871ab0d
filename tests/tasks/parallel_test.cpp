#include "tasks/parallel.h"

#include <atomic>
#include <bit>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <numeric>
#include <random>
#include <stdexcept>
#include <thread>

#include "foundation/library.h"
#include "tasks/array_operations.h"
#include "tasks/parallel_ranges.h"
#include "tasks/task_errors.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

template <typename T>
Array<T> MakeArray(const std::vector<T>& values) {
  Array<T> array{ArrayDims(static_cast<unsigned>(values.size()))};
  std::copy(values.begin(), values.end(), array.begin());
  return array;
}

Array<double> MakeMatrix(unsigned rows, unsigned columns, const std::vector<double>& values) {
  Array<double> matrix{ArrayDims(rows, columns)};
  std::copy(values.begin(), values.end(), matrix.begin());
  return matrix;
}

/// Counts the visits of each cell of a box from -4 to 20.
struct Visits {
  static constexpr int kSide = 24;
  std::vector<std::atomic<int>> cells = std::vector<std::atomic<int>>(kSide * kSide * kSide);
  void Add(int i, int j, int k) { ++cells[((i + 4) * kSide + j + 4) * kSide + k + 4]; }
  int Total() const {
    return std::accumulate(cells.begin(), cells.end(), 0,
                           [](int a, const auto& b) { return a + b; });
  }
  bool AllOnce() const {
    return std::ranges::all_of(cells, [](const auto& cell) { return cell <= 1; });
  }
};

TEST(ParallelLoops, VisitEveryIndexOnce) {
  struct Box : ArrayParallelFor3 {
    Box(unsigned a, unsigned b, unsigned c) : ArrayParallelFor3(a, b, c) {}
    void Body(unsigned b0, unsigned e0, unsigned b1, unsigned e1, unsigned b2,
              unsigned e2) override {
      for (unsigned i = b0; i < e0; ++i)
        for (unsigned j = b1; j < e1; ++j)
          for (unsigned k = b2; k < e2; ++k)
            visits.Add(static_cast<int>(i), static_cast<int>(j), static_cast<int>(k));
    }
    Visits visits;
  };
  struct Rectangle : RangeParallelFor2 {
    using RangeParallelFor2::RangeParallelFor2;
    void Body(int b0, int e0, int b1, int e1) override {
      for (int i = b0; i < e0; ++i)
        for (int j = b1; j < e1; ++j) visits.Add(i, j, 0);
    }
    Visits visits;
  };
  struct Line : ArrayParallelFor {
    using ArrayParallelFor::ArrayParallelFor;
    void Body(unsigned begin, unsigned end) override {
      for (unsigned i = begin; i < end; ++i) visits.Add(static_cast<int>(i), 0, 0);
    }
    Visits visits;
  };
  const StandardAbortFlag flag;
  for (const AbortFlag* const abort :
       {static_cast<const AbortFlag*>(nullptr), static_cast<const AbortFlag*>(&flag)}) {
    for (const auto& [a, b, c] : {std::array{20U, 7U, 3U}, {1U, 1U, 1U}, {5U, 0U, 2U}}) {
      Box box(a, b, c);
      RunParallelFor3(box, abort);
      EXPECT_EQ(box.visits.Total(), static_cast<int>(a * b * c));
      EXPECT_TRUE(box.visits.AllOnce());
    }
    for (const unsigned grain : {0U, 1U, 3U, 100U}) {
      Rectangle rectangle(-2, 12, -4, 9);
      RunParallelFor2(rectangle, grain, abort);
      EXPECT_EQ(rectangle.visits.Total(), 14 * 13);
      EXPECT_TRUE(rectangle.visits.AllOnce());
      Line line(17);
      RunParallelFor(line, grain, abort);
      EXPECT_EQ(line.visits.Total(), 17);
      EXPECT_TRUE(line.visits.AllOnce());
    }
  }
}

TEST(ParallelLoops, LeaveOutTheRestAfterAnAbort) {
  struct Line : ArrayParallelFor {
    Line() : ArrayParallelFor(1'000'000) {}
    void Body(unsigned begin, unsigned end) override {
      if ((visited += end - begin) > 100'000) flag.Set(true);
    }
    std::atomic<unsigned> visited{0};
    StandardAbortFlag flag;
  } line;
  RunParallelFor(line, 0, &line.flag);
  EXPECT_LT(line.visited, 150'000U);

  struct Sum : ArrayParallelReduce<double> {
    Sum() : ArrayParallelReduce<double>(1000) {}
    double Identity() override { return 0; }
    void Join(double& left, const double& right) override { left += right; }
    double Accumulate(unsigned begin, unsigned end) override { return end - begin; }
  } sum;
  StandardAbortFlag raised;
  raised.Set(true);
  double total = -1;
  RunParallelReduce(sum, total, &raised);
  EXPECT_EQ(total, 0);
}

TEST(ParallelLoops, LetExceptionsOutAndReportFailures) {
  struct Thrower : ArrayParallelFor {
    Thrower() : ArrayParallelFor(1000) {}
    void Body(unsigned, unsigned) override { throw std::runtime_error("a body threw"); }
  } thrower;
  EXPECT_THROW(RunParallelFor(thrower), std::runtime_error);

  struct Failing : ArrayParallelFor {
    Failing() : ArrayParallelFor(10'000) {}
    void Body(unsigned, unsigned) override {
      if (Failed()) return;
      Fail();
    }
  } failing;
  RunParallelFor(failing, 1);
  EXPECT_EQ(failing.GetErrorState().code, ParallelError::Code);
}

/// Sums doubles whose sum depends on the order of the additions.
struct RoundingSum : ArrayParallelReduce2<double> {
  RoundingSum(unsigned columns, unsigned rows, const std::vector<double>& v)
      : ArrayParallelReduce2<double>(columns, rows), values(v) {}
  double Identity() override { return 0; }
  void Join(double& left, const double& right) override { left += right; }
  double Accumulate(unsigned b0, unsigned e0, unsigned b1, unsigned e1) override {
    double sum = 0;
    for (unsigned j = b1; j < e1; ++j)
      for (unsigned i = b0; i < e0; ++i) sum += values[std::size_t{j} * End0() + i];
    return sum;
  }
  const std::vector<double>& values;
};

TEST(ParallelReduce, GivesTheSameBitsForAnyNumberOfThreads) {
  std::mt19937 random(7);
  std::lognormal_distribution<double> spread(0.0, 8.0);
  std::vector<double> values(700 * 300);
  for (double& value : values) value = spread(random);
  for (const auto& [columns, rows] : {std::pair{700U, 300U}, {210'000U, 1U}, {1U, 210'000U}}) {
    RoundingSum loop(columns, rows, values);
    std::uint64_t expected = 0;
    {
      const ThreadLimit limit(1);
      double sum = 0;
      RunParallelReduce2(loop, sum);
      expected = std::bit_cast<std::uint64_t>(sum);
      EXPECT_NEAR(sum, std::accumulate(values.begin(), values.end(), 0.0), 1e-9 * sum);
    }
    for (const unsigned threads : {2U, 3U, 8U}) {
      const ThreadLimit limit(threads);
      for (int run = 0; run < 10; ++run) {
        double sum = 0;
        RunParallelReduce2(loop, sum);
        ASSERT_EQ(std::bit_cast<std::uint64_t>(sum), expected) << threads << " threads";
      }
    }
  }
}

TEST(ParallelReduce, JoinsLeftToRight) {
  struct Text : ArrayParallelReduce<std::string> {
    Text() : ArrayParallelReduce<std::string>(500) {}
    std::string Identity() override { return {}; }
    void Join(std::string& left, const std::string& right) override { left += right; }
    std::string Accumulate(unsigned begin, unsigned end) override {
      std::string text;
      for (unsigned i = begin; i < end; ++i) text += static_cast<char>('a' + i % 26);
      return text;
    }
  } text;
  std::string expected;
  for (int i = 0; i < 500; ++i) expected += static_cast<char>('a' + i % 26);
  std::string joined = "left over";
  RunParallelReduce(text, joined);
  EXPECT_EQ(joined, expected);

  std::vector<double> nothing;
  RoundingSum empty(0, 5, nothing);
  double sum = 9;
  RunParallelReduce2(empty, sum);
  EXPECT_EQ(sum, 0) << "the identity of an empty range";
}

TEST(ParallelScan, WritesPrefixSums) {
  struct Prefix : ArrayParallelScan<long> {
    explicit Prefix(unsigned count) : ArrayParallelScan<long>(count), out(count) {}
    long Identity() override { return 0; }
    void Join(long& sum, const long& right) override { sum += right; }
    void Assign(long& sum, const long& value) override { sum = value; }
    long PreScan(unsigned begin, unsigned end, const long& sum) override {
      long total = sum;
      for (unsigned i = begin; i < end; ++i) total += i * 3 + 1;
      return total;
    }
    long FinalScan(unsigned begin, unsigned end, const long& sum) override {
      long total = sum;
      for (unsigned i = begin; i < end; ++i) out[i] = total += i * 3 + 1;
      return total;
    }
    std::vector<long> out;
  };
  for (const unsigned count : {0U, 1U, 2U, 63U, 64U, 65U, 1000U}) {
    Prefix prefix(count);
    long sum = -1;
    RunParallelScan(prefix, sum);
    long expected = 0;
    for (unsigned i = 0; i < count; ++i) ASSERT_EQ(prefix.out[i], expected += i * 3 + 1);
    EXPECT_EQ(sum, expected);
  }
}

TEST(ArrayOperations, FindExtremesAndTotals) {
  const auto maxOf = [](const Array<double>& values) {
    ParallelArrayMax<double> loop(values);
    unsigned index = 99;
    RunParallelReduce(loop, index);
    return index;
  };
  EXPECT_EQ(maxOf(MakeArray<double>({2, 7, 1, 7, 7})), 1U);
  EXPECT_EQ(maxOf(MakeArray<double>(std::vector<double>(1000, 4.0))), 0U)
      << "of equal ones the first";
  EXPECT_EQ(maxOf({}), 0U);

  std::vector<Point2D<double>> points(500, {3, 3});
  points[77] = {1, 3};
  points[300] = {9, 4};
  const auto array = MakeArray(points);
  ParallelArrayMinMax<Point2D<double>> minMax(array);
  std::pair<unsigned, unsigned> ends;
  RunParallelReduce(minMax, ends);
  EXPECT_EQ(ends, std::pair(77U, 300U)) << "by y, then by x";

  std::vector<unsigned long long> numbers(12345);
  std::iota(numbers.begin(), numbers.end(), 1ULL << 40);
  const auto numberArray = MakeArray(numbers);
  ParallelArrayTotal<unsigned long long, unsigned long long> total(numberArray);
  unsigned long long sum = 0;
  RunParallelReduce(total, sum);
  EXPECT_EQ(sum, 12345ULL * (1ULL << 40) + 12345ULL * 12344ULL / 2);
}

TEST(ArrayOperations, ListDistinctValues) {
  std::mt19937 random(11);
  for (const unsigned count : {0U, 1U, 5U, 3000U}) {
    std::vector<int> values(count);
    for (int& value : values) value = static_cast<int>(random() % 50);
    std::vector<unsigned> order(count);
    std::iota(order.begin(), order.end(), 0U);
    std::ranges::stable_sort(order, {}, [&](unsigned i) { return values[i]; });
    std::vector<unsigned> expected;
    for (unsigned i = 0; i < count; ++i)
      if (i == 0 || values[order[i]] != values[order[i - 1]]) expected.push_back(order[i]);

    const auto valueArray = MakeArray(values);
    const auto orderArray = MakeArray(order);
    Array<unsigned> out{ArrayDims(count)};
    ParallelArrayUnsortedUnique<int> loop(valueArray, orderArray, out);
    unsigned found = 99;
    RunParallelScan(loop, found);
    ASSERT_EQ(std::vector(out.begin(), out.begin() + found), expected);
  }
}

TEST(ArrayOperations, MultiplyMatricesEachWayRound) {
  const Array<double> a = MakeMatrix(2, 3, {1, 2, 3, 4, 5, 6});
  const Array<double> at = MakeMatrix(3, 2, {1, 4, 2, 5, 3, 6});
  const Array<double> b = MakeMatrix(3, 2, {7, 8, 9, 10, 11, 12});
  const Array<double> bt = MakeMatrix(2, 3, {7, 9, 11, 8, 10, 12});
  const std::vector<double> product{58, 64, 139, 154};
  const struct {
    const Array<double>&a, &b;
    MatrixMode mode;
  } cases[] = {{a, b, MatrixMode::kPlain},
               {at, b, MatrixMode::kTA},
               {a, bt, MatrixMode::kTB},
               {at, bt, MatrixMode::kTAB}};
  for (const auto& c : cases) {
    const Array<double> result = MultiplyMatrices(c.a, c.b, c.mode);
    EXPECT_EQ(std::vector(result.begin(), result.end()), product);
    EXPECT_EQ(result.GetDims(), ArrayDims(2, 2));
  }
  EXPECT_EQ(MultiplyMatrices(a, bt).GetErrorState().code, MatirxErrorBadDims::Code);
  EXPECT_FALSE(MultiplyMatrices(a, {}).IsValid());
}

TEST(ArrayOperations, ApplyAnOperationToEachElement) {
  const auto floors = ApplyToArray<int>(MakeArray<double>({-1.5, 2.9, -0.0}), UnOpClassFloor());
  EXPECT_EQ(std::vector(floors.begin(), floors.end()), (std::vector{-2, 2, 0}));
  const auto bytes = MakeArray<unsigned char>({0, 1, 6});
  const auto ored = ApplyToArray<unsigned char>(bytes, BinOpASClassOr{2});
  EXPECT_EQ(std::vector(ored.begin(), ored.end()), (std::vector<unsigned char>{2, 3, 6}));
  const auto anded = ApplyToArray<unsigned char>(bytes, BinOpASClassAnd{~2});
  EXPECT_EQ(std::vector(anded.begin(), anded.end()), (std::vector<unsigned char>{0, 1, 4}));
}

TEST(ArrayOperations, InterpolateInATable) {
  Array<std::uint8_t> table{ArrayDims(3, 2)};  // element (r, c) is 10 r + 3 c, a plane
  for (unsigned i = 0; i < 6; ++i) table[i] = static_cast<std::uint8_t>(10 * (i / 2) + 3 * (i % 2));
  const struct {
    double x, y, want;
  } cases[] = {{0, 0, 0},     {1.25, 0.5, 14}, {2, 1, 23},  {-4, 0.5, 1.5},
               {7, 1.75, 23}, {0.5, -1, 5},    {1.5, 1, 18}};
  std::vector<double> x;
  std::vector<double> y;
  for (const auto& c : cases) {
    x.push_back(c.x);
    y.push_back(c.y);
  }
  const auto xs = MakeArray(x);
  const auto ys = MakeArray(y);
  Array<double> out;
  ParallelLinearInterpolate2<std::uint8_t> loop(table, xs, ys, out);
  RunParallelFor(loop);
  ASSERT_EQ(out.GetCount(), 7U);
  for (unsigned i = 0; i < 7; ++i) EXPECT_DOUBLE_EQ(out[i], cases[i].want) << i;

  const auto line = MakeArray<std::uint8_t>({1, 2});
  ParallelLinearInterpolate2<std::uint8_t> wrong(line, xs, ys, out);
  RunParallelFor(wrong);
  EXPECT_EQ(wrong.GetErrorState().code, ParallelError::Code);
  EXPECT_EQ(out.GetErrorState().code, ArrayErrorInvalidArray::Code);
}

/// Meets as many threads as there are parts, or gives up after a while.
struct Meeting : ArrayParallelFor {
  using ArrayParallelFor::ArrayParallelFor;
  void Body(unsigned, unsigned) override {
    ++here;
    for (int i = 0; i < 500 && here < End(); ++i) {
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
  }
  std::atomic<unsigned> here{0};
};

// Run by the test below in a process of its own, as the hint is read at load.
TEST(ThreadsHint, DISABLED_MeetsAllThreads) {
  const auto threads = static_cast<unsigned>(GetThreadsHint());
  Meeting meeting(threads);
  const double start = WallSeconds();
  RunParallelFor(meeting, 1);
  EXPECT_EQ(meeting.here, threads);
  EXPECT_LT(WallSeconds() - start, 4.0);  // nobody has given up
}

TEST(ThreadsHint, MayAskForMoreThanThereAreCores) {
  const int threads = GetProcessingCores() + 3;
  const std::string command = "LUMO_THREADS_HINT=" + std::to_string(threads) + " " +
                              std::filesystem::read_symlink("/proc/self/exe").string() +
                              " --gtest_also_run_disabled_tests"
                              " --gtest_filter=ThreadsHint.DISABLED_MeetsAllThreads >/dev/null";
  EXPECT_EQ(std::system(command.c_str()), 0);
}

TEST(ParallelFor, CallsAFunctionOnceForEachNumber) {
  for (const unsigned count : {0U, 1U, 7U, 10'000U}) {
    std::vector<std::atomic<int>> calls(count);
    ParallelFor(count, nullptr, [&](unsigned i) { ++calls[i]; });
    ParallelFor(count, nullptr, [&](unsigned begin, unsigned end) {
      for (unsigned i = begin; i < end; ++i) ++calls[i];
    });
    for (const auto& n : calls) ASSERT_EQ(n, 2);
  }
  StandardAbortFlag abort;
  std::atomic<unsigned> called{0};
  ParallelFor(1'000'000, &abort, [&](unsigned) {
    if (++called == 10) abort.Set(true);
  });
  EXPECT_LT(called, 1'000'000U);
}

}  // namespace
}  // namespace lumo
