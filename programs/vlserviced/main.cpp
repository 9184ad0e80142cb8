#include "programs/base/commit.h"
#include "programs/base/error.h"
#include "programs/base/host_port.h"
#include "programs/base/out_of_memory.h"
#include "programs/base/plain_log.h"
#include "programs/base/plain_text.h"
#include "programs/vlserviced/jobs/backup.h"
#include "programs/vlserviced/options.h"
#include "programs/vlserviced/service.h"
#include "programs/vlserviced/store/data_folder.h"
#include "programs/vlserviced/store/move_database.h"
#include "programs/vlserviced/system_manager.h"
#include "vlservice/platform/local_time.h"
#include "vlservice/platform/log.h"

#include <ctime>
#include <exception>
#include <filesystem>
#include <iostream>
#include <new>
#include <string>

namespace {

constexpr char const* OUT_OF_MEMORY =
    "vlserviced: there is not enough memory; nothing that was acknowledged is lost, start it again "
    "[out-of-memory]\n";

void serve(VlServiced::Options options) {
    VlServiced::takeHandedOver(options);
    g_LogVerbose = options.verbose;
    Base::PlainLog const plainLog;
    VlServiced::Service service(options);
    std::cout << "listening on " << Base::hostPortText(options.listen, service.port()) << '\n';
    if (!service.fingerprint().empty())
        std::cout << "certificate " << service.fingerprint() << '\n';
    if (!service.metricsPlace().empty())
        std::cout << "metrics on " << service.metricsPlace() << '\n';
    std::cout << std::flush;
    service.run();
}

std::filesystem::path outboxOf(VlServiced::Options const& options) {
    return std::filesystem::absolute(options.outbox.empty() ? options.data / "outbox" : options.outbox);
}

void backUp(VlServiced::Options const& options) {
    VlServiced::backUp({options.data, outboxOf(options), options.database}, options.file, std::time(nullptr));
}

std::string inWords(long long count, char const* one, char const* many) {
    return std::to_string(count) + ' ' + (count == 1 ? one : many);
}

void restore(VlServiced::Options const& options) {
    VlServiced::RestoredRecord const record = VlServiced::restoreBackup(
        options.file, options.data, outboxOf(options),
        options.nothingSince ? VlServiced::Since::Nothing : VlServiced::Since::Unknown, std::time(nullptr));
    std::cout << "restored from the backup of " << LocalTime::toText(record.madeAt) << "; "
              << inWords(record.foundJobs, "mailing was", "mailings were") << " found in the upload folder, "
              << inWords(record.doubtfulJobs, "mailing is held", "mailings are held") << " and "
              << inWords(record.doubtfulLetters, "letter is", "letters are")
              << " uncertain until a person decides\n";
}

void moveDatabase(VlServiced::Options const& options) {
    VlServiced::DataFolder const data(options.data);
    VlServiced::MovedRecord const record = VlServiced::moveToPostgres(data, options.migrateTo);
    std::cout << inWords(record.rows, "row", "rows") << " of " << inWords(record.tables, "table", "tables")
              << " are the same there, and the files here are called service.db.moved and packs.db.moved; "
                 "start the service with --database\n";
}

void carryOut(VlServiced::Options const& options) {
    switch (options.task) {
    case VlServiced::Task::Serve:
        return serve(options);
    case VlServiced::Task::BackUp:
        return backUp(options);
    case VlServiced::Task::Restore:
        return restore(options);
    case VlServiced::Task::MoveDatabase:
        return moveDatabase(options);
    }
}

int run(int argc, char** argv) {
    auto const parsed = VlServiced::parseOptions(argc, argv, std::cout, std::cerr, Base::COMMIT);
    if (int const* const status = std::get_if<int>(&parsed))
        return *status;
    carryOut(std::get<VlServiced::Options>(parsed));
    return 0;
}

} // namespace

int main(int argc, char** argv) {
    Base::endWhenOutOfMemory(OUT_OF_MEMORY);
    try {
        return run(argc, argv);
    } catch (std::bad_alloc const&) {
        Base::endOutOfMemory();
    } catch (std::exception const& failure) {
        std::cerr << "vlserviced: " << Base::codedLine(Base::oneLine(failure.what()), Base::codeOf(failure))
                  << std::endl;
        return 1;
    }
}
