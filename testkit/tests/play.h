// Lets the tests' plug-in and a kit talk to each other.
#ifndef TESTKIT_TESTS_PLAY_H
#define TESTKIT_TESTS_PLAY_H

#include <string>
#include <utility>
#include <vector>

#include "plugin.h"
#include "qel-testkit.h"

// What the plug-in sent and received.
struct Spoken {
  bool was_sent;
  std::string message;
  std::string bytes;
  bool operator==(const Spoken& other) const {
    return was_sent == other.was_sent && message == other.message && bytes == other.bytes;
  }
};

class Play {
 public:
  // The kit is the play's.
  explicit Play(qel_testkit_t* kit, bug_t bug = BUG_NONE, manner_t manner = ONE_BY_ONE,
                int left_out = 0)
      : kit_(kit) {
    plugin_.manner = manner;
    plugin_.bug = bug;
    plugin_.left_out = left_out;
    plugin_.context = this;
    plugin_.send = [](void* play, const char* message, const unsigned char* data, int size) {
      static_cast<Play*>(play)->send(message, data, size);
    };
  }
  ~Play() { qel_testkit_release(kit_); }
  Play(const Play&) = delete;
  Play& operator=(const Play&) = delete;

  // Returns the report.
  std::string run() {
    qel_testkit_delivery_t delivery;
    plugin_start(&plugin_);
    for (;;) {
      if (qel_testkit_next(kit_, &delivery)) {
        note(false, delivery.message, delivery.data, delivery.size);
        plugin_receive(&plugin_, delivery.message, delivery.data, delivery.size);
      } else if (plugin_timer(&plugin_) > 0 || delivery.after_ms > 0) {
        wait(delivery.after_ms);
      } else {
        break;
      }
    }
    qel_testkit_end(kit_);
    return qel_testkit_report(kit_);
  }

  const std::vector<Spoken>& spoken() const { return spoken_; }

 private:
  void send(const char* message, const unsigned char* data, int size) {
    note(true, message, data, size);
    qel_testkit_sent(kit_, message, data, size);
  }

  void note(bool was_sent, const char* message, const unsigned char* data, int size) {
    spoken_.push_back(
        {was_sent, message,
         std::string(reinterpret_cast<const char*>(data), static_cast<size_t>(size))});
  }

  // Until something comes, or the plug-in has waited long enough.
  void wait(int64_t after_ms) {
    const int timer = plugin_timer(&plugin_);
    const bool is_plugin_first = timer > 0 && (after_ms < 0 || timer < after_ms);
    const int64_t milliseconds = is_plugin_first ? timer : after_ms;
    qel_testkit_wait(kit_, milliseconds);
    plugin_wait(&plugin_, static_cast<int>(milliseconds));
  }

  qel_testkit_t* kit_;
  plugin_t plugin_{};
  std::vector<Spoken> spoken_;
};

#endif
