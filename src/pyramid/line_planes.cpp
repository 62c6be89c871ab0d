#include "pyramid/line_planes.h"

#include "foundation/packing.h"

namespace lumo {

void PutPlane(ShareWriter& out, std::span<const unsigned char> bytes, unsigned numberBytes) {
  RawBytes apart, packed;
  apart.Resize(bytes.size());
  const std::size_t count = bytes.size() / numberBytes;
  for (unsigned byte = 0; byte < numberBytes; ++byte) {
    unsigned char* const to = apart.Get() + byte * count;
    for (std::size_t i = 0; i < count; ++i) to[i] = bytes[i * numberBytes + byte];
  }
  PackBytes(Packing::kLz4, apart.All(), packed);
  const std::span<const unsigned char> stored = packed.Count() != 0 ? packed.All() : apart.All();
  out.Put(std::uint64_t{stored.size()});
  out.PutAll(stored.data(), stored.size());
}

bool GetPlane(ShareReader& in, std::span<unsigned char> bytes, unsigned numberBytes) {
  std::uint64_t size = 0;
  if (!in.Get(size) || size > in.Left() || !MayUnpackTo(Packing::kLz4, size, bytes.size())) {
    return false;
  }
  RawBytes apart, packed;
  packed.Resize(size);
  apart.Resize(bytes.size());
  if (!in.GetAll(packed.Get(), size) || !UnpackBytes(packed.All(), apart.All())) return false;
  const std::size_t count = bytes.size() / numberBytes;
  for (unsigned byte = 0; byte < numberBytes; ++byte) {
    const unsigned char* const from = apart.Get() + byte * count;
    for (std::size_t i = 0; i < count; ++i) bytes[i * numberBytes + byte] = from[i];
  }
  return true;
}

}  // namespace lumo
