#include "backends/linux/media/media_graph.h"

#include "backends/linux/media/media_device.h"
#include "backends/linux/media/media_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <random>

namespace quazor {
namespace {

using ::testing::ElementsAre;

std::vector<std::string> namesOf(const std::vector<const MediaEntity*>& entities) {
  std::vector<std::string> names;
  for (const MediaEntity* entity : entities) names.push_back(entity->name);
  return names;
}

std::shared_ptr<MediaDevice> opened(const FakeBoard& board) {
  return MediaDevice::inspect(board.kernel, board.kernel->roots(), board.media, nullptr);
}

TEST(MediaGraphTest, EntitiesHavePadsLinksAndDeviceFiles) {
  const FakeBoard board;
  const auto device = opened(board);
  ASSERT_NE(device, nullptr);
  const MediaGraph& graph = device->graph();
  ASSERT_EQ(graph.entities().size(), 6U);
  ASSERT_EQ(graph.links().size(), 4U);
  const MediaEntity* const camera = graph.entityOfNode(board.camera);
  ASSERT_NE(camera, nullptr);
  EXPECT_EQ(camera->name, "Camera");
  EXPECT_FALSE(camera->isSubdevice);
  const MediaEntity* const scaler = graph.named("Scaler").at(0);
  EXPECT_TRUE(scaler->isSubdevice);
  ASSERT_EQ(scaler->pads.size(), 2U);
  EXPECT_FALSE(scaler->pads[0].isSource);
  EXPECT_TRUE(scaler->pads[1].isSource);
  const MediaLink* const link = graph.link({scaler->id, 1}, {camera->id, 0});
  ASSERT_NE(link, nullptr);
  EXPECT_TRUE(link->isEnabled() && link->isImmutable());
  EXPECT_EQ(graph.link({scaler->id, 0}, {camera->id, 0}), nullptr);
  EXPECT_EQ(graph.entityOfNode({}), nullptr);
}

TEST(MediaGraphTest, UpstreamAreTheEntitiesOverEnabledLinksAndThoseThatBelongToThem) {
  const FakeBoard board;
  board.kernel->with(board.media, [](FakeNode& node) {
    node.media->links[2].flags = MEDIA_LNK_FL_ENABLED;
    node.media->ancillary = {{board::kSensorA, board::kFlash}, {board::kFlash, board::kSensorB}};
    return 0;
  });
  const auto device = opened(board);
  const MediaGraph& graph = device->graph();
  EXPECT_THAT(namesOf(graph.upstreamOf(*graph.entityOfNode(board.camera))),
              ElementsAre("Scaler", "Converter", "Sensor A", "Flash"));
}

TEST(MediaGraphTest, LinksInACircleEnd) {
  MediaTopology topology;
  for (std::uint32_t id = 1; id <= 3; ++id) {
    media_v2_entity entity{};
    entity.id = id;
    topology.entities.push_back(entity);
    media_v2_pad pad{};
    pad.id = 10 + id;
    pad.entity_id = id;
    topology.pads.push_back(pad);
    media_v2_link link{};
    link.source_id = 10 + id;
    link.sink_id = 10 + id % 3 + 1;
    link.flags = MEDIA_LNK_FL_ENABLED;
    topology.links.push_back(link);
  }
  const MediaGraph graph(topology, [](std::uint32_t, std::uint32_t) { return std::filesystem::path(); });
  EXPECT_EQ(graph.upstreamOf(*graph.entity(1)).size(), 2U);
}

// Whatever a driver tells: no object refers to one that is not there.
TEST(MediaGraphTest, ArbitraryTopologiesAreReadToAConsistentGraph) {
  std::mt19937 random(7);
  const auto fill = [&random](auto& items) {
    items.resize(random() % 12);
    for (auto& item : items) {
      auto* const bytes = reinterpret_cast<unsigned char*>(&item);
      for (std::size_t i = 0; i < sizeof item; ++i) bytes[i] = random() % 3 == 0 ? random() % 4 : 0;
    }
  };
  for (int run = 0; run < 2000; ++run) {
    MediaTopology topology;
    fill(topology.entities);
    fill(topology.interfaces);
    fill(topology.pads);
    fill(topology.links);
    const MediaGraph graph(
        topology, [](std::uint32_t major, std::uint32_t) { return std::filesystem::path(major == 0 ? "" : "/dev/x"); });
    for (const MediaLink& link : graph.links()) {
      EXPECT_NE(graph.entity(link.source.entity), nullptr);
      EXPECT_NE(graph.entity(link.sink.entity), nullptr);
    }
    for (const MediaEntity& entity : graph.entities()) {
      for (const MediaEntity* upstream : graph.upstreamOf(entity)) EXPECT_NE(upstream, &entity);
    }
  }
}

}  // namespace
}  // namespace quazor
