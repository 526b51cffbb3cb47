#include "tests/support/postgres_cluster.h"

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <libpq-fe.h>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

namespace test {

namespace {

namespace fs = std::filesystem;

constexpr char kFull[] = "full";  // a file in the server's folder, while its disk is full

[[noreturn]] void fail(const std::string& text) {
    throw std::runtime_error("the tests' PostgreSQL server: " + text);
}

void run(const std::string& command) {
    if (std::system(command.c_str()) != 0) {
        fail(command);
    }
}

// The server's programs refuse root. A program ends when the one that started it does.
std::string asUser(const std::string& command) {
    return std::string("setpriv ") +
           (geteuid() == 0 ? "--reuid=postgres --regid=postgres --clear-groups " : "") +
           "--pdeathsig=QUIT " ZR_POSTGRES_PROGRAMS "/" + command;
}

void giveToUser(const fs::path& path) {
    if (geteuid() == 0) {
        run("chown -R postgres:postgres " + path.string());
    }
}

fs::path newFolder() {
    std::string name = "/tmp/zr_postgres_XXXXXX";  // short: a socket's path has 107 characters
    if (mkdtemp(name.data()) == nullptr) {
        fail("no folder");
    }
    giveToUser(name);
    return name;
}

// A cluster as initdb makes it, which takes a second: once per build.
std::string cluster() {
    const std::string made = ZR_POSTGRES_CLUSTER;
    const int lock = open((made + ".lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0666);
    if (flock(lock, LOCK_EX) != 0) {
        fail(made + ": no lock");
    }
    if (!fs::exists(made)) {
        const std::string folder = newFolder().string();
        run(asUser("initdb --username=zrlab --auth=trust --encoding=UTF8 --locale=C --no-sync "
                   "--pgdata=") +
            folder + "/data >" + folder + ".log");
        run("cp -r " + folder + "/data " + made + ".part && mv " + made + ".part " + made +
            " && rm -r " + folder + " " + folder + ".log");
    }
    close(lock);
    return made;
}

}  // namespace

PostgresCluster& PostgresCluster::shared() {
    static PostgresCluster cluster;
    return cluster;
}

PostgresCluster::PostgresCluster() : _folder(newFolder()) {
    run("cp -r " + cluster() + " " + (_folder / "data").string());
    giveToUser(_folder / "data");
    start();
}

PostgresCluster::~PostgresCluster() {
    _end(SIGQUIT);
    std::error_code ignored;
    fs::remove_all(_folder, ignored);
}

std::string PostgresCluster::newDatabase() {
    const std::string name = "runs" + std::to_string(++_databases);
    runOnPostgres(_address("postgres"), "CREATE DATABASE " + name);
    return _address(name);
}

std::string PostgresCluster::_address(const std::string& database) const {
    return "postgresql://zrlab@/" + database + "?host=" + _folder.string();
}

void PostgresCluster::_end(int signal) {
    if (_server != 0) {
        ::kill(_server, signal);
        waitpid(std::exchange(_server, 0), nullptr, 0);
    }
}

// One that was killed leaves processes behind, which end by themselves, and keep another from starting until then.
void PostgresCluster::start() {
    const std::string folder = _folder.string();
    const std::string command =
        "ZR_FULL_WHILE=" + folder + "/" + kFull + " LD_PRELOAD=" ZR_FULL_DISK " exec " +
        asUser("postgres -D " + folder + "/data -k " + folder +
               " -c listen_addresses= -c fsync=off -c full_page_writes=off -c max_connections=80"
               " -c dynamic_shared_memory_type=mmap >>") +
        folder + "/log 2>&1";
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (PQping(_address("postgres").c_str()) != PQPING_OK) {
        if (_server == 0 || waitpid(_server, nullptr, WNOHANG) == _server) {
            _server = fork();
            if (_server == 0) {
                execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
                _exit(127);
            }
        }
        if (std::chrono::steady_clock::now() > end) {
            std::ifstream log(_folder / "log");
            fail(std::string(std::istreambuf_iterator<char>(log), {}));
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
}

void PostgresCluster::_signalAll(int signal) const {
    const std::string id = std::to_string(_server);
    std::ifstream children("/proc/" + id + "/task/" + id + "/children");
    for (pid_t process = 0; children >> process;) {
        ::kill(process, signal);
    }
    ::kill(_server, signal);
}

void PostgresCluster::fill() {
    std::ofstream(_folder / kFull).flush();
}

void PostgresCluster::makeRoom() {
    fs::remove(_folder / kFull);
}

void runOnPostgres(const std::string& address, const std::string& sql) {
    const std::unique_ptr<PGconn, void (*)(PGconn*)> connection(PQconnectdb(address.c_str()),
                                                                PQfinish);
    PQclear(PQexec(connection.get(), "SET default_transaction_read_only = off"));
    const std::unique_ptr<PGresult, void (*)(PGresult*)> result(
        PQexec(connection.get(), sql.c_str()), PQclear);
    const ExecStatusType status = PQresultStatus(result.get());
    if (status != PGRES_COMMAND_OK && status != PGRES_TUPLES_OK) {
        fail(PQerrorMessage(connection.get()));
    }
}

}  // namespace test
