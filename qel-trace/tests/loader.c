/* loader [FILE NAME]: loads a plug-in, or the library itself, into a scope of its own, and calls a
   function of it. Without a file it looks functions up where no library is loaded. */
#define _GNU_SOURCE /* RTLD_NEXT */
#include <dlfcn.h>
#include <stdint.h>
#include <string.h>

typedef int (*answer_t)(int64_t request_id, unsigned char** serialized_data, int* size);

static int call(const char* file, const char* name) {
  void* const loaded = dlopen(file, RTLD_NOW | RTLD_LOCAL);
  void* const found = loaded != NULL ? dlsym(loaded, name) : NULL;
  unsigned char* data = NULL;
  int size = 0;
  answer_t answer;
  memcpy(&answer, &found, sizeof answer);
  return found != NULL && answer(7, &data, &size) == 0 && size == 2 ? 0 : 1;
}

/* Behind this program comes the recorder, in front of the C library. */
static int look_up(void) {
  return dlsym(RTLD_DEFAULT, "client_echo_reply_serialize") == NULL &&
                 dlsym(RTLD_NEXT, "dlsym") == dlsym(RTLD_DEFAULT, "dlsym")
             ? 0
             : 1;
}

int main(int argc, char** argv) {
  return argc == 3 ? call(argv[1], argv[2]) : look_up();
}
