#include "gdal_common/hdf5_files.h"

#include <filesystem>
#include <hdf5.h>
#include <vector>

#include "data/access_policy.h"
#include "gdal_common/messages.h"

namespace lumo::gdal {
namespace {

namespace fs = std::filesystem;

/// Closes an object of the HDF5 library.
class Handle {
 public:
  Handle(hid_t id, herr_t (*close)(hid_t)) : id_(id), close_(close) {}
  ~Handle() {
    if (id_ >= 0) close_(id_);
  }
  Handle(const Handle&) = delete;
  Handle& operator=(const Handle&) = delete;
  hid_t Get() const { return id_; }
  bool IsOpen() const { return id_ >= 0; }

 private:
  const hid_t id_;
  herr_t (*const close_)(hid_t);
};

using Names = std::vector<std::string>;

void CollectOfDataset(hid_t parent, const char* name, Names& names) {
  const Handle dataset(H5Dopen2(parent, name, H5P_DEFAULT), H5Dclose);
  if (!dataset.IsOpen()) return;
  const Handle plan(H5Dget_create_plist(dataset.Get()), H5Pclose);
  if (!plan.IsOpen()) return;
  std::vector<char> text(4096);
  const int externals = H5Pget_external_count(plan.Get());
  for (int i = 0; i < externals; ++i) {
    off_t offset = 0;
    hsize_t size = 0;
    if (H5Pget_external(plan.Get(), static_cast<unsigned>(i), text.size() - 1, text.data(), &offset,
                        &size) >= 0) {
      names.emplace_back(text.data());
    }
  }
  std::size_t sources = 0;
  if (H5Pget_layout(plan.Get()) != H5D_VIRTUAL || H5Pget_virtual_count(plan.Get(), &sources) < 0) {
    return;
  }
  for (std::size_t i = 0; i < sources; ++i) {
    if (H5Pget_virtual_filename(plan.Get(), i, text.data(), text.size() - 1) >= 0) {
      names.emplace_back(text.data());
    }
  }
}

herr_t VisitObject(hid_t parent, const char* name, const H5O_info_t* info, void* names) {
  if (info->type == H5O_TYPE_DATASET) CollectOfDataset(parent, name, *static_cast<Names*>(names));
  return 0;
}

herr_t VisitLink(hid_t parent, const char* name, const H5L_info_t* info, void* names) {
  if (info->type != H5L_TYPE_EXTERNAL) return 0;
  std::vector<char> value(info->u.val_size + 1);
  const char* file = nullptr;
  const char* place = nullptr;
  unsigned flags = 0;
  if (H5Lget_val(parent, name, value.data(), value.size(), H5P_DEFAULT) >= 0 &&
      H5Lunpack_elink_val(value.data(), info->u.val_size, &flags, &file, &place) >= 0) {
    static_cast<Names*>(names)->emplace_back(file);
  }
  return 0;
}

/// @param depth  files that led here; one may lead back to itself.
bool MayReachNamed(const std::string& path, int depth) {
  constexpr int kDeepest = 16;
  SilenceHdf5();
  if (depth == kDeepest) return FailWith(path, "named by too long a chain of files");
  if (!MayReachFile(path, false)) return false;
  if (H5Fis_hdf5(path.c_str()) <= 0) return true;
  const Handle file(H5Fopen(path.c_str(), H5F_ACC_RDONLY, H5P_DEFAULT), H5Fclose);
  if (!file.IsOpen()) return FailWith(path, "the HDF5 library can't open it");
  Names names;
  if (H5Ovisit2(file.Get(), H5_INDEX_NAME, H5_ITER_NATIVE, VisitObject, &names, H5O_INFO_BASIC) <
          0 ||
      H5Lvisit(file.Get(), H5_INDEX_NAME, H5_ITER_NATIVE, VisitLink, &names) < 0) {
    return FailWith(path, "what it names can't be listed");
  }
  const fs::path folder = fs::path(path).parent_path();
  for (const std::string& name : names) {
    // "." is the file itself. A relative name may count from either folder.
    if (name == ".") continue;
    std::error_code missing;
    for (const std::string& named : {name, (folder / name).string()}) {
      if (!fs::exists(named, missing)) continue;
      if (fs::equivalent(named, path, missing)) continue;
      if (!MayReachNamed(named, depth + 1)) return false;
    }
  }
  return true;
}

}  // namespace

void SilenceHdf5() {
  // The library keeps the setting for each thread.
  thread_local const herr_t isSilent = H5Eset_auto2(H5E_DEFAULT, nullptr, nullptr);
  static_cast<void>(isSilent);
}

bool MayReachHdf5Files(const std::string& path) {
  return MayReachNamed(path, 0);
}

}  // namespace lumo::gdal
