// Loads shared objects that use the library, and records in all of them in turn: host local|global OBJECT...
#include <dlfcn.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

using Record = void(char* text, std::size_t size);

int main(int argc, char** argv) {
    const int mode = RTLD_NOW | (argc > 1 && std::strcmp(argv[1], "global") == 0 ? RTLD_GLOBAL : RTLD_LOCAL);
    const std::vector<std::string> expected{
        R"(event= screen={"name":"home","depth":1} (screen) )",
        R"(display={"width":640,"height":480,"layers":[1,2,3],"title":"main"} identity= shown= (display) )"};
    std::vector<Record*> objects;
    for (int i = 2; i < argc; ++i) {
        void* object = dlopen(argv[i], mode);
        void* record = object ? dlsym(object, "record") : nullptr;
        if (!record) return std::fprintf(stderr, "%s\n", dlerror()), 2;
        objects.push_back(reinterpret_cast<Record*>(record));
    }
    int wrong = 0;
    for (int round = 0; round < 2; ++round) {
        for (std::size_t i = 0; i < objects.size(); ++i) {
            char text[1000] = {};
            objects[i](text, sizeof text);
            if (text == expected.at(i)) continue;
            ++wrong;
            std::fprintf(stderr, "object %zu recorded: %s\n", i + 1, text);
        }
    }
    return objects.empty() || wrong ? 1 : 0;
}
