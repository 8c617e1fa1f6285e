#pragma once

#include <memory>
#include <string>
#include <vector>

#include "propertylist/Value.h"
#include "tools/account-settings/AccountStore.h"
#include "tools/account-settings/MergeExplanation.h"

namespace tools {

// Has the account settings library merge three versions of a settings file, by a save onto a
// scratch image in the directory for temporary files. The image is removed with the object; one
// object at a time.
class LibraryMerge {
 public:
  LibraryMerge();
  ~LibraryMerge();
  LibraryMerge(const LibraryMerge&) = delete;
  LibraryMerge& operator=(const LibraryMerge&) = delete;

  // The accounts of a settings file's root, as the library has them after reading it, and as the
  // file has them, which is what it compares with when it saves.
  static AccountVersions accountsOf(const propertylist::Dictionary& root);
  static AccountVersions originalsOf(const propertylist::Dictionary& root);

  // What the library writes when it has `inMemory`, read `original` once, and finds `onDisk`.
  AccountVersions merge(const propertylist::Dictionary& inMemory, const AccountVersions& original,
                        const propertylist::Dictionary& onDisk);

 private:
  std::string _directory;
  ImagePtr _image;
  std::shared_ptr<std::vector<std::string>> _logLines;
  std::unique_ptr<deviceimage::DeviceImageServices> _services;
};

}  // namespace tools
