// A disk without space for the program that this is loaded into: while the file that the variable ZR_FULL_WHILE
// names is there, no file grows. What a file has, it may write again, as on a disk that is full.
#include <cerrno>
#include <cstdlib>

#include <dlfcn.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

bool isFull(int file, off_t end) {
    static const char* const kWhile = std::getenv("ZR_FULL_WHILE");
    struct stat status {};
    if (kWhile == nullptr || access(kWhile, F_OK) != 0 || fstat(file, &status) != 0 ||
        status.st_size >= end) {
        return false;
    }
    errno = ENOSPC;
    return true;
}

template <class Function>
Function* next(const char* name) {
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" ssize_t pwrite(int file, const void* data, size_t size, off_t offset) {
    static auto* const kNext = next<decltype(pwrite)>("pwrite");
    return isFull(file, offset + static_cast<off_t>(size)) ? -1 : kNext(file, data, size, offset);
}
