#include "foundation/object.h"

#include <algorithm>
#include <sstream>
#include <thread>

#include "commands/command_errors.h"
#include "data/data_errors.h"
#include "foundation/containers.h"
#include "foundation/errors.h"
#include "foundation/library.h"
#include "foundation/pointer.h"
#include "foundation/scalar.h"
#include "foundation/type_code.h"
#include "fx/region_errors.h"
#include "geometry/polygon_errors.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace {

class Side {
 public:
  virtual ~Side() = default;
  int padding = 7;
};

/// An Object that does not lie at the head of its class, and counts how many are alive.
class Counted : public Side, public Object {
 public:
  static const unsigned TypeCode;
  Counted() { ++alive; }
  ~Counted() override { --alive; }
  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }
  static int alive;
  int value = 42;
};
const unsigned Counted::TypeCode = GloballyUniqueObjectTypeCode("Counted");
int Counted::alive = 0;

class Other : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || Object::IsA(typeCode);
  }
};
const unsigned Other::TypeCode = GloballyUniqueObjectTypeCode("Other");

TEST(ErrorState, OnlyAnErrorMakesInvalid) {
  Object object;
  object.SetErrorState(ObjectErrorState(77));
  EXPECT_TRUE(object.IsValid());
  EXPECT_EQ(object.GetErrorState().code, 77U);
  object.SetErrorState(BufferWarningReadOnly());
  EXPECT_TRUE(object.IsValid());
  EXPECT_EQ(object.GetErrorState().severity, 2U);
  object.SetErrorState(ObjectErrorIO());
  EXPECT_FALSE(object.IsValid());
  EXPECT_EQ(object.GetErrorState().code, ObjectErrorIO::Code);
  object.ClearErrorState();
  EXPECT_TRUE(object.IsValid());
  EXPECT_EQ(object.GetErrorState().code, 0U);
}

TEST(ErrorState, EveryClassHasACodeOfItsOwnFromOneUp) {
  std::vector<unsigned> codes = {ObjectErrorOutOfMemory::Code,
                                 ObjectErrorNotConstructed::Code,
                                 ObjectErrorIO::Code,
                                 AsyncErrorExecuteFailed::Code,
                                 CommandErrorFail::Code,
                                 ParallelError::Code,
                                 TaskError::Code,
                                 TaskErrorBadArgs::Code,
                                 TaskErrorBadParams::Code,
                                 ArgListError::Code,
                                 ArrayErrorInvalidArray::Code,
                                 BufferErrorBadBuffer::Code,
                                 BufferErrorBadHeader::Code,
                                 BufferWarningNoHeaderData::Code,
                                 BufferWarningReadOnly::Code,
                                 RegionAttributeErrorBadAllocation::Code,
                                 PolygonErrorBadPolygon::Code,
                                 MatrixErrorSingular::Code,
                                 MatirxErrorBadDims::Code,
                                 DcSrvErrorNoThread::Code,
                                 RasterReaderErrorInvalid::Code,
                                 VectorReaderErrorInvalid::Code};
  std::sort(codes.begin(), codes.end());
  EXPECT_EQ(codes.front(), 1U);
  EXPECT_EQ(std::adjacent_find(codes.begin(), codes.end()), codes.end());
}

TEST(TypeCode, FollowsTheName) {
  EXPECT_EQ(GloballyUniqueObjectTypeCode("Object"), Object::TypeCode);
  EXPECT_EQ(Scalar<int>::TypeCode, Scalar<String>::TypeCode);
  const unsigned fresh = GloballyUniqueObjectTypeCode("never seen before");
  EXPECT_EQ(GloballyUniqueObjectTypeCode("never seen before"), fresh);
  EXPECT_EQ(GloballyUniqueObjectTypeCode("never seen before either"), fresh + 1);
}

TEST(Object, HasItsAddressAsURI) {
  const Object object;
  std::ostringstream want;
  want << "{Object}@" << std::hex << reinterpret_cast<std::uintptr_t>(&object);
  EXPECT_EQ(object.GetURI().ToUTF8(), want.str());
}

TEST(Pointer, DeletesWithTheLastThatShares) {
  {
    const Pointer<Counted> first(new Counted);
    {
      const Pointer<Counted> second(first);
      EXPECT_EQ(first.GetCount(), 2U);
      Pointer<Counted> third(new Counted);
      third = second;
      EXPECT_EQ(Counted::alive, 1);
      third.Reset(new Counted);
      EXPECT_EQ(Counted::alive, 2);
    }
    EXPECT_EQ(first.GetCount(), 1U);
    EXPECT_EQ(Counted::alive, 1);
  }
  EXPECT_EQ(Counted::alive, 0);
}

TEST(Pointer, LeavesWhatItDoesNotOwn) {
  Counted object;
  { const ObjectPtr wrapped = Pointer<Counted>(&object, true); }
  EXPECT_EQ(Counted::alive, 1);
}

TEST(Pointer, CastsByTypeCodeAndSharesTheBlock) {
  const Pointer<Counted> counted(new Counted);
  const ObjectPtr object(counted);
  EXPECT_EQ(counted.GetCount(), 2U);
  EXPECT_EQ(object.Get(), static_cast<Object*>(counted.Get()));

  const Pointer<Counted> back(object);
  EXPECT_EQ(back.Get(), counted.Get());
  EXPECT_EQ(back->value, 42);
  EXPECT_EQ(counted.GetCount(), 3U);

  const Pointer<Other> other(object);
  EXPECT_TRUE(other.IsNull());
  EXPECT_EQ(other.GetCount(), 1U);
  EXPECT_EQ(counted.GetCount(), 3U);
}

TEST(Pointer, AnEmptyOneHasABlockToShare) {
  const ObjectPtr empty;
  const ObjectPtr copy(empty);
  EXPECT_TRUE(copy.IsNull());
  EXPECT_EQ(empty.GetCount(), 2U);
  EXPECT_TRUE(copy == empty);
  EXPECT_FALSE(ObjectPtr() == empty);
  EXPECT_TRUE((Pointer<Counted>(empty).IsNull()));
}

TEST(Pointer, IsSafeToAssignFromInsideItsOwnObject) {
  struct Node : Object {
    Pointer<Node> next;
  };
  Pointer<Node> head(new Node);
  head->next.Reset(new Node);
  head = head->next;  // destroys the node that holds the source
  EXPECT_FALSE(head.IsNull());
  EXPECT_TRUE(head->next.IsNull());
  const Pointer<Node>& same = head;
  head = same;
  EXPECT_FALSE(head.IsNull());
}

TEST(Pointer, CountsExactlyOnManyThreads) {
  const Pointer<Counted> shared(new Counted);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([shared] {
      for (int k = 0; k < 10000; ++k) const ObjectPtr copy(shared);
    });
  }
  for (std::thread& thread : threads) thread.join();
  threads.clear();
  EXPECT_EQ(shared.GetCount(), 1U);
}

TEST(Library, IsReadyAndStaysSoWhenInitialisedTwice) {
  VEXInit();
  VEXInit();
  EXPECT_GE(GetProcessingCores(), 1);
  const double before = WallSeconds();
  EXPECT_GE(before, 0.0);
  EXPECT_GE(WallSeconds(), before);
}

}  // namespace
}  // namespace lumo
