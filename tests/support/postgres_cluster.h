// PostgresCluster: a PostgreSQL server for tests, in a temporary folder, on a local socket.
#ifndef ZR_TESTS_SUPPORT_POSTGRES_CLUSTER_H
#define ZR_TESTS_SUPPORT_POSTGRES_CLUSTER_H

#include <csignal>
#include <filesystem>
#include <string>

#include <sys/types.h>

namespace test {

// One server for a test program. It runs as an ordinary user, of the account "postgres" when the program is
// root, and ends with the program, however that ends. Nothing of it is durable: fsync is off.
// One thread at a time. Every operation throws a std::runtime_error when it fails.
class PostgresCluster {
  public:
    // The program's, which starts when it is first asked for.
    static PostgresCluster& shared();

    ~PostgresCluster();
    PostgresCluster(const PostgresCluster&) = delete;
    PostgresCluster& operator=(const PostgresCluster&) = delete;

    // The address of a new, empty database, as its owner.
    std::string newDatabase();

    // The server goes, as at the machine's shutdown or killed; and comes back.
    void stop() { _end(SIGINT); }
    void kill() { _end(SIGKILL); }
    void start();

    // Every process of it stands still, and goes on.
    void pause() { _signalAll(SIGSTOP); }
    void resume() { _signalAll(SIGCONT); }

    // Its disk is full: no file of it can grow; and has room again.
    void fill();
    void makeRoom();

  private:
    PostgresCluster();

    void _end(int signal);
    void _signalAll(int signal) const;
    std::string _address(const std::string& database) const;

    std::filesystem::path _folder;
    int _databases = 0;
    pid_t _server = 0;
};

// Runs statements on a server's database as the tests' own client; they may return rows.
void runOnPostgres(const std::string& address, const std::string& sql);

}  // namespace test

#endif
