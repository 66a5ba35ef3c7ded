#include <cstdio>
#include <cstdlib>
#include <dlfcn.h>

// Loads a module, lets it use the library, and unloads it while the library's threads go on, a few
// times.
int main(int count, char** words)
{
    if (count != 4) {
        return 2;
    }
    for (unsigned i = 0; i < 3; ++i) {
        void* const module = dlopen(words[1], RTLD_NOW);
        if (module == nullptr) {
            std::fprintf(stderr, "%s\n", dlerror());
            return 1;
        }
        const auto begin =
            reinterpret_cast<void (*)(const char*, unsigned)>(dlsym(module, "Begin"));
        begin(words[2], static_cast<unsigned>(std::atol(words[3])) + i);
        dlclose(module);
    }
    return 0;
}
