#include "mosaic/scene_shares.h"

#include "foundation/fault.h"

namespace lumo {

bool SceneShares::Begin(const ShareInputs& inputs, const std::string& key, unsigned scenes) {
  key_ = key;
  scenes_ = scenes;
  isShare_ = inputs.hasShare;
  file_ = inputs.file.ToUTF8();
  for (const String& file : inputs.files) files_.push_back(file.ToUTF8());
  if (isShare_ == file_.empty() || (isShare_ && !files_.empty())) {
    SetFault("Share goes with ShareFile, and not with ShareFiles");
    return false;
  }
  return !isShare_ || ReadShare(inputs.share, share_);
}

bool SceneShares::Find(unsigned scene, ShareReader*& in) {
  in = nullptr;
  while (!files_.empty()) {
    if (opened_ != 0 && !hasNumber_ && !in_.IsAtEnd()) {
      hasNumber_ = in_.Get(number_);
      if (!hasNumber_) {
        SetShareFault(files_[opened_ - 1]);
        return false;
      }
    }
    if (hasNumber_) {
      if (number_ != scene) return true;
      hasNumber_ = false;
      in = &in_;
      return true;
    }
    if (opened_ == files_.size()) return true;
    const Share share{static_cast<unsigned>(opened_), static_cast<unsigned>(files_.size())};
    if (scene < share.Begin(scenes_)) return true;
    if (!in_.Open(files_[opened_++], key_, share)) return false;
  }
  return true;
}

}  // namespace lumo
