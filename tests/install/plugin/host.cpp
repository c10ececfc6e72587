// SPDX-License-Identifier: Apache-2.0
// Loads a plug-in, lets it work, and closes it. The library's threads still run then, so its code must stay loaded.
#include <dlfcn.h>

#include <chrono>
#include <cstdio>
#include <initializer_list>
#include <thread>

int main(int argc, char **argv) {
  void *const plugin = argc == 2 ? dlopen(argv[1], RTLD_NOW | RTLD_LOCAL) : nullptr;
  if (!plugin) {
    std::fprintf(stderr, "%s\n", argc == 2 ? dlerror() : "usage: host PLUGIN");
    return 2;
  }
  const auto run = reinterpret_cast<int (*)()>(dlsym(plugin, "Run"));
  if (!run || run() != 0) {
    std::fputs("the plug-in did not work\n", stderr);
    return 1;
  }
  dlclose(plugin);
  for (const char *library : {"libtarvel.so.0", "libssoclient.so.0"}) {
    if (!dlopen(library, RTLD_NOW | RTLD_NOLOAD)) {
      std::fprintf(stderr, "%s went with the plug-in\n", library);
      return 1;
    }
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(100)); // time for a thread whose code was unloaded to crash
  return 0;
}
