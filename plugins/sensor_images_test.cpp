// The registration of the plug-in.
#include "contract/lab.h"
#include "tests/support/fake_sensor.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <memory>

namespace quazor {
namespace {

TEST(SensorImagesPlugin, RegistersItsOneExperiment) {
  const QZLab& lab = QZLab::defaultLab();
  ASSERT_TRUE(lab.registrations().empty());
  // Stays loaded, because the lab keeps its factory.
  ASSERT_NE(dlopen(SENSOR_IMAGES_PLUGIN, RTLD_NOW | RTLD_LOCAL), nullptr) << dlerror();
  ASSERT_EQ(lab.registrations().size(), 1U);
  EXPECT_TRUE(lab.refusedNames().empty());
  const QZLab::Registration& registration = lab.registrations().front();
  EXPECT_EQ(registration.kind, QZLab::Kind::kExperiment);
  EXPECT_EQ(registration.name, "NimbeImageExperiment");

  FakeSensor sensor({});
  const Platform before = installedPlatform();
  installPlatform(sensor.platform());
  const std::shared_ptr<QZExperiment> one = registration.makeExperiment();
  const std::shared_ptr<QZExperiment> another = registration.makeExperiment();
  installPlatform(before);
  ASSERT_NE(one, nullptr);
  ASSERT_NE(another, nullptr);
  EXPECT_NE(one, another);
  EXPECT_EQ(one->experimentDescription().summary(), "Stream Nimbe in active mode and capture frames.");
  EXPECT_TRUE(one->setupWithParameters({}, nullptr, nullptr));
}

}  // namespace
}  // namespace quazor
