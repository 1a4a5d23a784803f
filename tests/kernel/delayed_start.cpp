// Preloaded into a program, delays the start of one camera: VIDIOC_STREAMON for video capture on the device with the
// bus info DELAYED_BUS takes effect DELAYED_MILLISECONDS later.

#include <linux/videodev2.h>

#include <dlfcn.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdlib>
#include <string_view>

namespace {

using Ioctl = int (*)(int, unsigned long, ...);

Ioctl realIoctl() {
  static const auto real = reinterpret_cast<Ioctl>(dlsym(RTLD_NEXT, "ioctl"));
  return real;
}

bool isToBeDelayed(int descriptor) {
  const char* bus = std::getenv("DELAYED_BUS");
  v4l2_capability found{};
  return bus != nullptr && realIoctl()(descriptor, VIDIOC_QUERYCAP, &found) == 0 &&
         std::string_view(bus) == reinterpret_cast<const char*>(found.bus_info);
}

}  // namespace

extern "C" __attribute__((visibility("default"))) int ioctl(int descriptor, unsigned long request, ...) noexcept {
  va_list rest;
  va_start(rest, request);
  void* argument = va_arg(rest, void*);
  va_end(rest);
  if (request == VIDIOC_STREAMON && *static_cast<const int*>(argument) == V4L2_BUF_TYPE_VIDEO_CAPTURE &&
      isToBeDelayed(descriptor)) {
    const char* milliseconds = std::getenv("DELAYED_MILLISECONDS");
    usleep(static_cast<useconds_t>(std::atoi(milliseconds != nullptr ? milliseconds : "0")) * 1000);
  }
  return realIoctl()(descriptor, request, argument);
}
