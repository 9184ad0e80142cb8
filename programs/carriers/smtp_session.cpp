#include "programs/carriers/smtp_session.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/carriers/curl_stop.h"

#include <curl/curl.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <exception>
#include <mutex>
#include <new>
#include <optional>
#include <string_view>
#include <sys/socket.h>
#include <utility>

namespace Carriers {
namespace {

/// Until the user is let in.
constexpr long CONNECT_SECONDS = 60;
constexpr long ANSWER_SECONDS = 300;
constexpr long STALLED_SECONDS = 300;
constexpr std::size_t MAX_ANSWER_BYTES = 10'000;
/// Of replies while one mail is sent.
constexpr int MAX_LINES = 1000;

CURL* openHandle() {
    static std::once_flag once;
    std::call_once(once, [] { curl_global_init(CURL_GLOBAL_DEFAULT); });
    CURL* const handle = curl_easy_init();
    if (!handle)
        throw std::bad_alloc();
    return handle;
}

/// What the server was asked last.
enum class Step { Greeting, Hello, Tls, Login, Mail, Other, End };

std::optional<Step> stepOf(std::string_view sent) {
    constexpr std::pair<std::string_view, Step> STEPS[] = {
        {"EHLO", Step::Hello}, {"HELO", Step::Hello}, {"STARTTLS", Step::Tls},
        {"AUTH", Step::Login}, {"MAIL", Step::Mail},  {"RCPT", Step::Mail},
        {"DATA", Step::Mail},  {"NOOP", Step::Other}, {"QUIT", Step::End},
    };
    for (auto const& [verb, step] : STEPS)
        if (sent.starts_with(verb) && sent.find_first_of(" \r", 0) == verb.size())
            return step;
    return std::nullopt;
}

/// A reply of one line or more, as far as it has come.
struct Reply {
    int code = 0;
    std::string words;

    bool refuses() const { return code >= 500 && code < 600; }
    bool accepts() const { return code >= 200 && code < 300; }
    bool putsOff() const { return code >= 400 && code < 500; }
    /// Who is not known is no fault of the mail.
    bool wantsLogin() const { return code == 530 || code == 534 || code == 535 || code == 538; }
};

int codeOf(std::string_view line) {
    int code = 0;
    bool const isAlone = line.size() == 3 || (line.size() > 3 && (line[3] == ' ' || line[3] == '-'));
    if (!isAlone || std::from_chars(line.data(), line.data() + 3, code).ptr != line.data() + 3)
        return 0;
    return code >= 200 ? code : 0;
}

/// Behind the code.
std::string_view wordsIn(std::string_view line) { return line.substr(std::min<std::size_t>(line.size(), 4)); }

std::string_view withoutEnd(std::string_view line) {
    return line.substr(0, line.find_last_not_of("\r\n") + 1);
}

/// The most bytes that a message may have, as "SIZE 1000" among the extensions says.
std::optional<std::size_t> sizeLimitIn(std::string_view extensions) {
    constexpr std::string_view SIZE = "SIZE ";
    for (std::size_t at = 0; at < extensions.size();) {
        std::string_view const line = extensions.substr(at, extensions.find('\n', at) - at);
        at += line.size() + 1;
        std::size_t limit = 0;
        if (line.starts_with(SIZE) &&
            std::from_chars(line.data() + SIZE.size(), line.data() + line.size(), limit).ec == std::errc() &&
            limit > 0)
            return limit;
    }
    return std::nullopt;
}

} // namespace

/// One mail, or a trial.
class SmtpSession::Transfer {
public:
    Transfer(CURL* handle, SmtpServer const& server, std::string& extensions, StopSign const& stop)
        : handle_(handle), server_(server), extensions_(extensions) {
        giveUpWhenRaised(handle, stop);
        set(CURLOPT_URL, server.url.c_str());
        set(CURLOPT_PROTOCOLS_STR, "smtp,smtps");
        set(CURLOPT_PROXY, "");
        set(CURLOPT_NOSIGNAL, 1L);
        set(CURLOPT_USE_SSL, static_cast<long>(server.startsTls ? CURLUSESSL_ALL : CURLUSESSL_NONE));
        if (!server.caFile.empty())
            set(CURLOPT_CAINFO, server.caFile.c_str());
        if (!server.user.empty()) {
            set(CURLOPT_USERNAME, server.user.c_str());
            set(CURLOPT_PASSWORD, server.password.c_str());
        }
        set(CURLOPT_CONNECTTIMEOUT, CONNECT_SECONDS);
        set(CURLOPT_SERVER_RESPONSE_TIMEOUT, ANSWER_SECONDS);
        set(CURLOPT_LOW_SPEED_LIMIT, 1L);
        set(CURLOPT_LOW_SPEED_TIME, STALLED_SECONDS);
        set(CURLOPT_ERRORBUFFER, error_.data());
        set(CURLOPT_VERBOSE, 1L);
        set(CURLOPT_DEBUGFUNCTION, &Transfer::onSaid);
        set(CURLOPT_DEBUGDATA, this);
        set(CURLOPT_HEADERFUNCTION, &Transfer::onReply);
        set(CURLOPT_HEADERDATA, this);
        set(CURLOPT_WRITEFUNCTION, &Transfer::onContent);
    }
    /// The connection stays, and nothing of this transfer with it.
    ~Transfer() {
        curl_easy_reset(handle_);
        curl_slist_free_all(recipients_);
    }
    Transfer(Transfer const&) = delete;
    Transfer& operator=(Transfer const&) = delete;

    Outcome send(Mail const& mail, PutOnRecord const& mayHaveIt) {
        mail_ = &mail;
        mayHaveIt_ = &mayHaveIt;
        recipients_ = curl_slist_append(nullptr, mail.to.c_str());
        set(CURLOPT_MAIL_FROM, mail.from.c_str());
        set(CURLOPT_MAIL_RCPT, recipients_);
        set(CURLOPT_UPLOAD, 1L);
        set(CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(mail.size));
        set(CURLOPT_READFUNCTION, &Transfer::onRead);
        set(CURLOPT_READDATA, this);
        perform();
        if (failure_)
            std::rethrow_exception(failure_);
        return outcome();
    }

    void tryServer() {
        set(CURLOPT_NOBODY, 1L);
        set(CURLOPT_CUSTOMREQUEST, "NOOP");
        perform();
        if (result_ != CURLE_OK)
            throw Base::Error(Base::Code::CarrierUnavailable, whatFailed());
    }

private:
    template<typename T>
    void set(CURLoption option, T value) {
        CURLcode const result = curl_easy_setopt(handle_, option, value);
        if (result == CURLE_OUT_OF_MEMORY)
            throw std::bad_alloc();
        if (result != CURLE_OK)
            throw Base::Error(Base::Code::ProgramLimited, "e-mails cannot be sent with this libcurl: " +
                                                              std::string(curl_easy_strerror(result)));
    }

    void perform() {
        result_ = curl_easy_perform(handle_);
        if (!wasLeft())
            return;
        // The server has given a connection up that nothing was sent by for a while.
        error_.front() = '\0';
        reply_ = {};
        set(CURLOPT_FRESH_CONNECT, 1L);
        result_ = curl_easy_perform(handle_);
    }
    bool wasLeft() const {
        long connections = 1;
        curl_easy_getinfo(handle_, CURLINFO_NUM_CONNECTS, &connections);
        return result_ != CURLE_OK && connections == 0 && at_ == 0 && !failure_ && !isTooLarge_ &&
               (reply_.code == 0 || reply_.code == 421);
    }

    // Of what curl calls, nothing may throw.

    static int onSaid(CURL*, curl_infotype type, char* text, std::size_t size, void* self) {
        if (type == CURLINFO_HEADER_OUT)
            if (auto const step = stepOf({text, size}))
                static_cast<Transfer*>(self)->begin(*step);
        return 0;
    }
    void begin(Step step) {
        if (step == Step::End)
            isOver_ = true;
        if (isOver_)
            return;
        step_ = step;
        if (step == Step::Hello)
            extensions_.clear();
    }

    static std::size_t onReply(char* text, std::size_t one, std::size_t size, void* self) {
        return static_cast<Transfer*>(self)->take(withoutEnd({text, one * size})) ? one * size : 0;
    }
    /// False for what is no reply, and for more lines than any server has to say.
    bool take(std::string_view line) {
        if (isOver_)
            return true;
        isGarbage_ = codeOf(line) == 0 || ++lines_ > MAX_LINES;
        if (!isGarbage_)
            add(line);
        return !isGarbage_;
    }
    void add(std::string_view line) {
        bool const goesOn = isUnfinished_ && codeOf(line) == reply_.code;
        if (!goesOn)
            reply_ = {codeOf(line), std::string(line.substr(0, 3))};
        isUnfinished_ = line.size() > 3 && line[3] == '-';
        isReplyToMessage_ = mayHave_;
        if (reply_.words.size() + line.size() > MAX_ANSWER_BYTES)
            return;
        reply_.words += ' ' + std::string(wordsIn(line));
        if (step_ == Step::Hello && goesOn)
            extensions_ += (extensions_.empty() ? "" : "\n") + std::string(wordsIn(line));
    }

    static std::size_t onContent(char*, std::size_t one, std::size_t size, void*) { return one * size; }

    static std::size_t onRead(char* into, std::size_t one, std::size_t size, void* self) {
        return static_cast<Transfer*>(self)->read(into, one * size);
    }
    std::size_t read(char* into, std::size_t room) {
        if (at_ == 0 && (isTooLarge_ = mail_->size > sizeLimitIn(extensions_).value_or(mail_->size)))
            return CURL_READFUNC_ABORT;
        std::size_t const size = mail_->read(into, room);
        at_ += size;
        // Whose end would be the message's.
        if (size == 0 && at_ < mail_->size)
            return CURL_READFUNC_ABORT;
        // With the last of it.
        if (at_ == mail_->size && !mayHave_ && !putOnRecord())
            return CURL_READFUNC_ABORT;
        return size;
    }
    bool putOnRecord() {
        try {
            (*mayHaveIt_)();
            mayHave_ = true;
        } catch (...) {
            failure_ = std::current_exception();
        }
        return mayHave_;
    }

    Outcome outcome() const {
        if (isTooLarge_)
            return {Outcome::Kind::Refused, "the message has " + std::to_string(mail_->size) +
                                                " bytes, and " + server_.url + " takes " +
                                                std::to_string(sizeLimitIn(extensions_).value_or(0))};
        if (mayHave_)
            return outcomeOfMessage();
        bool const isOfTheMail = step_ == Step::Mail && reply_.refuses() && !reply_.wantsLogin();
        return {isOfTheMail ? Outcome::Kind::Refused : Outcome::Kind::Failed,
                isOfTheMail ? reply_.words : whatFailed()};
    }
    Outcome outcomeOfMessage() const {
        bool const isAnswered = isReplyToMessage_ && !isUnfinished_ && !isGarbage_;
        if (isAnswered && reply_.accepts())
            return {Outcome::Kind::Accepted, reply_.words};
        if (isAnswered && reply_.refuses())
            return {Outcome::Kind::Refused, reply_.words};
        if (isAnswered && reply_.putsOff())
            return {Outcome::Kind::Failed, reply_.words};
        return {Outcome::Kind::Uncertain,
                server_.url + " did not say whether it has taken the message: " + libraryWords()};
    }

    std::string whatFailed() const {
        if (step_ == Step::Login && reply_.code >= 400)
            // Its words may repeat what it was sent.
            return server_.url + " does not let the user " + server_.user + " in (" +
                   std::to_string(reply_.code) + ")";
        if (reply_.code >= 400 && !isGarbage_)
            return server_.url + " says: " + reply_.words;
        return server_.url + ": " + libraryWords();
    }
    std::string libraryWords() const {
        if (result_ == CURLE_ABORTED_BY_CALLBACK && !isTooLarge_)
            return "the service was ended before it answered";
        if (isGarbage_)
            return "it does not answer as a server of e-mail does";
        return error_.front() ? std::string(error_.data()) : std::string(curl_easy_strerror(result_));
    }

    CURL* handle_;
    SmtpServer const& server_;
    std::string& extensions_;
    Mail const* mail_ = nullptr;
    PutOnRecord const* mayHaveIt_ = nullptr;
    curl_slist* recipients_ = nullptr;
    std::array<char, CURL_ERROR_SIZE> error_{};
    CURLcode result_ = CURLE_OK;
    Step step_ = Step::Greeting;
    Reply reply_;
    bool isUnfinished_ = false;
    bool isReplyToMessage_ = false;
    bool isGarbage_ = false;
    int lines_ = 0;
    /// What the server says to the end of the connection tells nothing of the mail.
    bool isOver_ = false;
    /// Bytes that were given on.
    std::size_t at_ = 0;
    bool mayHave_ = false;
    bool isTooLarge_ = false;
    std::exception_ptr failure_;
};

SmtpSession::SmtpSession(StopSign stop) : stop_(std::move(stop)), handle_(openHandle(), &curl_easy_cleanup) {}
/// libcurl says goodbye and waits for the answer, which a server that hangs does not give.
SmtpSession::~SmtpSession() {
    curl_socket_t connection = CURL_SOCKET_BAD;
    if (stop_.isRaised() &&
        curl_easy_getinfo(handle_.get(), CURLINFO_ACTIVESOCKET, &connection) == CURLE_OK &&
        connection != CURL_SOCKET_BAD)
        ::shutdown(connection, SHUT_RDWR);
}

Outcome SmtpSession::send(SmtpServer const& server, Mail const& mail, PutOnRecord const& mayHaveIt) {
    return Transfer(handle_.get(), server, extensions_, stop_).send(mail, mayHaveIt);
}

std::string SmtpSession::extensions(SmtpServer const& server) {
    Transfer(handle_.get(), server, extensions_, stop_).tryServer();
    return extensions_;
}

} // namespace Carriers
