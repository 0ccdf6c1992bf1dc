/* A client: loads its plug-in, the first argument, and runs it; with a further argument
 * forgetfully. */
#include <dlfcn.h>
#include <stdio.h>

int main(int argc, char** argv) {
  void (*run)(int forgetful) = NULL;
  void* plugin = argc > 1 ? dlopen(argv[1], RTLD_NOW | RTLD_LOCAL) : NULL;
  if (plugin != NULL) {
    *(void**)&run = dlsym(plugin, "run");
  }
  if (run == NULL) {
    fprintf(stderr, "client: %s\n", argc > 1 ? dlerror() : "no plug-in");
    return 2;
  }
  run(argc > 2);
  return 0;
}
