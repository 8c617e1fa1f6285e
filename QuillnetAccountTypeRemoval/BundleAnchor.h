#pragma once

namespace accountsettings {

// An address in the code of this library: names the bundle whose resources the library reads.
const void* bundleAnchor();

}  // namespace accountsettings
