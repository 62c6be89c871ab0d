#include "foundation/buffer.h"

#include <algorithm>
#include <new>

#include "foundation/fault.h"
#include "foundation/type_code.h"

namespace lumo {

const unsigned BasicBuffer::TypeCode = GloballyUniqueObjectTypeCode("Buffer");

bool BasicBuffer::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

BasicBuffer::BasicBuffer(const String& path, const ArrayDims& dims, unsigned pageSize, Mode mode,
                         unsigned headerSize, unsigned elementSize)
    : dims_(dims), pageSize_(std::max(pageSize, 1U)), mode_(mode), elementSize_(elementSize) {
  Allocate(headerSize);
  if (!HasError()) OpenFile(path.ToUTF8());
  if (!HasError()) ReadHeader();
}

BasicBuffer::~BasicBuffer() {
  Close();
}

bool BasicBuffer::Fail(const ObjectErrorState& error, const std::string& why) {
  SetErrorState(error);
  SetFault(String(why));
  return false;
}

/// True when no error is stored and the file is open.
bool BasicBuffer::IsReady() {
  if (HasError()) return false;
  return file_ != nullptr || Fail(ObjectErrorIO(), "the file of a buffer is not open");
}

void BasicBuffer::Allocate(std::size_t headerSize) {
  const std::size_t elements = std::size_t{pageSize_} + 2 * std::size_t{kMargin};
  window_.reset(new (std::nothrow) unsigned char[elements * elementSize_]);
  if (!window_) {
    Fail(BufferErrorBadBuffer(), "there is no memory for the window of a buffer");
    return;
  }
  try {
    header_.assign(headerSize, 0);
  } catch (const std::bad_alloc&) {
    Fail(BufferErrorBadHeader(), "there is no memory for the header of a buffer");
  }
}

void BasicBuffer::OpenFile(const std::string& path) {
  using platform::RandomAccessFile;
  std::string why;
  const auto access =
      mode_ == kReadOnly ? RandomAccessFile::Access::kRead : RandomAccessFile::Access::kUpdate;
  file_ = RandomAccessFile::Open(path, access, &why);
  if (!file_) {
    file_ = RandomAccessFile::Create(path);  // does nothing to one that is there
  } else if (mode_ == kCreate && !file_->SetSize(0, &why)) {
    file_.reset();
  }
  if (!file_) Fail(ObjectErrorIO(), why);
}

bool BasicBuffer::ReadHeader() {
  if (!IsReady()) return false;
  if (headerIsAway_ && !knownHeader_.empty()) {
    std::copy(knownHeader_.begin(), knownHeader_.end(), header_.begin());
    return true;
  }
  std::string why;
  std::size_t bytes = 0;
  if (!file_->ReadUpTo(0, header_.data(), header_.size(), bytes, &why)) {
    return Fail(ObjectErrorIO(), why);
  }
  if (mode_ != kCreate || bytes == header_.size()) knownHeader_ = header_;
  if (bytes == header_.size()) return true;
  SetErrorState(BufferWarningNoHeaderData());
  return false;
}

bool BasicBuffer::WriteHeader() {
  if (!IsReady()) return false;
  if (mode_ == kReadOnly) {
    SetErrorState(BufferWarningReadOnly());
    return false;
  }
  std::string why;
  if (!file_->Write(0, header_.data(), header_.size(), &why)) {
    SetErrorState(BufferWarningNoHeaderData());
    SetFault(String(why));
    return false;
  }
  knownHeader_ = header_;
  headerIsAway_ = false;
  countIsStale_ = true;
  return true;
}

/// Puts zeros in the place of the header, until WriteHeader.
bool BasicBuffer::TakeHeaderAway() {
  if (headerIsAway_) return true;
  const auto isZero = [](unsigned char byte) { return byte == 0; };
  if (!std::all_of(knownHeader_.begin(), knownHeader_.end(), isZero)) {
    std::string why;
    const std::vector<unsigned char> zeros(header_.size());
    if (!file_->Write(0, zeros.data(), zeros.size(), &why)) return Fail(ObjectErrorIO(), why);
  }
  headerIsAway_ = true;
  return true;
}

void BasicBuffer::ForgetLent() {
  lentFrom_ = UINT64_MAX;
  lentTo_ = 0;
  flushed_.clear();
}

bool BasicBuffer::Flush() {
  if (!IsReady()) return false;
  if (mode_ == kReadOnly) {
    SetErrorState(BufferWarningReadOnly());
    return true;
  }
  if (lentFrom_ >= lentTo_) return true;
  const unsigned char* const first = &window_[InWindowBytes(lentFrom_)];
  const std::size_t bytes = InWindowBytes(lentTo_) - InWindowBytes(lentFrom_);
  const bool isInFile = flushedFrom_ == lentFrom_ && flushed_.size() == bytes &&
                        std::equal(flushed_.begin(), flushed_.end(), first);
  if (isInFile) return true;
  if (!TakeHeaderAway()) return false;
  std::string why;
  if (!file_->Write(PlaceOf(lentFrom_), first, bytes, &why)) return Fail(ObjectErrorIO(), why);
  try {
    flushed_.assign(first, first + bytes);
    flushedFrom_ = lentFrom_;
  } catch (const std::bad_alloc&) {
    flushed_.clear();  // and the next flush writes them once more
  }
  countIsStale_ = true;
  return true;
}

bool BasicBuffer::MoveTo(std::uint64_t index) {
  constexpr std::uint64_t kMost = static_cast<std::uint64_t>(INT64_MAX);
  if (!Flush()) return false;
  const std::uint64_t pageStart = index - index % pageSize_;
  const std::uint64_t reach = std::uint64_t{pageSize_} + kMargin;
  if (pageStart > (kMost - header_.size()) / elementSize_ - reach) {
    return Fail(ObjectErrorIO(),
                file_->Path() + ": no file can hold an element " + std::to_string(index));
  }
  windowStart_ = pageStart > kMargin ? pageStart - kMargin : 0;
  windowCount_ = pageStart + reach - windowStart_;
  ForgetLent();
  if (LoadWindow()) return true;
  windowCount_ = 0;
  return false;
}

bool BasicBuffer::LoadWindow() {
  std::string why;
  std::size_t got = 0;
  const std::size_t bytes = windowCount_ * elementSize_;
  if (!file_->ReadUpTo(PlaceOf(windowStart_), window_.get(), bytes, got, &why)) {
    return Fail(ObjectErrorIO(), why);
  }
  std::fill(&window_[got - got % elementSize_], &window_[bytes], 0);
  return true;
}

std::uint64_t BasicBuffer::Count() {
  if (!Flush()) return 0;
  if (!countIsStale_) return count_;
  std::string why;
  std::uint64_t size = 0;
  if (!file_->GetSize(size, &why)) {
    Fail(ObjectErrorIO(), why);
    return 0;
  }
  count_ = size < header_.size() ? 0 : (size - header_.size()) / elementSize_;
  countIsStale_ = false;
  return count_;
}

bool BasicBuffer::Close() {
  if (!file_) return closedWell_;
  closedWell_ = !HasError();
  if (mode_ != kReadOnly) {
    closedWell_ = Flush() && (!HeaderIsDue() || WriteHeader());
    if (closedWell_ && !file_->HasName()) {
      closedWell_ = Fail(ObjectErrorIO(), file_->Path() + ": the file was deleted or replaced");
    }
  }
  std::string why;
  if (!file_->Close(&why) && closedWell_) closedWell_ = Fail(ObjectErrorIO(), why);
  file_.reset();
  return closedWell_;
}

}  // namespace lumo
