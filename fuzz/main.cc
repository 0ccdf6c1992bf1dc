// The program that stands under every target's name.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/stubs/common.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "msgspec_frontend.pb.h"
#include "target.h"

namespace fuzz {
namespace {

std::vector<Target> all_targets() {
  std::vector<Target> targets = deserializer_targets();
  targets.push_back({"serializers", check_serializers});
  targets.push_back({"round_trip", check_round_trip});
  targets.push_back({"qel_wire", check_qel_wire});
  targets.push_back({"qel_wire_input", check_qel_wire_input});
  targets.push_back({"testkit", check_testkit});
  return targets;
}

Target target_named(const std::string& path) {
  const std::string name = path.substr(path.rfind('/') + 1);
  for (const Target& target : all_targets()) {
    if (target.name == name) {
      return target;
    }
  }
  std::fprintf(stderr, "%s is no target; there are:\n", name.c_str());
  for (const Target& target : all_targets()) {
    std::fprintf(stderr, "  %s\n", target.name.c_str());
  }
  std::exit(2);
}

Target chosen;

}  // namespace

void fail(const std::string& finding) {
  std::fprintf(stderr, "\n%s: %s\n", chosen.name.c_str(), finding.c_str());
  std::abort();
}

std::unique_ptr<google::protobuf::Message> new_message(const std::string& name) {
  const auto* file = ConnectionStatus::descriptor()->file();
  return std::unique_ptr<google::protobuf::Message>(
      google::protobuf::MessageFactory::generated_factory()
          ->GetPrototype(file->FindMessageTypeByName(name))
          ->New());
}

std::unique_ptr<google::protobuf::Message> new_message(unsigned char choice) {
  const auto* file = ConnectionStatus::descriptor()->file();
  return new_message(file->message_type(choice % file->message_type_count())->name());
}

}  // namespace fuzz

extern "C" int LLVMFuzzerInitialize(int* argc, char*** argv);
extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** argv) {
  fuzz::chosen = fuzz::target_named((*argv)[0]);
  google::protobuf::SetLogHandler(nullptr);  // which would complain of every text that is no UTF-8
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  fuzz::chosen.check(std::string(reinterpret_cast<const char*>(data), size));
  return 0;
}
