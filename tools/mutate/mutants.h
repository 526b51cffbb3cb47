// Compiled into every source file of the mutated build: which mutant this process runs.
//
//   ZR_MUTANT=n              mutant n; without it the program is the healthy one
//   ZR_MUTANTS_REACHED=file  the healthy program, which sets byte n of the file where mutant n would have
//                            made a difference
//
// Each shared object has a copy of its own, hidden from the others, and set before any other of its initializers.
#ifndef ZR_TOOLS_MUTATE_MUTANTS_H
#define ZR_TOOLS_MUTATE_MUTANTS_H

#include <cstdlib>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

namespace mutants {

__attribute__((visibility("hidden"))) inline int chosen = 0;
__attribute__((visibility("hidden"))) inline unsigned char* reached = nullptr;

__attribute__((constructor(101))) static void choose() {
    if (const char* number = std::getenv("ZR_MUTANT")) {
        chosen = std::atoi(number);
    }
    const char* name = std::getenv("ZR_MUTANTS_REACHED");
    if (name == nullptr || reached != nullptr) {
        return;
    }
    const int file = open(name, O_RDWR | O_CLOEXEC);
    struct stat status {};
    if (file < 0 || fstat(file, &status) != 0) {
        std::abort();
    }
    void* bytes = mmap(nullptr, static_cast<std::size_t>(status.st_size), PROT_READ | PROT_WRITE,
                       MAP_SHARED, file, 0);
    if (bytes == MAP_FAILED) {
        std::abort();
    }
    close(file);
    reached = static_cast<unsigned char*>(bytes);
}

}  // namespace mutants

// Whether this process is the mutant. Not constexpr, so that what asks is decided at run time.
__attribute__((visibility("hidden"))) inline bool zrMutant(int number) {
    if (mutants::reached != nullptr) {
        __atomic_store_n(&mutants::reached[number], 1, __ATOMIC_RELAXED);
    }
    return mutants::chosen == number;
}

// The same for constexpr functions: what the compiler evaluates is never mutated.
__attribute__((visibility("hidden"))) constexpr bool zrMutantUnlessConstant(int number) {
    return !__builtin_is_constant_evaluated() && zrMutant(number);
}

#endif
