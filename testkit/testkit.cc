// The C functions. No exception leaves them.
#include <google/protobuf/stubs/common.h>

#include <cstring>
#include <exception>
#include <limits>
#include <memory>
#include <new>
#include <optional>
#include <set>
#include <sstream>
#include <string>
#include <utility>

#include "kit.h"
#include "qel-testkit.h"
#include "replay.h"
#include "scenario.h"

struct qel_testkit {
  std::unique_ptr<testkit::Player> player;  // none if there is nothing that it could play
  std::string failure;                      // why
  testkit::Delivery delivery;               // the last
  mutable std::string report;               // the last
};

namespace {

// Returns why it failed, or "". A lack of memory is the caller's matter.
template <typename Run>
std::string failure_of(const Run& run) {
  const google::protobuf::LogSilencer silence;  // of texts that are no UTF-8
  try {
    run();
    return "";
  } catch (const testkit::Misread& misread) {
    return "The scenario cannot be read: line " + std::to_string(misread.place.line) + ", column " +
           std::to_string(misread.place.column) + ": " + misread.reason +
           (misread.reason.back() == '.' ? "\n" : ".\n");
  } catch (const testkit::Unreadable& unreadable) {
    return "The session cannot be replayed: " + unreadable.reason + ".\n";
  } catch (const std::bad_alloc&) {
    throw;
  } catch (const std::exception& problem) {
    return std::string("The test kit has a mistake, or was called wrongly: ") + problem.what() +
           ".\n";
  }
}

// Returns null without memory.
template <typename Make>
qel_testkit_t* make_kit(const Make& make) {
  try {
    auto result = std::make_unique<qel_testkit>();
    result->failure = failure_of([&] { make(result.get()); });
    return result.release();
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}

// What fails leaves a kit that plays nothing more.
template <typename Use>
void use(qel_testkit_t* kit, const Use& use) {
  if (kit->player == nullptr) {
    return;
  }
  try {
    kit->failure = failure_of([&] { use(kit->player.get()); });
  } catch (const std::bad_alloc&) {
    kit->failure = "Out of memory.\n";  // in the string itself
  }
  if (!kit->failure.empty()) {
    kit->player.reset();
  }
}

}  // namespace

qel_testkit_t* qel_testkit_new(const char* scenario) {
  return make_kit([scenario](qel_testkit_t* result) {
    if (scenario != nullptr && std::strlen(scenario) > std::numeric_limits<int>::max()) {
      throw testkit::Misread{{1, 1}, "it has 2 GiB or more"};  // its reader counts so far
    }
    result->player = std::make_unique<testkit::Kit>(scenario != nullptr ? scenario : "");
  });
}

qel_testkit_t* qel_testkit_new_replay(const unsigned char* session, size_t size,
                                      const char* ignored) {
  return make_kit([session, size, ignored](qel_testkit_t* result) {
    std::set<std::string> names;
    std::istringstream words(ignored != nullptr ? ignored : "");
    for (std::string word; words >> word;) {
      names.insert(word);
    }
    const std::string_view bytes(reinterpret_cast<const char*>(session), size);
    result->player =
        std::make_unique<testkit::Replay>(testkit::read_session(bytes), std::move(names));
  });
}

void qel_testkit_release(qel_testkit_t* kit) {
  delete kit;
}

void qel_testkit_sent(qel_testkit_t* kit, const char* message, const unsigned char* data,
                      int size) {
  use(kit, [message, data, size](testkit::Player* player) {
    const bool is_empty = data == nullptr || size <= 0;
    player->sent(message, is_empty ? std::string()
                                   : std::string(reinterpret_cast<const char*>(data),
                                                 static_cast<size_t>(size)));
  });
}

bool qel_testkit_next(qel_testkit_t* kit, qel_testkit_delivery_t* delivery) {
  *delivery = {nullptr, nullptr, 0, -1};
  use(kit, [kit, delivery](testkit::Player* player) {
    if (auto next = player->next()) {
      kit->delivery = std::move(*next);
      *delivery = {kit->delivery.name.c_str(),
                   reinterpret_cast<const unsigned char*>(kit->delivery.bytes.data()),
                   static_cast<int>(kit->delivery.bytes.size()), 0};
    } else {
      delivery->after_ms = player->next_after();
    }
  });
  return delivery->message != nullptr;
}

void qel_testkit_wait(qel_testkit_t* kit, int64_t milliseconds) {
  use(kit, [milliseconds](testkit::Player* player) { player->wait(milliseconds); });
}

bool qel_testkit_end(qel_testkit_t* kit) {
  use(kit, [](testkit::Player* player) { player->end(); });
  return *qel_testkit_report(kit) == '\0';
}

const char* qel_testkit_report(const qel_testkit_t* kit) {
  try {
    if (kit->player != nullptr) {
      kit->report = kit->player->report();
    }
  } catch (const std::bad_alloc&) {
    return "Out of memory.\n";
  }
  return kit->player != nullptr ? kit->report.c_str() : kit->failure.c_str();
}
