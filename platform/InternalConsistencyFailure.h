#pragma once

#include <stdexcept>
#include <string>

#include "platform/Export.h"

namespace platform {

// A broken installation or a mistake of the system's own: a missing resource, a class that cannot
// be found, a caller that breaks an operation's terms. Never raised for what the settings file may
// hold. It ends the operation that raised it; the plug-in catches it nowhere, the host does at the
// bundle's border.
class PLATFORM_EXPORT InternalConsistencyFailure : public std::runtime_error {
 public:
  // `sourceFile` is the bare name of the source that raised ("ASSBasicAccount"), `line` its line.
  InternalConsistencyFailure(const std::string& message, std::string sourceFile, int line);
  ~InternalConsistencyFailure() override;
  const std::string& sourceFile() const { return _sourceFile; }
  int line() const { return _line; }

 private:
  std::string _sourceFile;
  int _line;
};

}  // namespace platform
