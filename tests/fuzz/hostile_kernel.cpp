#include "tests/fuzz/hostile_kernel.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <vector>

namespace quazor {
namespace {

constexpr std::array kNumbers{EINVAL, EIO,    ENODEV, ENOTTY, EBUSY,  EACCES,    ENOSPC, EPIPE,
                              ENOMEM, ERANGE, EAGAIN, EPERM,  ENOENT, ETIMEDOUT, EDOM,   EOVERFLOW};

// The error number of what has no room, as in the kernel.
template <class Item>
int copyTo(std::uint64_t address, std::uint32_t& room, const std::vector<Item>& items) {
  const bool fits = address == 0 || room >= items.size();
  if (address != 0 && fits) std::ranges::copy(items, reinterpret_cast<Item*>(static_cast<std::uintptr_t>(address)));
  room = static_cast<std::uint32_t>(items.size());
  return fits ? 0 : ENOSPC;
}

}  // namespace

int HostileKernel::tell(media_v2_topology& asked) const {
  asked.topology_version = 1;
  int result = copyTo(asked.ptr_entities, asked.num_entities, topology->entities);
  if (result == 0) result = copyTo(asked.ptr_interfaces, asked.num_interfaces, topology->interfaces);
  if (result == 0) result = copyTo(asked.ptr_pads, asked.num_pads, topology->pads);
  return result == 0 ? copyTo(asked.ptr_links, asked.num_links, topology->links) : result;
}

// As the kernel does it: only MEDIA_LNK_FL_ENABLED changes, and only of links that may change.
int HostileKernel::setUp(const media_link_desc& wanted) {
  const auto isAt = [this](std::uint32_t id, const media_pad_desc& place) {
    const auto pad = std::ranges::find_if(topology->pads, [id](const media_v2_pad& one) { return one.id == id; });
    return pad != topology->pads.end() && pad->entity_id == place.entity && pad->index == place.index;
  };
  for (media_v2_link& link : topology->links) {
    if (!isAt(link.source_id, wanted.source) || !isAt(link.sink_id, wanted.sink)) continue;
    const std::uint32_t enabled = MEDIA_LNK_FL_ENABLED;
    const bool isFixed = (link.flags & MEDIA_LNK_FL_IMMUTABLE) != 0;
    if ((link.flags & ~enabled) != (wanted.flags & ~enabled) || (isFixed && link.flags != wanted.flags)) return EINVAL;
    link.flags = wanted.flags;
    return 0;
  }
  return EINVAL;
}

void HostileKernel::damageBytes(void* at, std::size_t size) {
  if (size == 0) return;
  auto* const bytes = static_cast<std::uint8_t*>(at);
  const std::size_t begin = input_.number() % size;
  const std::size_t count = 1 + input_.byte() % 8;
  for (std::size_t i = begin; i < size && i < begin + count; ++i) bytes[i] = input_.byte();
}

void HostileKernel::damage(unsigned long request, void* argument) {
  const std::size_t size = _IOC_SIZE(request);
  switch (request) {
    case VIDIOC_G_EXT_CTRLS:
    case VIDIOC_S_EXT_CTRLS: {
      const auto& list = *static_cast<const v4l2_ext_controls*>(argument);
      return damageBytes(list.controls, sizeof(v4l2_ext_control) * list.count);
    }
    case VIDIOC_QUERYBUF:
    case VIDIOC_QBUF:
    case VIDIOC_DQBUF: {
      auto& buffer = *static_cast<v4l2_buffer*>(argument);
      v4l2_plane* const planes = buffer.m.planes;
      const bool hasPlanes = buffer.type == V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE && planes != nullptr;
      if (hasPlanes && input_.byte() % 2 == 0) return damageBytes(planes, sizeof(v4l2_plane) * VIDEO_MAX_PLANES);
      damageBytes(argument, size);
      if (hasPlanes) buffer.m.planes = planes;
      return;
    }
    case MEDIA_IOC_G_TOPOLOGY: {
      auto& told = *static_cast<media_v2_topology*>(argument);
      const media_v2_topology asked = told;  // with the number of what was copied
      const auto part = [this](std::uint64_t address, std::size_t bytes) {
        if (address != 0) damageBytes(reinterpret_cast<void*>(static_cast<std::uintptr_t>(address)), bytes);
      };
      switch (input_.byte() % 5) {
        case 0: part(asked.ptr_entities, asked.num_entities * sizeof(media_v2_entity)); break;
        case 1: part(asked.ptr_interfaces, asked.num_interfaces * sizeof(media_v2_interface)); break;
        case 2: part(asked.ptr_pads, asked.num_pads * sizeof(media_v2_pad)); break;
        case 3: part(asked.ptr_links, asked.num_links * sizeof(media_v2_link)); break;
        default:
          damageBytes(argument, size);
          told.ptr_entities = asked.ptr_entities;
          told.ptr_interfaces = asked.ptr_interfaces;
          told.ptr_pads = asked.ptr_pads;
          told.ptr_links = asked.ptr_links;
      }
      return;
    }
    default: damageBytes(argument, size);
  }
}

int HostileKernel::answer(int descriptor, unsigned long request, void* argument) {
  if (topology && request == MEDIA_IOC_G_TOPOLOGY) return -tell(*static_cast<media_v2_topology*>(argument));
  if (topology && request == MEDIA_IOC_SETUP_LINK) return -setUp(*static_cast<const media_link_desc*>(argument));
  return FakeV4l2Api::ioctl(descriptor, request, argument);
}

int HostileKernel::ioctl(int descriptor, unsigned long request, void* argument) {
  ++calls_;
  const int result = answer(descriptor, request, argument);
  const std::uint8_t choice = input_.byte();
  if (choice < 0xC0) return result;
  if (choice < 0xD0) return -kNumbers.at(choice & 0xF);
  damage(request, argument);
  return choice < 0xF0 ? result : 0;
}

}  // namespace quazor
