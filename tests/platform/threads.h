// The threads of the process, as tests look at them.
#ifndef ZR_TESTS_PLATFORM_THREADS_H
#define ZR_TESTS_PLATFORM_THREADS_H

#include <cstddef>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <system_error>

#include <pthread.h>

namespace test {

// How many threads the process has. The kernel's count: a listing of /proc/self/task leaves threads out when one
// ends meanwhile.
inline std::size_t threadCount() {
    std::ifstream status("/proc/self/status");
    std::size_t count = 0;
    for (std::string word; status >> word;) {
        if (word == "Threads:") {
            status >> count;
        }
    }
    return count;
}

// The same by name. Listed until a listing is whole.
inline std::map<std::string, std::size_t> threadNames() {
    for (;;) {
        const std::size_t before = threadCount();
        std::map<std::string, std::size_t> names;
        std::size_t listed = 0;
        std::error_code threadEnded;
        for (const auto& task :
             std::filesystem::directory_iterator("/proc/self/task", threadEnded)) {
            std::string name;
            std::getline(std::ifstream(task.path() / "comm"), name);
            ++names[name];
            ++listed;
        }
        if (listed == before && threadCount() == before) {
            return names;
        }
    }
}

inline std::size_t threadsNamed(const std::string& name) {
    return threadNames()[name];
}

// The processor time that the calling thread has used.
inline double threadSeconds() {
    timespec used{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
    return static_cast<double>(used.tv_sec) + static_cast<double>(used.tv_nsec) * 1e-9;
}

// As long as it lives, no thread can be started: each would need a stack beyond the address space.
class NoThreads {
  public:
    NoThreads() {
        pthread_getattr_default_np(&_before);
        pthread_attr_t huge;
        pthread_attr_init(&huge);
        pthread_attr_setstacksize(&huge, std::size_t{1} << 62);
        pthread_setattr_default_np(&huge);
        pthread_attr_destroy(&huge);
    }
    ~NoThreads() {
        pthread_setattr_default_np(&_before);
        pthread_attr_destroy(&_before);
    }
    NoThreads(const NoThreads&) = delete;
    NoThreads& operator=(const NoThreads&) = delete;

  private:
    pthread_attr_t _before;
};

}  // namespace test

#endif
