// SPDX-License-Identifier: MIT
// A service that does not answer.
#include <gmock/gmock.h>

#include "orvidcore/client_test.h"

namespace orvid::test {
namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

constexpr Timeout kShort = 300ms;
constexpr auto kFarMore = 8s;  // than kShort, on a busy machine; less than any timeout of the transport

/// Runs a call that must end as timed out, neither at once nor long after its timeout.
template <class Call>
void expectTimeout(Call call) {
  const auto begin = Clock::now();
  const auto result = call();
  const auto took = Clock::now() - begin;
  EXPECT_EQ(kindOf(result), ErrorKind::timedOut) << (result.ok() ? "success" : result.error().text);
  EXPECT_GE(took, kShort);
  EXPECT_LT(took, kFarMore);
}

/// The service stands still from pause() to the end of the test at the latest.
class SilentServiceTest : public ClientTest {
 protected:
  ~SilentServiceTest() override { service.goOn(); }
};

TEST_F(SilentServiceTest, ACallOfTheBrowserTimesOutAndWorksAgainLater) {
  service.insertEmptyCard("CARD");
  const DeviceInfo info = waitForDevice("CARD");
  service.pause();
  expectTimeout([&] { return browser->devices(kShort); });
  expectTimeout([&] { return browser->open(info, kShort); });
  service.goOn();
  EXPECT_TRUE(browser->devices().ok());
  EXPECT_TRUE(browser->open(info).ok());
}

TEST_F(SilentServiceTest, CallsOfADeviceTimeOutAndWorkAgainLater) {
  const Object object = onlyFile("0123456789");
  service.pause();
  expectTimeout([&] { return device->start(kShort); });
  expectTimeout([&] { return object.read(0, 10, kShort); });
  expectTimeout([&] { return object.metadata(kShort); });
  expectTimeout([&] { return object.save(service.besides("saved"), nullptr, kShort); });
  service.goOn();
  EXPECT_EQ(object.read(0, 10)->text(), "0123456789");
}

TEST_F(SilentServiceTest, ACatalogueThatIsNotAnsweredTimesOutAndCanBeAskedForAgain) {
  service.insertEmptyCard("CARD");
  device = open("CARD");
  ASSERT_TRUE(device->start().ok());
  service.pause();
  expectTimeout([&] { return device->catalogue(kShort); });
  service.goOn();
  const auto objects = device->catalogue();
  ASSERT_TRUE(objects.ok()) << objects.error().text;
  EXPECT_THAT(*objects, testing::SizeIs(1));
}

TEST_F(SilentServiceTest, AsynchronousCallsTimeOut) {
  const Object object = onlyFile("0123456789");
  service.pause();
  Outcome<Data> bytes;
  Outcome<Done> removed;
  Outcome<std::vector<DeviceInfo>> devices;
  object.readAsync(0, 10, bytes.callback(), kShort);
  object.removeAsync(removed.callback(), kShort);
  browser->devicesAsync(devices.callback(), kShort);
  EXPECT_EQ(kindOf(bytes.get()), ErrorKind::timedOut);
  EXPECT_EQ(kindOf(removed.get()), ErrorKind::timedOut);
  EXPECT_EQ(kindOf(devices.get()), ErrorKind::timedOut);
  service.goOn();
  EXPECT_TRUE(waitUntil([&] { return object.remove().ok(); }));
  EXPECT_EQ(bytes.calls() + removed.calls() + devices.calls(), 3u) << "the late answers call nobody";
}

TEST_F(SilentServiceTest, ManyCallsThatWaitTimeOutTogether) {
  const Object object = onlyFile("0123456789");
  service.pause();
  const auto begin = Clock::now();
  std::vector<Outcome<Data>> outcomes(200);
  for (auto& outcome : outcomes) object.readAsync(0, 10, outcome.callback(), kShort);
  EXPECT_THAT(kindsOf(outcomes), testing::Each(ErrorKind::timedOut));
  EXPECT_LT(Clock::now() - begin, kFarMore);
}

TEST_F(SilentServiceTest, CallsOnAConnectionMadeToAStoppedServiceTimeOutToo) {
  service.pause();
  auto late = DeviceBrowser::connect(service.address(), kShort);
  ASSERT_TRUE(late.ok()) << "the system accepts for it";
  expectTimeout([&] { return (*late)->devices(kShort); });
}

TEST_F(SilentServiceTest, EveryCallThatCouldNotEvenBeSentTimesOut) {
  service.pause();
  auto late = DeviceBrowser::connect(service.address(), kShort);
  ASSERT_TRUE(late.ok()) << "the system accepts for it";
  std::vector<Outcome<std::vector<DeviceInfo>>> outcomes(2000);
  const auto begin = Clock::now();
  for (auto& outcome : outcomes) (*late)->devicesAsync(outcome.callback(), kShort);
  EXPECT_THAT(kindsOf(outcomes), testing::Each(ErrorKind::timedOut));
  EXPECT_LT(Clock::now() - begin, kFarMore);
}

}  // namespace
}  // namespace orvid::test
