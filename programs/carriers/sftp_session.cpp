#include "programs/carriers/sftp_session.h"

#include "programs/base/error.h"
#include "programs/base/marked_folder.h"
#include "programs/base/plain_text.h"
#include "programs/base/private_file.h"

#include <curl/curl.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstring>
#include <map>
#include <mutex>
#include <new>
#include <sstream>
#include <sys/socket.h>
#include <unistd.h>
#include <utility>
#include <vector>

namespace Carriers {
namespace {

constexpr long CONNECT_SECONDS = 30;
/// A connection over which nothing goes for so long is given up.
constexpr std::chrono::seconds STILL_TIME{30};
constexpr std::string_view SCHEME = "sftp://";
constexpr std::string_view HOME = "/~/";

void startLibrary() {
    static std::once_flag once;
    std::call_once(once, [] { curl_global_init(CURL_GLOBAL_DEFAULT); });
}

/// What stands in front of the folder, "USER@HOST:PORT".
std::string hostIn(std::string const& url) {
    return url.substr(SCHEME.size(), url.find('/', SCHEME.size()) - SCHEME.size());
}

/// As commands name it: from the root, or from where the user begins.
std::string folderIn(std::string const& url) {
    std::string const folder = url.substr(url.find('/', SCHEME.size()));
    return folder.starts_with(HOME) ? "./" + folder.substr(HOME.size()) : folder;
}

/// Bytes as the library takes them.
struct Source {
    std::string_view left;

    static std::size_t read(char* to, std::size_t size, std::size_t count, void* from) {
        std::string_view& left = static_cast<Source*>(from)->left;
        std::size_t const given = std::min(size * count, left.size());
        std::memcpy(to, left.data(), given);
        left.remove_prefix(given);
        return given;
    }
};

std::size_t append(char* bytes, std::size_t size, std::size_t count, void* to) {
    static_cast<std::string*>(to)->append(bytes, size * count);
    return size * count;
}

/// Gives a transfer up when a stop sign is raised, or when nothing goes over its connection for too long. It
/// shuts the connection down then: libcurl would say goodbye to a machine that hangs, wait for an answer, and
/// leave the session in memory when none comes.
class Watch {
public:
    explicit Watch(StopSign stop) : stop_(std::move(stop)) {}

    void over(CURL* handle) {
        isStill_ = false;
        sent_ = 0;
        since_ = Clock::now();
        curl_easy_setopt(handle, CURLOPT_SOCKOPTFUNCTION, &Watch::onSocket);
        curl_easy_setopt(handle, CURLOPT_SOCKOPTDATA, this);
        curl_easy_setopt(handle, CURLOPT_CLOSESOCKETFUNCTION, &Watch::onClose);
        curl_easy_setopt(handle, CURLOPT_CLOSESOCKETDATA, this);
        curl_easy_setopt(handle, CURLOPT_NOPROGRESS, 0L);
        curl_easy_setopt(handle, CURLOPT_XFERINFOFUNCTION, &Watch::onProgress);
        curl_easy_setopt(handle, CURLOPT_XFERINFODATA, this);
    }
    bool wasStill() const { return isStill_; }

private:
    using Clock = std::chrono::steady_clock;

    static int onSocket(void* self, curl_socket_t socket, curlsocktype) {
        static_cast<Watch*>(self)->socket_ = socket;
        return CURL_SOCKOPT_OK;
    }
    static int onClose(void* self, curl_socket_t socket) {
        auto& known = static_cast<Watch*>(self)->socket_;
        if (known == socket)
            known = CURL_SOCKET_BAD;
        return ::close(socket);
    }
    /// About once a second, also while nothing comes.
    static int onProgress(void* self, curl_off_t, curl_off_t, curl_off_t, curl_off_t sent) {
        return static_cast<Watch*>(self)->isOver(sent) ? 1 : 0;
    }
    bool isOver(curl_off_t sent) {
        if (std::exchange(sent_, sent) != sent)
            since_ = Clock::now();
        isStill_ = Clock::now() - since_ >= STILL_TIME;
        if (!isStill_ && !stop_.isRaised())
            return false;
        ::shutdown(socket_, SHUT_RDWR);
        return true;
    }

    StopSign stop_;
    curl_socket_t socket_ = CURL_SOCKET_BAD;
    curl_off_t sent_ = 0;
    Clock::time_point since_;
    bool isStill_ = false;
};

/// Commands for the other side; one that begins with "*" may fail.
class Commands {
public:
    explicit Commands(std::vector<std::string> const& commands) {
        for (std::string const& command : commands) {
            curl_slist* const longer = curl_slist_append(list_, command.c_str());
            if (!longer)
                throw std::bad_alloc();
            list_ = longer;
        }
    }
    ~Commands() { curl_slist_free_all(list_); }
    Commands(Commands const&) = delete;
    Commands& operator=(Commands const&) = delete;

    curl_slist* list() const { return list_; }

private:
    curl_slist* list_ = nullptr;
};

/// Of "f_bavail: 12" lines.
std::optional<unsigned long long> roomIn(std::string const& told) {
    std::istringstream words(told);
    std::map<std::string, unsigned long long> values;
    for (std::string word, value; words >> word;)
        if (word.starts_with("f_") && words >> value)
            values[word] = std::strtoull(value.c_str(), nullptr, 10);
    auto const unit = values.find("f_frsize:");
    auto const available = values.find("f_bavail:");
    if (unit == values.end() || available == values.end())
        return std::nullopt;
    return unit->second * available->second;
}

} // namespace

class SftpSession::Impl {
public:
    Impl(SftpTarget target, StopSign stop)
        : target_(std::move(target)), watch_(std::move(stop)), host_(hostIn(target_.url)),
          folder_(folderIn(target_.url)) {
        startLibrary();
        handle_ = curl_easy_init();
        if (!handle_)
            throw std::bad_alloc();
    }
    ~Impl() { curl_easy_cleanup(handle_); }
    Impl(Impl const&) = delete;
    Impl& operator=(Impl const&) = delete;

    void put(std::string const& name, std::string_view bytes, std::string const& goesFirst) {
        std::string const temporary = Base::temporaryOf(name);
        std::vector<std::string> before;
        if (!goesFirst.empty())
            before.push_back("*rm " + quoted(goesFirst));
        send(temporary, bytes, before,
             {"*rm " + quoted(name), "rename " + quoted(temporary) + ' ' + quoted(name)});
    }

    std::optional<unsigned long long> tryOut() {
        std::string const name = Base::temporaryOf("test");
        told_.clear();
        send(name, "test", {}, {"rm " + quoted(name), "*statvfs " + quoted("")});
        return roomIn(told_);
    }

private:
    /// The file of that name, as a command takes it.
    std::string quoted(std::string const& name) const {
        std::string path = "\"";
        for (char const c : folder_ + name)
            path += (c == '"' || c == '\\' ? "\\" : "") + std::string(1, c);
        return path + '"';
    }

    std::string urlOf(std::string const& name) const {
        std::unique_ptr<char, decltype(&curl_free)> const escaped(
            curl_easy_escape(handle_, name.c_str(), static_cast<int>(name.size())), &curl_free);
        if (!escaped)
            throw std::bad_alloc();
        return target_.url + escaped.get();
    }

    void send(std::string const& name, std::string_view bytes, std::vector<std::string> const& before,
              std::vector<std::string> const& behind) {
        Commands const first(before);
        Commands const last(behind);
        bool const wasConnected = std::exchange(isConnected_, false);
        CURLcode code = perform(name, bytes, first, last);
        // One that was idle may have been closed meanwhile.
        if (code != CURLE_OK && wasConnected)
            code = perform(name, bytes, first, last);
        if (code != CURLE_OK)
            throw Base::Error(Base::Code::CarrierUnavailable, inWords(code));
        isConnected_ = true;
    }

    CURLcode perform(std::string const& name, std::string_view bytes, Commands const& first,
                     Commands const& last) {
        Source source{bytes};
        curl_easy_reset(handle_);
        setConnection();
        set(CURLOPT_URL, urlOf(name).c_str());
        set(CURLOPT_UPLOAD, 1L);
        set(CURLOPT_READFUNCTION, &Source::read);
        set(CURLOPT_READDATA, &source);
        set(CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(bytes.size()));
        set(CURLOPT_HEADERFUNCTION, &append);
        set(CURLOPT_HEADERDATA, &told_);
        set(CURLOPT_QUOTE, first.list());
        set(CURLOPT_POSTQUOTE, last.list());
        return curl_easy_perform(handle_);
    }

    void setConnection() {
        // The library reads the file by its name, and says nothing of whom it is open to.
        Base::readPrivateFile(target_.identityFile);
        failure_.front() = '\0';
        watch_.over(handle_);
        set(CURLOPT_ERRORBUFFER, failure_.data());
        set(CURLOPT_NOSIGNAL, 1L);
        set(CURLOPT_PROTOCOLS_STR, "sftp");
        set(CURLOPT_PROXY, "");
        set(CURLOPT_SSH_AUTH_TYPES, static_cast<long>(CURLSSH_AUTH_PUBLICKEY));
        set(CURLOPT_SSH_HOST_PUBLIC_KEY_SHA256,
            target_.hostKey.substr(target_.hostKey.find(':') + 1).c_str());
        set(CURLOPT_SSH_PRIVATE_KEYFILE, target_.identityFile.c_str());
        set(CURLOPT_CONNECTTIMEOUT, CONNECT_SECONDS);
    }

    template<typename Value>
    void set(CURLoption option, Value value) {
        if (curl_easy_setopt(handle_, option, value) != CURLE_OK)
            throw std::bad_alloc();
    }

    std::string inWords(CURLcode code) const {
        std::string const said =
            Base::plainLine(failure_.front() ? failure_.data() : curl_easy_strerror(code));
        if (watch_.wasStill())
            return host_ + " has said nothing for " + std::to_string(STILL_TIME.count()) + " seconds";
        if (code == CURLE_PEER_FAILED_VERIFICATION)
            return host_ + " is not the machine with the \"host_key\" of the settings: " + said;
        if (code == CURLE_LOGIN_DENIED)
            return host_ + " has let nobody in with the key in " + target_.identityFile + ": " + said;
        return "nothing can be put into " + target_.url + ": " + said;
    }

    SftpTarget target_;
    Watch watch_;
    std::string host_;
    std::string folder_;
    CURL* handle_ = nullptr;
    bool isConnected_ = false;
    std::array<char, CURL_ERROR_SIZE> failure_{};
    std::string told_;
};

SftpSession::SftpSession(SftpTarget target, StopSign stop)
    : impl_(std::make_unique<Impl>(std::move(target), std::move(stop))) {}
SftpSession::~SftpSession() = default;

void SftpSession::put(std::string const& name, std::string_view bytes, std::string const& goesFirst) {
    impl_->put(name, bytes, goesFirst);
}

std::optional<unsigned long long> SftpSession::tryOut() { return impl_->tryOut(); }

} // namespace Carriers
