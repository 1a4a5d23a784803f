// Shows and changes the state of a video node, for scripts.
//
//   video_control BUS KIND path               the node's path
//   video_control BUS KIND get CONTROL        the control's value
//   video_control BUS KIND set CONTROL VALUE  sets it; a button is pressed, whatever the value
//   video_control BUS KIND free               sets the node's format to what it is: fails while somebody holds buffers
//
// BUS is the bus info of the device, KIND "capture" or "metadata", CONTROL the driver's name for the control. The exit
// code is 0, or 1 after a message on standard error.

#include <linux/videodev2.h>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

namespace {

// An open video node.
class Node {
 public:
  explicit Node(std::filesystem::path path) : path_(std::move(path)), descriptor_(open(path_.c_str(), O_RDWR)) {
    if (descriptor_ < 0) throw std::system_error(errno, std::generic_category(), path_);
  }
  Node(Node&& other) noexcept : path_(std::move(other.path_)), descriptor_(std::exchange(other.descriptor_, -1)) {}
  Node& operator=(Node&&) = delete;
  ~Node() {
    if (descriptor_ >= 0) close(descriptor_);
  }

  const std::filesystem::path& path() const { return path_; }

  // Returns whether the driver supports the request.
  template <typename Argument>
  bool asks(unsigned long request, Argument& argument) const {
    return ioctl(descriptor_, request, &argument) == 0;
  }

  template <typename Argument>
  void demand(unsigned long request, Argument& argument, const char* name) const {
    if (!asks(request, argument)) throw std::system_error(errno, std::generic_category(), name);
  }

 private:
  std::filesystem::path path_;
  int descriptor_;
};

std::uint32_t capabilityOf(std::string_view kind) {
  if (kind == "capture") return V4L2_CAP_VIDEO_CAPTURE | V4L2_CAP_VIDEO_CAPTURE_MPLANE;
  if (kind == "metadata") return V4L2_CAP_META_CAPTURE;
  throw std::invalid_argument("the kind is \"capture\" or \"metadata\", not \"" + std::string(kind) + '"');
}

bool isOf(const Node& node, std::string_view bus, std::uint32_t capability) {
  v4l2_capability found{};
  return node.asks(VIDIOC_QUERYCAP, found) && bus == reinterpret_cast<const char*>(found.bus_info) &&
         (found.device_caps & capability) != 0;
}

Node findNode(std::string_view bus, std::string_view kind) {
  const std::uint32_t capability = capabilityOf(kind);
  for (const auto& entry : std::filesystem::directory_iterator("/dev")) {
    if (!entry.path().filename().string().starts_with("video")) continue;
    Node node(entry.path());
    if (isOf(node, bus, capability)) return node;
  }
  throw std::invalid_argument("there is no " + std::string(kind) + " node at " + std::string(bus));
}

std::uint32_t findControl(const Node& node, std::string_view name) {
  v4l2_query_ext_ctrl control{};
  control.id = V4L2_CTRL_FLAG_NEXT_CTRL;
  while (node.asks(VIDIOC_QUERY_EXT_CTRL, control)) {
    if (name == control.name) return control.id;
    control.id |= V4L2_CTRL_FLAG_NEXT_CTRL;
  }
  throw std::invalid_argument("the node has no control \"" + std::string(name) + '"');
}

v4l2_buf_type bufferTypeOf(const Node& node, std::string_view kind) {
  if (kind != "capture") return V4L2_BUF_TYPE_META_CAPTURE;
  v4l2_capability found{};
  node.demand(VIDIOC_QUERYCAP, found, "VIDIOC_QUERYCAP");
  const bool isSinglePlanar = (found.device_caps & V4L2_CAP_VIDEO_CAPTURE) != 0;
  return isSinglePlanar ? V4L2_BUF_TYPE_VIDEO_CAPTURE : V4L2_BUF_TYPE_VIDEO_CAPTURE_MPLANE;
}

void perform(const std::vector<std::string>& words) {
  if (words.size() < 3)
    throw std::invalid_argument("usage: video_control BUS KIND path|get|set|free [CONTROL [VALUE]]");
  const Node node = findNode(words[0], words[1]);
  const std::string& action = words[2];
  if (action == "path" && words.size() == 3) {
    std::cout << node.path().string() << '\n';
  } else if (action == "free" && words.size() == 3) {
    v4l2_format format{};
    format.type = bufferTypeOf(node, words[1]);
    node.demand(VIDIOC_G_FMT, format, "VIDIOC_G_FMT");
    node.demand(VIDIOC_S_FMT, format, "VIDIOC_S_FMT");
  } else if (action == "get" && words.size() == 4) {
    v4l2_control control{findControl(node, words[3]), 0};
    node.demand(VIDIOC_G_CTRL, control, "VIDIOC_G_CTRL");
    std::cout << control.value << '\n';
  } else if (action == "set" && words.size() == 5) {
    v4l2_control control{findControl(node, words[3]), std::stoi(words[4])};
    node.demand(VIDIOC_S_CTRL, control, "VIDIOC_S_CTRL");
  } else {
    throw std::invalid_argument("there is no such action: " + action);
  }
}

}  // namespace

int main(int count, char** arguments) {
  try {
    perform({arguments + 1, arguments + count});
  } catch (const std::exception& problem) {
    std::cerr << "video_control: " << problem.what() << '\n';
    return EXIT_FAILURE;
  }
  return EXIT_SUCCESS;
}
