// unload_test LIBRARY: the plug-in that brought the library is unloaded and loaded again, while the
// runtime, which others use too, stays, and shuts down at last. Ends with 0 if all goes well.

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
  if (argc != 2) {
    fail("usage: unload_test LIBRARY");
  }
  load_call_unload(argv[1]);
  load_call_unload(argv[1]);
  google::protobuf::ShutdownProtobufLibrary();
  return 0;
}
