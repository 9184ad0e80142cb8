#include "programs/carriers/printer_carrier.h"

#include "programs/base/error.h"
#include "tests/carriers/ipp_printer.h"
#include "tests/carriers/parcel_help.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <arpa/inet.h>
#include <chrono>
#include <fstream>
#include <iterator>
#include <netinet/in.h>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <sys/socket.h>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

using Carriers::Outcome;
using Carriers::PrinterCarrier;
using Carriers::Progress;
using testing::HasSubstr;
using testing::StartsWith;

class PrinterCarrierTest : public testing::Test {
protected:
    void SetUp() override {
        if (!IppPrinter::whyNot().empty())
            GTEST_SKIP() << IppPrinter::whyNot();
    }

    void start(std::string const& script, std::vector<std::string> const& offers = {"-2", "-s", "10,5"}) {
        printer_.emplace(folder_ / "printer", script, offers);
        carrier_.emplace(printer_->uri());
    }
    Outcome handOver(Carriers::Parcel const& parcel) {
        return carrier_->handOver(parcel, [this] { ++records_; });
    }
    /// What became of a key, when it is no longer under way.
    std::string endOf(std::string const& key) {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        Progress told;
        do {
            told = carrier_->ask({key})[key];
        } while (told.kind == Progress::Kind::UnderWay && std::chrono::steady_clock::now() < end);
        return told.says;
    }
    void awaitWords(std::string const& key, std::string const& words) {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        while (carrier_->ask({key})[key].says.find(words) == std::string::npos &&
               std::chrono::steady_clock::now() < end) {
        }
        EXPECT_THAT(carrier_->ask({key})[key].says, HasSubstr(words));
    }
    /// What is thrown is that the carrier failed.
    Outcome tried(Carriers::Parcel const& parcel) {
        try {
            return handOver(parcel);
        } catch (Base::Error const& failure) {
            return {Outcome::Kind::Failed, failure.what()};
        }
    }
    int timesPrinted(std::string const& key) const {
        std::istringstream words(printer_->had());
        return static_cast<int>(
            std::count(std::istream_iterator<std::string>(words), std::istream_iterator<std::string>(), key));
    }
    void letGo() const { std::ofstream(folder_.path() / "printer" / "go").close(); }

    static constexpr char const* WAIT = "until [ -e go ]; do :; done\n";

    TemporaryFolder folder_;
    std::optional<IppPrinter> printer_;
    std::optional<PrinterCarrier> carrier_;
    int records_ = 0;
};

TEST_F(PrinterCarrierTest, PrintsALetterAsItsPresetWants) {
    start("cp \"$1\" printed");
    Carriers::Parcel parcel = parcelOf("p1-1", {"Ada"});
    parcel.isDuplex = true;
    parcel.printing = {Carriers::Printing::Colour::Grey, 21000, 29700, 3};
    Outcome const outcome = handOver(parcel);
    EXPECT_EQ(outcome.kind, Outcome::Kind::Accepted);
    EXPECT_EQ(outcome.says, "job 1 of " + printer_->uri());
    EXPECT_EQ(records_, 1);
    EXPECT_EQ(endOf("p1-1"), "job 1 is printed");
    EXPECT_EQ(printer_->had(),
              "p1-1 sides=two-sided-long-edge colour=monochrome media=iso_a4_210x297mm copies=3\n");
    std::ifstream printed(folder_.path() / "printer" / "printed");
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(printed), {}), parcel.document);
}

TEST_F(PrinterCarrierTest, LeavesOutWhatThePrinterDoesNotOfferAndSaysSo) {
    start("", {"-s", "10"});
    Carriers::Parcel parcel = parcelOf("p1-1", {"Ada"});
    parcel.isDuplex = true;
    parcel.printing = {Carriers::Printing::Colour::Coloured, 70000, 100000, 1};
    Outcome const outcome = handOver(parcel);
    EXPECT_EQ(outcome.kind, Outcome::Kind::Accepted);
    EXPECT_THAT(outcome.says, StartsWith("job 1 of " + printer_->uri() +
                                         "; the printer does not offer two-sided-long-edge, color, "));
    EXPECT_EQ(endOf("p1-1"), "job 1 is printed");
    EXPECT_EQ(printer_->had(), "p1-1 sides= colour= media= copies=\n");
}

TEST_F(PrinterCarrierTest, TellsOfAPrinterWithoutPaper) {
    start(std::string("echo 'STATE: +media-empty-error' >&2\n") + WAIT +
          "echo 'STATE: -media-empty-error' >&2");
    EXPECT_EQ(handOver(parcelOf("p1-1", {"Ada"})).kind, Outcome::Kind::Accepted);
    awaitWords("p1-1", "job 1 is being printed: out of paper");
    EXPECT_THAT(carrier_->test(), HasSubstr("out of paper"));
    letGo();
    EXPECT_EQ(endOf("p1-1"), "job 1 is printed");
}

TEST_F(PrinterCarrierTest, TellsOfAJobThatThePrinterAborts) {
    start("exit 1");
    EXPECT_EQ(handOver(parcelOf("p1-1", {"Ada"})).kind, Outcome::Kind::Accepted);
    EXPECT_EQ(endOf("p1-1"), "job 1 was aborted by the printer");
    EXPECT_EQ(carrier_->ask({"p1-1"}).at("p1-1").kind, Progress::Kind::Failed) << "it had begun";
}

TEST_F(PrinterCarrierTest, SaysNothingOfKeysThatThePrinterDoesNotKnow) {
    start("");
    EXPECT_TRUE(carrier_->ask({"p1-1"}).empty());
}

TEST_F(PrinterCarrierTest, TellsOfTheLatestJobOfAKey) {
    start("[ \"$IPP_JOB_ID\" = 2 ] || exit 1");
    handOver(parcelOf("p1-1", {"Ada"}));
    EXPECT_EQ(endOf("p1-1"), "job 1 was aborted by the printer");
    handOver(parcelOf("p1-1", {"Ada"}));
    awaitWords("p1-1", "job 2 is printed");
}

TEST_F(PrinterCarrierTest, TakesBackAJobThatNeverGotItsDocumentSoThatThePrinterIsFreeForOthers) {
    start("");
    {
        Carriers::PrinterSession session(printer_->uri());
        session.facts();
        session.create("p1-1", {});
    }
    EXPECT_EQ(tried(parcelOf("p1-2", {"Bob"})).kind, Outcome::Kind::Failed) << "this one takes one at a time";
    Progress const told = carrier_->ask({"p1-1"}).at("p1-1");
    EXPECT_EQ(told.kind, Progress::Kind::Lost);
    EXPECT_EQ(told.says, "job 1 never got its document, and is cancelled");
    EXPECT_EQ(handOver(parcelOf("p1-2", {"Bob"})).kind, Outcome::Kind::Accepted);
    EXPECT_EQ(endOf("p1-2"), "job 2 is printed");
    EXPECT_EQ(timesPrinted("p1-1"), 0);
}

TEST_F(PrinterCarrierTest, SaysWhatThePrinterOffers) {
    start("");
    EXPECT_THAT(carrier_->test(), StartsWith("Test takes jobs; it offers one-sided, two-sided-long-edge, "
                                             "two-sided-short-edge; auto, color, monochrome; "));
    EXPECT_THAT(carrier_->test(), HasSubstr("iso_a4_210x297mm"));
    EXPECT_THAT(carrier_->test(), HasSubstr("; at most 999 copies"));
    EXPECT_EQ(printer_->had(), "");
}

TEST_F(PrinterCarrierTest, FailsWhereNobodyListens) {
    start("");
    std::string const uri = printer_->uri();
    printer_.reset();
    EXPECT_THAT(failureOf([&] { handOver(parcelOf("p1-1", {"Ada"})); }),
                StartsWith("the printer " + uri + ": "));
    EXPECT_THAT(failureOf([&] { carrier_->test(); }), StartsWith("the printer " + uri + ": "));
    EXPECT_EQ(records_, 0);
}

TEST_F(PrinterCarrierTest, FailsWhereTheOtherSideIsNoPrinter) {
    for (char const* const words :
         {"SSH-2.0-server\r\n", "HTTP/1.1 404 Not Found\r\nContent-Length: 0\r\n\r\n",
          "HTTP/1.1 200 OK\r\nContent-Type: application/ipp\r\nContent-Length: "
          "9\r\n\r\n\x02\x01\xff\xff\xff\xff\xff\xff\xff"}) {
        VLServiceTest::CuttingRelay const babbler([words] {
            int ends[2];
            ::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends);
            ::send(ends[1], words, std::string(words).size(), MSG_DONTWAIT | MSG_NOSIGNAL);
            ::shutdown(ends[1], SHUT_WR);
            // It takes what it is told, and is closed with the relay.
            return ends[0];
        });
        std::string const uri = "ipp://127.0.0.1:" + std::to_string(babbler.port()) + "/ipp/print";
        PrinterCarrier carrier(uri);
        EXPECT_THAT(failureOf([&] { carrier.test(); }), StartsWith("the printer " + uri)) << words;
    }
}

TEST_F(PrinterCarrierTest, PrintsNoLetterTwiceWhereverTheConnectionIsCut) {
    start("");
    Carriers::Parcel parcel = parcelOf("p1-1", {"Ada"});
    parcel.document.assign(200'000, 'x');
    bool isCut = true;
    int uncertain = 0;
    int cutAt = 0;
    while (isCut && !HasFailure()) {
        parcel.key = "p1-" + std::to_string(++cutAt);
        isCut = false;
        // Only once: what was cut can be asked about.
        printer_->relay().onPiece([&](int piece) { return piece != cutAt || !(isCut = true); });
        Outcome outcome = tried(parcel);
        printer_->relay().onPiece({});
        uncertain += outcome.kind == Outcome::Kind::Uncertain ? 1 : 0;
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        // It is busy for as long as it prints.
        while (outcome.kind == Outcome::Kind::Failed && std::chrono::steady_clock::now() < end)
            outcome = tried(parcel);
        endOf(parcel.key);
        std::string const when = outcome.says + ", cut at piece " + std::to_string(cutAt);
        EXPECT_LE(timesPrinted(parcel.key), 1) << when;
        EXPECT_TRUE(outcome.kind == Outcome::Kind::Uncertain || timesPrinted(parcel.key) == 1) << when;
    }
    EXPECT_GT(cutAt, 10);
    EXPECT_LE(uncertain * 2, cutAt);
}

TEST(PrinterReasons, AreToldInWords) {
    EXPECT_EQ(Carriers::reasonsInWords({}), "");
    EXPECT_EQ(Carriers::reasonsInWords({"media-empty-error", "toner-empty-warning", "fuser-over-temp"}),
              "out of paper, out of toner, fuser-over-temp");
}

/// Whoever connects to it is never answered.
class SilentMachine {
public:
    SilentMachine() {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        auto* const generic = reinterpret_cast<sockaddr*>(&address);
        if (::bind(socket_, generic, size) != 0 || ::listen(socket_, 5) != 0 ||
            ::getsockname(socket_, generic, &size) != 0)
            throw std::runtime_error("no socket");
        port_ = ntohs(address.sin_port);
    }
    ~SilentMachine() { ::close(socket_); }
    SilentMachine(SilentMachine const&) = delete;
    SilentMachine& operator=(SilentMachine const&) = delete;

    std::string uri() const { return "ipp://127.0.0.1:" + std::to_string(port_) + "/ipp/print"; }

private:
    int socket_ = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    int port_ = 0;
};

TEST(PrinterThatHangs, IsGivenUpWhenTheServiceEnds) {
    SilentMachine const machine;
    Carriers::StopSign const stop;
    stop.raise();
    Carriers::PrinterCarrier carrier(machine.uri(), stop);
    auto const begin = std::chrono::steady_clock::now();
    EXPECT_THROW(carrier.handOver(parcelOf("p1-1", {"Ada"}), &noRecord), std::exception);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(40)) << "others get a minute";
}

} // namespace
