// zr_module_load FILE: prints how many nanoseconds loading the plug-in took, its registration included, in a
// process that has the host's libraries already.
#include <chrono>
#include <cstdio>

#include "frame/host_interface.h"
#include "platform/module.h"

int main(int count, char** arguments) {
    if (count != 2) {
        std::fprintf(stderr, "usage: zr_module_load FILE\n");
        return 64;
    }
    static_cast<void>(ZRLab::defaultLab().diagnostics());
    const auto start = std::chrono::steady_clock::now();
    try {
        platform::loadModule(arguments[1]);
    } catch (const platform::ModuleProblem& problem) {
        std::fprintf(stderr, "zr_module_load: %s: %s\n", arguments[1], problem.what());
        return 2;
    }
    const std::chrono::duration<double, std::nano> took = std::chrono::steady_clock::now() - start;
    std::printf("%.0f\n", took.count());
    return 0;
}
