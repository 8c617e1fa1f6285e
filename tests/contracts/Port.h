#pragma once

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <string>

// The contracts of the platform's interfaces: what the headers in platform/ promise, as tests that
// any implementation can be run through. Whoever ports the platform writes, for each interface,
//
//   1. a class derived from that contract's ...UnderTest, which makes one fresh device, gives the
//      service and lets the tests prepare the device and look at it past the service;
//   2. in one source of a test program, linked to platform_contracts:
//
//        #include "tests/contracts/SyncDataSourceContract.h"
//        INSTANTIATE_TEST_SUITE_P(MyPort, SyncDataSourceContract,
//                                 testing::Values(portOf<MySyncDataSource>("MyPort")));
//
// A contract's header holds its tests, so one program includes it in one source only. Each test
// gets a device of its own. tests/platform/ has the in-memory services as a worked example.
template <typename UnderTest>
struct Port {
  std::string name;
  std::function<std::unique_ptr<UnderTest>()> makeDevice;

  friend std::ostream& operator<<(std::ostream& out, const Port& port) { return out << port.name; }
};

// The fixture of a contract: `device` is what the port made for this test.
template <typename UnderTest>
class Contract : public testing::TestWithParam<Port<UnderTest>> {
 protected:
  const std::unique_ptr<UnderTest> device = this->GetParam().makeDevice();
};

// A port whose device is an object of `Device`, made without arguments.
template <typename Device>
struct PortOf {
  std::string name;
  template <typename UnderTest>
  operator Port<UnderTest>() const {  // NOLINT(google-explicit-constructor): deduces the contract
    return {name, [] { return std::make_unique<Device>(); }};
  }
};
template <typename Device>
PortOf<Device> portOf(std::string name) {
  return {std::move(name)};
}
