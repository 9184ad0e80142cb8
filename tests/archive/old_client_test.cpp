// What the client of version 0.1.0 said to its service is said to this one. tests/archive/0.1.0/client has,
// for each command that asked the service, the bytes that went each way, with the pages that were sent. They
// came about between that client and its own service, both built from the last commit of 0.1.0, by way of a
// program that passed on and kept what it got, with everything in the folder /FOLDER; none is ever made anew.
#include "programs/base/error.h"
#include "programs/channel/frame.h"
#include "programs/channel/proof.h"
#include "programs/channel/token.h"
#include "programs/vlmail/service/service_client.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/service_process.h"

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <set>

namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;

constexpr std::size_t PREFACE = 6;
constexpr std::size_t HEADER = 10;

std::string bytesIn(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

struct Message {
    std::uint8_t command = 0;
    Channel::Kind kind = Channel::Kind::Request;
    std::uint32_t sequence = 0;
    std::string text;

    std::string bytes() const {
        std::string all;
        Channel::appendFrame(all, {command, kind, sequence, text});
        return all;
    }
};

/// The number that four bytes are, in network order.
std::size_t numberAt(std::string_view bytes, std::size_t at) {
    std::size_t number = 0;
    for (char const byte : bytes.substr(at, 4))
        number = number << 8 | static_cast<unsigned char>(byte);
    return number;
}

Message messageIn(std::string_view bytes) {
    return {static_cast<std::uint8_t>(bytes[0]), static_cast<Channel::Kind>(bytes[1]),
            static_cast<std::uint32_t>(numberAt(bytes, 2)), std::string(bytes.substr(HEADER))};
}

std::vector<Message> messagesIn(std::string_view stream) {
    std::vector<Message> messages;
    for (std::size_t at = PREFACE; at < stream.size();) {
        std::size_t const length = HEADER + numberAt(stream, at + 6);
        messages.push_back(messageIn(stream.substr(at, length)));
        at += length;
    }
    return messages;
}

std::string replaced(std::string text, std::string const& what, std::string const& by) {
    for (std::size_t at = text.find(what); at != text.npos; at = text.find(what, at + by.size()))
        text.replace(at, what.size(), by);
    return text;
}

/// A connection as bytes.
class Line {
public:
    explicit Line(std::uint16_t port) : socket_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (::connect(socket_, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0)
            throw Base::Error(Base::Code::ConnectionLost, "the service takes no connection");
    }
    ~Line() { ::close(socket_); }
    Line(Line const&) = delete;
    Line& operator=(Line const&) = delete;

    void send(std::string const& bytes) const {
        if (::send(socket_, bytes.data(), bytes.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(bytes.size()))
            throw Base::Error(Base::Code::ConnectionLost, "the service takes no more");
    }
    std::string receive(std::size_t size) const {
        std::string bytes(size, '\0');
        if (size > 0 && ::recv(socket_, bytes.data(), size, MSG_WAITALL) != static_cast<ssize_t>(size))
            throw Base::Error(Base::Code::ConnectionLost, "the service has closed the connection");
        return bytes;
    }
    Message receiveMessage() const {
        std::string const header = receive(HEADER);
        return messageIn(header + receive(numberAt(header, 6)));
    }

private:
    int socket_;
};

/// What has become of a job is another thing each time, and so is when and of how many.
bool isOfTheMoment(std::string const& key, json::Value const& before) {
    static std::set<std::string> const keys{"accepted", "changed", "container", "problem", "to_upload"};
    return keys.contains(key) || (key == "jobs" && before.isObject());
}

/// Those that this client knew.
bool isKnownState(std::string const& state) {
    static std::set<std::string> const states{"accepted", "queued",    "submitting", "submitted",
                                              "lodged",   "delivered", "failed"};
    return states.contains(state);
}

/// Behind the line of a failure its code may stand.
bool saysTheSame(std::string const& before, std::string const& now) {
    return now == before || (now.starts_with(before + " [") && now.find(']') == now.size() - 1);
}

std::string whatIsMissing(json::Value const& before, json::Value const& now, std::string const& where = "");

std::string missingInObject(json::Object const& before, json::Object const& now, std::string const& where) {
    for (auto const& [key, value] : before) {
        std::string const name = key;
        json::Value const found = now.get(key);
        std::string why;
        if (name == "err")
            why = found && saysTheSame(value.textOrEmpty(), found.textOrEmpty())
                      ? ""
                      : where + "/err is " + print(found);
        else if (name == "state")
            why = isKnownState(found.textOrEmpty()) ? "" : "the state \"" + found.textOrEmpty() + '"';
        else if (!isOfTheMoment(name, value))
            why = whatIsMissing(value, found, where + '/' + name);
        if (!why.empty())
            return why;
    }
    return {};
}

std::string missingInArray(json::Array const& before, json::Array const& now, std::string const& where) {
    std::string why;
    for (std::size_t i = 0; i < before.size() && why.empty(); ++i)
        why = whatIsMissing(before.at(i), now.at(i), where + '/' + std::to_string(i));
    return why;
}

/// What that client would miss, or not understand, where it was answered otherwise before; `where` leads
/// there.
std::string whatIsMissing(json::Value const& before, json::Value const& now, std::string const& where) {
    if (before.isObject() && now.isObject())
        return missingInObject(before.toObject(), now.toObject(), where);
    if (before.isArray() && now.isArray() && before.toArray().size() == now.toArray().size())
        return missingInArray(before.toArray(), now.toArray(), where);
    std::string const found = now ? print(now) : "not there";
    return print(before) == found ? "" : where + " was " + print(before) + " and is " + found;
}

class OldClient : public testing::Test {
protected:
    OldClient() {
        for (char const* const name : {"home", "home/vlmail", "upload"})
            fs::create_directory(folder_ / name);
        fs::permissions(folder_ / "home" / "vlmail", fs::perms::owner_all);
    }

    std::string here(std::string const& text) const {
        return replaced(text, "/FOLDER", folder_.path().string());
    }

    /// The greeting of the first version, in which the proof alone depends on what the service says.
    void greet(Line const& line, std::string const& stream, std::vector<Message> const& said) const {
        line.send(stream.substr(0, PREFACE) + said[0].bytes());
        EXPECT_EQ(line.receive(PREFACE), stream.substr(0, PREFACE));
        json::Object const answer = parse(line.receiveMessage().text);
        Channel::Terms terms;
        terms.token = token_;
        std::string const nonce = parse(said[0].text).get("nonce").toString();
        std::string const service = answer.get("nonce").toString();
        EXPECT_EQ(answer.get("proof").toString(), makeProof(Channel::Side::Service, terms, nonce, service));
        Message proof = said[1];
        proof.text = print(json::Object{{"proof", makeProof(Channel::Side::Client, terms, nonce, service)}});
        EXPECT_EQ(proof.bytes().size(), said[1].bytes().size());
        line.send(proof.bytes());
        EXPECT_EQ(line.receiveMessage().text, "{}");
    }

    void replay(fs::path const& client) {
        SCOPED_TRACE(client.filename().string());
        std::string const stream = bytesIn(client);
        std::vector<Message> const said = messagesIn(stream);
        std::vector<Message> const answered =
            messagesIn(bytesIn(fs::path(client).replace_extension(".service")));
        ASSERT_EQ(said.size(), answered.size());
        placePages(fs::path(client).replace_extension(".packs.db"));
        Line const line(service_.port());
        greet(line, stream, said);
        for (std::size_t i = 2; i < said.size(); ++i) {
            Message request = said[i];
            request.text = here(request.text);
            line.send(request.bytes());
            Message const answer = line.receiveMessage();
            EXPECT_EQ(answer.command, answered[i].command);
            EXPECT_EQ(answer.sequence, answered[i].sequence);
            EXPECT_EQ(answer.kind, answered[i].kind) << answer.text;
            EXPECT_EQ(whatIsMissing(parse(here(answered[i].text)), parse(answer.text)), "") << request.text;
            awaitPages(parse(request.text));
        }
        ++replayed_;
    }

    void placePages(fs::path const& database) const {
        if (!fs::exists(database))
            return;
        fs::copy_file(database, folder_ / "home" / "vlmail" / "packs.db",
                      fs::copy_options::overwrite_existing);
        fs::permissions(folder_ / "home" / "vlmail" / "packs.db", fs::perms(0600));
    }

    /// The next command may find other pages there.
    void awaitPages(json::Object const& request) const {
        if (!request.get("db_conn"))
            return;
        Protocol::JobReport const job =
            VlMail::awaitJob(*clientOf(service_, data_), request.get("id").toString(), 20s);
        EXPECT_NE(job.state, Protocol::JobState::Accepted) << job.problem;
    }

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "service";
    ServiceProcess service_{
        {"--data", data_.string(), "--no-discovery", "--local-packs", folder_.path().string()}};
    std::string token_ = Channel::readToken((data_ / "token").string());
    std::size_t replayed_ = 0;
};

TEST_F(OldClient, IsAnsweredByThisServiceInAllThatItSays) {
    std::vector<fs::path> clients;
    for (auto const& entry : fs::directory_iterator(fs::path(TEST_ARCHIVE) / "0.1.0" / "client"))
        if (entry.path().extension() == ".client")
            clients.push_back(entry.path());
    std::ranges::sort(clients);
    for (fs::path const& client : clients)
        replay(client);
    EXPECT_EQ(replayed_, 17U);
    EXPECT_EQ(std::distance(fs::directory_iterator(folder_ / "upload"), fs::directory_iterator()), 3)
        << "two mailings and the folder's mark";
}

TEST(AnswersToAnOldClient, AreFoundToLackWhatIsGoneOrAnother) {
    auto const missing = [](char const* before, char const* now) {
        return whatIsMissing(parse(before), parse(now));
    };
    EXPECT_EQ(missing(R"({"a":{"b":[1,2]}})", R"({"a":{"b":[1,2],"c":3},"d":4})"), "");
    EXPECT_EQ(missing(R"({"a":{"b":1}})", R"({"a":{}})"), "/a/b was 1 and is not there");
    EXPECT_EQ(missing(R"({"a":[1]})", R"({"a":[1,2]})"), "/a was [1] and is [1,2]");
    EXPECT_EQ(missing(R"({"a":1})", R"({"a":"1"})"), "/a was 1 and is \"1\"");
    EXPECT_EQ(missing(R"({"a":{}})", R"({"a":1})"), "/a was {} and is 1");
    EXPECT_EQ(missing(R"({"state":"queued","changed":7})", R"({"state":"submitted","changed":8})"), "");
    EXPECT_EQ(missing(R"({"state":"queued"})", R"({"state":"held"})"), "the state \"held\"");
}

} // namespace
