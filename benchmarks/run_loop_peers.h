// The run loops in run_loop_benchmark: ours, the one that also waits for descriptors, and GLib's main loop.
#pragma once

#include "backends/linux/system/descriptor_run_loop.h"
#include "backends/threads/thread_run_loop.h"

#include <glib.h>

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <utility>
#include <vector>

namespace quazor {

// Sources with one handler on a loop of the constructing thread. All calls on that thread, except signal and stop.
class LoopWithSources {
 public:
  LoopWithSources(RunLoop& loop, const std::function<void()>& handler, std::size_t sources) : loop_(loop) {
    for (std::size_t i = 0; i < sources; ++i) {
      sources_.push_back(loop_.makeSource(handler));
      loop_.addSource(sources_.back(), kRunLoopDefaultMode);
    }
  }
  LoopWithSources(const LoopWithSources&) = delete;
  LoopWithSources& operator=(const LoopWithSources&) = delete;
  ~LoopWithSources() {
    for (const auto& source : sources_) loop_.removeSource(source, kRunLoopDefaultMode);
  }

  void signal(std::size_t source = 0) { sources_[source]->signal(); }
  void stop() { loop_.stop(); }
  // Runs until stop().
  void run() { loop_.runInMode(kRunLoopDefaultMode, std::chrono::nanoseconds::max(), false); }
  // Runs until a source was handled.
  void runOnce() { loop_.runInMode(kRunLoopDefaultMode, std::chrono::nanoseconds::max(), true); }

 private:
  RunLoop& loop_;
  std::vector<std::shared_ptr<RunLoopSource>> sources_;
};

class QuazorLoop : public LoopWithSources {
 public:
  explicit QuazorLoop(const std::function<void()>& handler, std::size_t sources = 1)
      : LoopWithSources(*ThreadRunLoops().currentRunLoop(), handler, sources) {}
};

class DescriptorLoop : public LoopWithSources {
 public:
  explicit DescriptorLoop(const std::function<void()>& handler, std::size_t sources = 1)
      : LoopWithSources(*makeLinuxRunLoops()->currentRunLoop(), handler, sources) {}
};

// The same with GLib. Setting a source's ready time is GLib's cheapest signal for a permanent source.
class GLibLoop {
 public:
  explicit GLibLoop(std::function<void()> handler, std::size_t sources = 1)
      : handler_(std::move(handler)), context_(g_main_context_new()), loop_(g_main_loop_new(context_, FALSE)) {
    for (std::size_t i = 0; i < sources; ++i) {
      sources_.push_back(g_source_new(&functions_, sizeof(GSource)));
      g_source_set_callback(sources_.back(), &GLibLoop::handle, this, nullptr);
      g_source_attach(sources_.back(), context_);
    }
  }
  GLibLoop(const GLibLoop&) = delete;
  GLibLoop& operator=(const GLibLoop&) = delete;
  ~GLibLoop() {
    for (GSource* const source : sources_) {
      g_source_destroy(source);
      g_source_unref(source);
    }
    g_main_loop_unref(loop_);
    g_main_context_unref(context_);
  }

  void signal(std::size_t source = 0) { g_source_set_ready_time(sources_[source], 0); }
  void stop() { g_main_loop_quit(loop_); }
  void run() { g_main_loop_run(loop_); }
  void runOnce() {
    handled_ = false;
    while (!handled_) g_main_context_iteration(context_, TRUE);
  }

 private:
  static gboolean dispatch(GSource* source, GSourceFunc callback, gpointer data) {
    g_source_set_ready_time(source, -1);
    return callback(data);
  }
  static gboolean handle(gpointer data) {
    auto* const self = static_cast<GLibLoop*>(data);
    self->handled_ = true;
    self->handler_();
    return G_SOURCE_CONTINUE;
  }

  static inline GSourceFuncs functions_ = {nullptr, nullptr, &GLibLoop::dispatch, nullptr, nullptr, nullptr};

  std::function<void()> handler_;
  GMainContext* context_;
  GMainLoop* loop_;
  std::vector<GSource*> sources_;
  bool handled_ = false;
};

}  // namespace quazor
