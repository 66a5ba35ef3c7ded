// Loads the plug-in that is named, lets it start its threads, unloads it, and ends as usual.

#include <cstdlib>
#include <dlfcn.h>
#include <iostream>

int main(int, char** argv)
{
    void* const plugin = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
    if (plugin == nullptr) {
        std::cerr << dlerror() << "\n";
        return EXIT_FAILURE;
    }
    reinterpret_cast<void (*)()>(dlsym(plugin, "StartThreads"))();
    dlclose(plugin);
    std::cout << (dlopen(argv[1], RTLD_NOW | RTLD_NOLOAD) != nullptr ? "stayed" : "left") << "\n";
    return EXIT_SUCCESS;
}
