#include "tests/support/postgres_server.h"

#include "programs/database/postgres_connection.h"

#include <atomic>
#include <cstdlib>
#include <unistd.h>
#include <utility>

namespace VLServiceTest {
namespace {

namespace fs = std::filesystem;

std::string addressOf(fs::path const& server, std::string const& name) {
    return "postgresql:///" + name + "?host=" + server.string() + "&user=vlservice";
}

std::string commandLine(std::string const& command, fs::path const& folder) {
    return std::string("'") + POSTGRES_CLUSTER + "' " + command + " '" + folder.string() + "'";
}

/// That of the whole run of tests, or one of this process.
fs::path sharedServer(std::string& whyNot) {
    if (char const* const folder = std::getenv("VLSERVICE_TEST_POSTGRES"); folder && fs::exists(folder))
        return folder;
    static PostgresServer const own;
    whyNot = own.whyNot();
    return own.folder();
}

} // namespace

PostgresServer::PostgresServer(std::vector<std::string> const& settings) {
    std::string name = (fs::temp_directory_path() / "vlservice-pg.XXXXXX").string();
    folder_ = ::mkdtemp(name.data());
    std::string line = commandLine("start", folder_);
    for (std::string const& setting : settings)
        line += " '" + setting + "'";
    if (std::system(line.c_str()) != 0)
        whyNot_ = "no PostgreSQL server could be started; scripts/setup tests installs one";
}

PostgresServer::~PostgresServer() { control("stop"); }

bool PostgresServer::control(std::string const& command) const {
    return std::system(commandLine(command, folder_).c_str()) == 0;
}

PostgresDatabase::PostgresDatabase() : server_(sharedServer(whyNot_)) { create(); }
PostgresDatabase::PostgresDatabase(fs::path serverFolder) : server_(std::move(serverFolder)) { create(); }

void PostgresDatabase::create() {
    static std::atomic<int> number{0};
    if (!whyNot_.empty())
        return;
    name_ = "t" + std::to_string(::getpid()) + "_" + std::to_string(++number);
    Database::PostgresConnection(addressOf(server_, "postgres")).run("CREATE DATABASE " + name_);
    address_ = addressOf(server_, name_);
}

PostgresDatabase::~PostgresDatabase() {
    if (!whyNot_.empty())
        return;
    try {
        Database::PostgresConnection(addressOf(server_, "postgres"))
            .run("DROP DATABASE " + name_ + " WITH (FORCE)");
    } catch (Database::QueryError const&) {
        // The server goes with it.
    }
}

} // namespace VLServiceTest
