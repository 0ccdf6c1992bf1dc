/* load_library FILE: loads the library with all its symbols at once, and says which is missing. */
#include <dlfcn.h>
#include <stdio.h>

int main(int argc, char** argv) {
  if (argc != 2 || dlopen(argv[1], RTLD_NOW) == NULL) {
    fprintf(stderr, "%s\n", argc != 2 ? "usage: load_library FILE" : dlerror());
    return 1;
  }
  return 0;
}
