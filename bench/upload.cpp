// Measures what sending a pack over the connection costs: its digest, its pages over TLS into the pack store
// of the service, and the look whether it is whole, against a bare TLS copy of the same bytes from memory
// into a synced file, and the round trip of a small command meanwhile against the same command alone. Decides
// whether pages may go through the store's transactions and the window's words. To reach: ratio 0.7,
// slowdown 2. The ratio of processor time tells what the disk and others on the machine have no part in.
#include "bench/process_time.h"
#include "programs/channel/client.h"
#include "programs/channel/server.h"
#include "programs/channel/stream.h"
#include "programs/database/sqlite_connection.h"
#include "programs/protocol/pack_upload.h"
#include "programs/vlmail/mailings/pack_upload.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlserviced/jobs/pack_reception.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/channel/test_certificate.h"
#include "tests/support/temporary_folder.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/make_empty_cmd.h"
#include "vlservice/ipc/process_pack.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/asio/write.hpp>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <string>
#include <sys/resource.h>
#include <thread>
#include <unistd.h>
#include <vector>

namespace {

namespace asio = boost::asio;
namespace fs = std::filesystem;
using asio::ip::tcp;
using Clock = std::chrono::steady_clock;

constexpr int PAGES = 192;
constexpr std::size_t PAGE_SIZE = 1 << 20;
constexpr int ROUNDS = 5;

/// Pages in memory: what is measured is their way.
class NoisePack : public Mailing::PackSource {
public:
    explicit NoisePack(std::string const& id) : PackSource(id), info_{id, "a=acme", "Noise"} {
        unsigned seed = 1;
        noise_.resize(static_cast<unsigned long long>(PAGE_SIZE));
        for (std::size_t i = 0; i < PAGE_SIZE; ++i)
            noise_.data()[i] = static_cast<unsigned char>((seed = seed * 1'664'525 + 1'013'904'223) >> 24);
        std::copy_n("TEZ", 3, noise_.data());
        for (int i = 0; i < PAGES; ++i)
            pages_.emplace_back("noise.pdf", std::to_string(i));
    }
    Mailing::PackInfo const& info() const override { return info_; }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override { return noise_; }
    SharedMemBuffer const& noise() const { return noise_; }

private:
    SharedMemBuffer load(std::string const&, std::string const&) override { return noise_; }

    Mailing::PackInfo info_;
    SharedMemBuffer noise_;
    std::vector<PageName> pages_;
};

double secondsSince(Clock::time_point begin) {
    return std::chrono::duration<double>(Clock::now() - begin).count();
}

/// Of the processors, by all threads, until now.
double processorSeconds() {
    rusage used{};
    ::getrusage(RUSAGE_SELF, &used);
    return Bench::seconds(used.ru_utime) + Bench::seconds(used.ru_stime);
}

/// Of one copy or upload, as the clock goes and of the processors.
struct Taken {
    double seconds = 0;
    double ofProcessors = 0;
};

/// Starts with its making.
class Watch {
public:
    Taken taken() const { return {secondsSince(begin_), processorSeconds() - before_}; }

private:
    Clock::time_point begin_ = Clock::now();
    double before_ = processorSeconds();
};

double median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    return values[values.size() / 2];
}

/// Takes all bytes over TLS into a file, which is synced.
void takeCopy(tcp::acceptor& acceptor, asio::ssl::context& context, fs::path const& target) {
    asio::ssl::stream<tcp::socket> stream(acceptor.accept(), context);
    stream.handshake(asio::ssl::stream_base::server);
    int const file = ::open(target.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    std::vector<char> buffer(1 << 20);
    for (std::size_t left = (PAGES + 1) * PAGE_SIZE; left > 0;) {
        std::size_t const got = stream.read_some(asio::buffer(buffer));
        if (::write(file, buffer.data(), got) != static_cast<ssize_t>(got))
            std::exit(1);
        left -= got;
    }
    ::fsync(file);
    ::close(file);
    asio::write(stream, asio::buffer("k", 1));
}

Taken bareCopy(NoisePack const& pack, std::string const& certificate, std::string const& key,
               fs::path const& target) {
    asio::io_context io;
    tcp::acceptor acceptor(io, {asio::ip::address_v4::loopback(), 0});
    auto const service = Channel::makeServiceContext(certificate, key);
    auto const client = Channel::makeClientContext();
    std::thread taker([&] { takeCopy(acceptor, *service, target); });
    asio::ssl::stream<tcp::socket> stream(io, *client);
    Watch const watch;
    stream.next_layer().connect(acceptor.local_endpoint());
    stream.handshake(asio::ssl::stream_base::client);
    for (int i = 0; i <= PAGES; ++i)
        asio::write(stream, asio::buffer(pack.noise().data(), PAGE_SIZE));
    char word = 0;
    asio::read(stream, asio::buffer(&word, 1));
    Taken const taken = watch.taken();
    taker.join();
    fs::remove(target);
    return taken;
}

double roundTrip(Channel::Client& client) {
    auto const begin = Clock::now();
    client.call<Ipc::GetSvcCfg>();
    return secondsSince(begin);
}

/// The service as far as packs are concerned.
class PackService {
public:
    PackService(fs::path const& folder, ChannelTest::TestCertificate const& certificate)
        : reception_(VlServiced::openSqlitePackStore(folder / "packs.db"), jobs_,
                     {[this](Work work) { asio::post(storeThread_, std::move(work)); },
                      [this](Work work) { asio::post(io_, std::move(work)); }, [] { return 1LL; },
                      [](std::string const&) { return std::nullopt; },
                      [](std::string const&) { return false; },
                      [this](Work work) {
                          pieces_.expires_after(std::chrono::milliseconds(20));
                          pieces_.async_wait([work = std::move(work)](auto const& ec) {
                              if (!ec)
                                  work();
                          });
                      }}),
          server_(
              std::in_place, io_, settings(certificate), &Ipc::makeEmptyCmd,
              [this](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
                  handle(cmd, answer);
              },
              [this](Channel::ReceivedData data, Channel::DataStored const& stored) {
                  reception_.take(data.connection, std::move(data.text),
                                  [stored](std::string const& failure) {
                                      failure.empty() ? stored() : stored.fail(failure);
                                  });
              }),
          pins_((folder / "pins").string()), thread_([this] {
              auto const work = asio::make_work_guard(io_);
              io_.run();
          }) {}
    ~PackService() {
        io_.stop();
        thread_.join();
        storeThread_.join();
        server_.reset();
    }
    PackService(PackService const&) = delete;
    PackService& operator=(PackService const&) = delete;

    std::unique_ptr<Channel::Client> connect() const {
        Channel::ClientSettings settings;
        settings.host = "127.0.0.1";
        settings.port = server_->port();
        settings.token = TOKEN;
        settings.tls = Channel::Tls::Always;
        settings.pinFile = pins_;
        settings.acceptNew = [](std::string const&, std::string const&) { return true; };
        return std::make_unique<Channel::Client>(std::move(settings));
    }

private:
    using Work = std::function<void()>;

    static Channel::ServerSettings settings(ChannelTest::TestCertificate const& certificate) {
        Channel::ServerSettings settings;
        settings.token = TOKEN;
        settings.tls = Channel::Tls::Always;
        settings.certificateFile = certificate.certificateFile;
        settings.keyFile = certificate.keyFile;
        return settings;
    }

    void handle(std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
        if (auto const begin = std::dynamic_pointer_cast<Ipc::CSConfigIdsList>(cmd))
            return reception_.begin(
                Protocol::BeginPack(begin->reqParams()), begin->processor(),
                [begin, answer](Protocol::BeginPackAnswer const& there, std::string const& failure) {
                    begin->setResp(there.serialize());
                    failure.empty() ? answer() : answer.fail(failure);
                });
        if (auto const process = std::dynamic_pointer_cast<Ipc::ProcessPack>(cmd))
            return reception_.complete(process->packId(), [answer](std::string const& failure) {
                failure.empty() ? answer() : answer.fail(failure);
            });
        answer();
    }

    static inline std::string const TOKEN = "0123456789abcdef0123456789abcdef";

    Database::SqliteConnection database_{
        Database::openDatabase(":memory:", VlServiced::serviceDatabase(), Database::Journal::Rollback)};
    VlServiced::JobStore jobs_{database_};
    asio::io_context io_;
    asio::steady_timer pieces_{io_};
    asio::thread_pool storeThread_{1};
    VlServiced::PackReception reception_;
    std::optional<Channel::Server> server_;
    std::string pins_;
    std::thread thread_;
};

struct Measured {
    Taken taken;
    double roundTrip = 0;
};

Measured upload(PackService const& service, std::string const& id) {
    NoisePack pack(id);
    VlMail::ServiceLine line([&] { return service.connect(); });
    auto const other = service.connect();
    std::atomic<bool> isDone = false;
    std::vector<double> trips;
    std::thread asker([&] {
        while (!isDone) {
            trips.push_back(roundTrip(*other));
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
        }
    });
    Watch const watch;
    VlMail::uploadPack(line, pack);
    Taken const taken = watch.taken();
    isDone = true;
    asker.join();
    return {taken, median(trips)};
}

double idleRoundTrip(PackService const& service) {
    auto const client = service.connect();
    std::vector<double> trips;
    for (int i = 0; i < 200; ++i) {
        trips.push_back(roundTrip(*client));
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    return median(trips);
}

/// Medians of several.
class Series {
public:
    void add(Taken const& taken) {
        seconds_.push_back(taken.seconds);
        ofProcessors_.push_back(taken.ofProcessors);
    }
    double seconds() const { return median(seconds_); }
    double ofProcessors() const { return median(ofProcessors_); }

private:
    std::vector<double> seconds_;
    std::vector<double> ofProcessors_;
};

} // namespace

int main() {
    TemporaryFolder const folder;
    auto const certificate = ChannelTest::makeCertificate(folder.path().string(), "service");
    Series copies;
    Series uploads;
    std::vector<double> trips;
    double idle = 0;
    {
        PackService const service(folder.path(), certificate);
        idle = idleRoundTrip(service);
        NoisePack const pack("copy");
        for (int round = 0; round < ROUNDS; ++round) {
            copies.add(bareCopy(pack, certificate.certificateFile, certificate.keyFile, folder / "copy"));
            Measured const measured = upload(service, "p" + std::to_string(round));
            uploads.add(measured.taken);
            trips.push_back(measured.roundTrip);
        }
    }
    double const mebibytes = (PAGES + 1) * static_cast<double>(PAGE_SIZE) / (1 << 20);
    std::printf("upload %.0f MiB/s, bare TLS copy %.0f MiB/s, ratio %.2f\n", mebibytes / uploads.seconds(),
                mebibytes / copies.seconds(), copies.seconds() / uploads.seconds());
    std::printf("of the processors: upload %.2f s, bare TLS copy %.2f s, ratio %.2f\n",
                uploads.ofProcessors(), copies.ofProcessors(),
                copies.ofProcessors() / uploads.ofProcessors());
    std::printf("small command %.0f us alone, %.0f us meanwhile, slowdown %.2f\n", idle * 1e6,
                median(trips) * 1e6, median(trips) / idle);
    return 0;
}
