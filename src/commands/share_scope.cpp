#include "commands/share_scope.h"

#include "foundation/fault.h"

namespace lumo {
namespace {

thread_local ShareScope* current = nullptr;

}  // namespace

ShareScope* ShareScope::Current() {
  return current;
}

ShareScope::~ShareScope() {
  if (hasEntered_) current = before_;
}

void ShareScope::Enter() {
  hasEntered_ = true;
  before_ = current;
  current = this;
}

bool ShareScope::Begin(const ShareInputs& inputs, const std::string& key) {
  key_ = key;
  file_ = inputs.file;
  files_ = inputs.files;
  if (inputs.hasShare) {
    if (!ReadShare(inputs.share, share_)) return false;
    if (file_.GetLength() == 0 || files_.GetCount() != 0) {
      SetFault("Share goes with ShareFile, and not with ShareFiles");
      return false;
    }
    isShare_ = true;
    Enter();
    return true;
  }
  if (file_.GetLength() != 0) {
    SetFault("ShareFile goes with Share");
    return false;
  }
  if (files_.GetCount() == 0) return true;
  readers_.resize(files_.GetCount());
  Enter();
  return true;
}

ShareReader* ShareScope::In(unsigned share) {
  Input& in = readers_[share];
  if (in.isOpen) return &in.reader;
  in.isOpen = in.reader.Open(files_[share].ToUTF8(), key_, {share, files_.GetCount()});
  return in.isOpen ? &in.reader : nullptr;
}

bool ShareScope::End() {
  if (isShare_) return out_.Write(file_.ToUTF8(), key_, share_);
  for (unsigned i = 0; i < readers_.size(); ++i) {
    // One of whose work nothing was needed, as it was at hand, isn't looked at.
    if (!readers_[i].isOpen || readers_[i].reader.IsAtEnd()) continue;
    SetShareFault(files_[i].ToUTF8());
    return false;
  }
  return true;
}

}  // namespace lumo
