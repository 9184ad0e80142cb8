#include "tests/chaos/load.h"

#include "tests/vlserviced/letter_help.h"

#include <chrono>
#include <functional>
#include <utility>

namespace Chaos {
namespace {

namespace fs = std::filesystem;

constexpr char const* CARRIED = "postal";
constexpr char const* IN_CONTAINER = "email";
/// More than two data messages, so that a connection may be cut within a page.
constexpr std::size_t LARGE_PAGE = 2'500'000;
constexpr std::chrono::minutes PATIENCE{4};

/// Does not compress, and is another for each text.
std::string noiseOf(std::string const& text, std::size_t size) {
    auto state = static_cast<unsigned>(std::hash<std::string>()(text));
    std::string noise = text;
    while (noise.size() < size)
        noise += static_cast<char>((state = state * 1'664'525 + 1'013'904'223) >> 24);
    return noise;
}

} // namespace

std::vector<int> SentMailing::carried() const {
    std::vector<int> numbers;
    for (int letter = 1; letter <= LETTERS; ++letter)
        if (channelOf(letter) == CARRIED)
            numbers.push_back(letter);
    return numbers;
}

std::string SentMailing::channelOf(int letter) const {
    bool const isCarried = kind_ == Kind::ByCarrier || (kind_ == Kind::Both && letter == 1);
    return isCarried ? CARRIED : IN_CONTAINER;
}

/// No letter says what another one says.
std::string SentMailing::pageOf(int letter) const {
    std::string const text = "Letter " + std::to_string(letter) + " of " + id_;
    bool const isLarge = kind_ == Kind::InContainer && letter == LETTERS;
    return isLarge ? noiseOf(text, LARGE_PAGE)
                   : VLServiceTest::onePage("BT /F 10 Tf 72 700 Td (" + text + ") Tj ET").bytes();
}

void SentMailing::write(fs::path const& file) const {
    std::vector<std::string> channels;
    for (int letter = 1; letter <= LETTERS; ++letter)
        channels.push_back(channelOf(letter));
    Mailing::Metadata const mailing = lettersOf(id_, channels);
    Mailing::ContainerWriter writer(file, id_);
    for (int letter = 1; letter <= LETTERS; ++letter)
        writer.savePage(mailing.letters[static_cast<std::size_t>(letter) - 1].documents.at(0).document, "1",
                        zipped(pageOf(letter)));
    writer.finish(mailing.toBlob(), "make room");
}

std::string SentMailing::faultIn(fs::path const& container) const {
    if (!fs::exists(container))
        return "it is gone";
    PackWrapper pack(container.string(), PackWrapper::PURPOSE_IMPORT, "");
    std::string fault = pack.packId() == id_ ? "" : "it says that it is " + pack.packId();
    for (int letter = 1; letter <= LETTERS; ++letter) {
        if (channelOf(letter) == CARRIED)
            continue;
        std::string page;
        pack.requestPageData("letter " + std::to_string(letter) + ".pdf", "1",
                             [&](SharedMemBuffer const& blob) { page = unzipped(blob); });
        if (page != pageOf(letter))
            fault = "letter " + std::to_string(letter) + " is not as it was sent";
    }
    return fault;
}

Load::Load(Installation const& installation, std::string const& name, unsigned seed, int clients)
    : installation_(installation) {
    for (int client = 0; client < clients; ++client)
        clients_.emplace_back([this, name = name + '-' + std::to_string(client),
                               seed = seed + static_cast<unsigned>(client)] { run(name, seed); });
}

void Load::stop() {
    isStopping_ = true;
    for (std::thread& client : std::exchange(clients_, {}))
        client.join();
}

std::map<std::string, SentMailing> Load::answered() const {
    std::scoped_lock const lock(mutex_);
    return answered_;
}

std::vector<std::string> Load::unanswered() const {
    std::scoped_lock const lock(mutex_);
    return unanswered_;
}

void Load::run(std::string const& name, unsigned seed) {
    std::mt19937 random(seed);
    for (int number = 0; !isStopping_; ++number)
        send({name + '-' + std::to_string(number), static_cast<SentMailing::Kind>(random() % 3)}, random);
}

/// By one service or another, as a person goes on trying.
void Load::send(SentMailing const& mailing, std::mt19937& random) {
    fs::path const file = installation_.folder() / (mailing.id() + ".mailing");
    mailing.write(file);
    auto const end = std::chrono::steady_clock::now() + PATIENCE;
    ClientRun run;
    do
        run = installation_.vlmail(random() % Installation::SERVICES,
                                   {"send", file.string(), "--upload", "--node", "a=acme"});
    while (run.status != 0 && std::chrono::steady_clock::now() < end);
    fs::remove(file);
    std::scoped_lock const lock(mutex_);
    if (run.status == 0)
        answered_.emplace(mailing.id(), mailing);
    else
        unanswered_.push_back("mailing " + mailing.id() + " was not taken for four minutes: " + run.err);
}

} // namespace Chaos
