// unload_test CASE LIBRARY: the plug-in that brought the library is unloaded, while the runtime,
// which others use too, stays. Ends with 0 if all goes well.

#include <dlfcn.h>
#include <google/protobuf/stubs/common.h>

#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>

namespace {

[[noreturn]] void fail(const std::string& what) {
  std::cerr << what << '\n';
  std::exit(1);
}

class Library {
 public:
  explicit Library(const char* path) : handle_(dlopen(path, RTLD_NOW)) {
    if (handle_ == nullptr) {
      fail(dlerror());
    }
  }
  ~Library() { dlclose(handle_); }
  Library(const Library&) = delete;
  Library& operator=(const Library&) = delete;

  void call() const {
    using Function = int (*)(int64_t, unsigned char**, int*);
    const auto serialize =
        reinterpret_cast<Function>(dlsym(handle_, "client_echo_reply_serialize"));
    unsigned char* block = nullptr;
    int size = 0;
    if (serialize == nullptr || serialize(7, &block, &size) != 0) {
      fail("no call");
    }
    if (size != 2 || block[0] != 0x08 || block[1] != 0x07) {
      fail("other bytes");
    }
    free(block);
  }

 private:
  void* handle_;
};

void load_call_unload(const char* path) {
  const Library library(path);
  library.call();
}

}  // namespace

int main(int argc, char** argv) {
  const std::string test = argc == 3 ? argv[1] : "";
  if (test == "it_can_be_loaded_again") {
    load_call_unload(argv[2]);
    load_call_unload(argv[2]);
  } else if (test == "the_runtime_can_shut_down") {
    load_call_unload(argv[2]);
    google::protobuf::ShutdownProtobufLibrary();
  } else if (test == "the_runtime_can_shut_down_after_a_second_load") {
    load_call_unload(argv[2]);
    load_call_unload(argv[2]);
    google::protobuf::ShutdownProtobufLibrary();
  } else {
    fail("usage: unload_test CASE LIBRARY");
  }
  return 0;
}
