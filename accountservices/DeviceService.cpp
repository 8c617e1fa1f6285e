// The device's own service: an ear for the account that keeps data on the device alone. Its full
// account is of the account settings library's own class, which is there before any bundle is.

#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

auto& notifier = kept<ServiceNotifier>("DeviceServiceNotifier");

}  // namespace
}  // namespace accountservices
