#include "programs/carriers/printer_session.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"

#include <cups/cups.h>
#include <cups/pwg.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <utility>

namespace Carriers {
namespace {

constexpr int CONNECT_MILLISECONDS = 30'000;
/// A printer that says nothing for so long is given up.
constexpr int STILL_SECONDS = 60;
constexpr char const* PDF = "application/pdf";
constexpr char const* USER = "vlserviced";

using Connection = std::unique_ptr<http_t, decltype(&httpClose)>;
using Message = std::unique_ptr<ipp_t, decltype(&ippDelete)>;

/// How long a printer has been silent, as far as CUPS asks about it once a second.
class Silence {
public:
    explicit Silence(StopSign stop) : stop_(std::move(stop)) {}

    StopSign const& stop() const { return stop_; }
    /// Behind a second of silence: whether the printer gets another one.
    static int another(http_t*, void* silence) { return static_cast<Silence*>(silence)->isToWait() ? 1 : 0; }

private:
    bool isToWait() {
        constexpr std::chrono::milliseconds AT_ONCE(1500);
        auto const now = std::chrono::steady_clock::now();
        // Something came in between.
        if (now - last_ > AT_ONCE)
            seconds_ = 0;
        last_ = now;
        return ++seconds_ < STILL_SECONDS && !stop_.isRaised();
    }

    StopSign stop_;
    std::chrono::steady_clock::time_point last_;
    int seconds_ = 0;
};

std::vector<std::string> textsOf(ipp_t* message, char const* name) {
    ipp_attribute_t* const found = ippFindAttribute(message, name, IPP_TAG_ZERO);
    std::vector<std::string> texts;
    for (int i = 0; i < ippGetCount(found); ++i)
        if (char const* const text = ippGetString(found, i, nullptr))
            texts.emplace_back(text);
    return texts;
}

std::string textOf(ipp_t* message, char const* name) {
    std::vector<std::string> const texts = textsOf(message, name);
    return texts.empty() ? std::string() : texts.front();
}

bool has(std::vector<std::string> const& texts, char const* wanted) {
    return std::ranges::find(texts, wanted) != texts.end();
}

int mostCopiesIn(ipp_t* message) {
    ipp_attribute_t* const found = ippFindAttribute(message, "copies-supported", IPP_TAG_RANGE);
    int most = 1;
    if (found)
        ippGetRange(found, 0, &most);
    return most;
}

PrinterJob::State stateOf(int state) {
    switch (state) {
    case IPP_JSTATE_PROCESSING:
    case IPP_JSTATE_STOPPED:
        return PrinterJob::State::Printing;
    case IPP_JSTATE_CANCELED:
        return PrinterJob::State::Cancelled;
    case IPP_JSTATE_ABORTED:
        return PrinterJob::State::Aborted;
    case IPP_JSTATE_COMPLETED:
        return PrinterJob::State::Printed;
    default:
        return PrinterJob::State::Waiting;
    }
}

void note(ipp_attribute_t* attribute, PrinterJob& job) {
    std::string_view const name = ippGetName(attribute) ? ippGetName(attribute) : "";
    if (name == "job-id")
        job.id = ippGetInteger(attribute, 0);
    else if (name == "job-name")
        job.name = ippGetString(attribute, 0, nullptr) ? ippGetString(attribute, 0, nullptr) : "";
    else if (name == "job-state")
        job.state = stateOf(ippGetInteger(attribute, 0));
    else if (name == "time-at-processing")
        // Nothing of a number until then.
        job.wasBegun = job.wasBegun || ippGetValueTag(attribute) == IPP_TAG_INTEGER;
    else if (name == "job-state-reasons")
        job.lacksDocument = ippContainsString(attribute, "job-data-insufficient") != 0;
}

/// In the order of the message.
std::vector<PrinterJob> jobsIn(ipp_t* message) {
    std::vector<PrinterJob> jobs;
    bool isWithin = false;
    for (ipp_attribute_t* at = ippFirstAttribute(message); at; at = ippNextAttribute(message)) {
        bool const isOfJob = ippGetGroupTag(at) == IPP_TAG_JOB && ippGetName(at);
        if (isOfJob && !isWithin)
            jobs.emplace_back();
        isWithin = isOfJob;
        if (isOfJob)
            note(at, jobs.back());
    }
    for (PrinterJob& job : jobs)
        job.wasBegun = job.wasBegun || job.state == PrinterJob::State::Printing ||
                       job.state == PrinterJob::State::Printed;
    return jobs;
}

/// Whether a document is not wanted, whenever it comes.
bool isRefusal(ipp_status_t status) {
    return status == IPP_STATUS_ERROR_DOCUMENT_FORMAT_NOT_SUPPORTED ||
           status == IPP_STATUS_ERROR_DOCUMENT_FORMAT_ERROR || status == IPP_STATUS_ERROR_REQUEST_ENTITY ||
           status == IPP_STATUS_ERROR_COMPRESSION_NOT_SUPPORTED ||
           status == IPP_STATUS_ERROR_DOCUMENT_UNPRINTABLE;
}

bool isGood(ipp_t* message) {
    return message && ippGetStatusCode(message) < IPP_STATUS_REDIRECTION_OTHER_SITE;
}

} // namespace

class PrinterSession::Impl {
public:
    Impl(std::string uri, StopSign stop)
        : silence_(std::move(stop)), uri_(std::move(uri)), connection_(nullptr, &httpClose) {
        std::array<char, 32> scheme{};
        std::array<char, 256> user{};
        std::array<char, 256> host{};
        std::array<char, 1024> path{};
        if (httpSeparateURI(HTTP_URI_CODING_ALL, uri_.c_str(), scheme.data(), scheme.size(), user.data(),
                            user.size(), host.data(), host.size(), &port_, path.data(),
                            path.size()) < HTTP_URI_STATUS_OK)
            throw Base::Error(Base::Code::SettingInvalid, uri_ + " is no address of a printer");
        host_ = host.data();
        path_ = path.data();
    }

    /// Connects anew: one that was idle may have been closed meanwhile.
    PrinterFacts facts() {
        connection_.reset();
        Message request = newRequest(IPP_OP_GET_PRINTER_ATTRIBUTES);
        want(request.get(), {"printer-name", "printer-is-accepting-jobs", "printer-state-reasons",
                             "document-format-supported", "sides-supported", "print-color-mode-supported",
                             "media-supported", "copies-supported"});
        Message const told = answerTo(std::move(request));
        PrinterFacts facts;
        facts.name = Base::plainLine(textOf(told.get(), "printer-name"));
        ipp_attribute_t* const accepts =
            ippFindAttribute(told.get(), "printer-is-accepting-jobs", IPP_TAG_BOOLEAN);
        facts.takesJobs = accepts && ippGetBoolean(accepts, 0) != 0;
        facts.takesPdf = has(textsOf(told.get(), "document-format-supported"), PDF);
        facts.sides = textsOf(told.get(), "sides-supported");
        facts.colourModes = textsOf(told.get(), "print-color-mode-supported");
        facts.media = textsOf(told.get(), "media-supported");
        facts.mostCopies = mostCopiesIn(told.get());
        facts.reasons = textsOf(told.get(), "printer-state-reasons");
        std::erase(facts.reasons, "none");
        return facts;
    }

    std::vector<PrinterJob> jobs() {
        std::vector<PrinterJob> all;
        // One that ends meanwhile is told of twice rather than not at all.
        for (char const* const which : {"not-completed", "completed"}) {
            Message request = newRequest(IPP_OP_GET_JOBS);
            ippAddString(request.get(), IPP_TAG_OPERATION, IPP_TAG_KEYWORD, "which-jobs", nullptr, which);
            wantJob(request.get());
            for (PrinterJob& job : jobsIn(answerTo(std::move(request)).get()))
                all.push_back(std::move(job));
        }
        std::ranges::stable_sort(all, {}, &PrinterJob::id);
        return all;
    }

    PrinterJob job(int id) {
        Message request = newRequest(IPP_OP_GET_JOB_ATTRIBUTES);
        ippAddInteger(request.get(), IPP_TAG_OPERATION, IPP_TAG_INTEGER, "job-id", id);
        wantJob(request.get());
        std::vector<PrinterJob> const jobs = jobsIn(answerTo(std::move(request)).get());
        if (jobs.empty())
            throw Base::Error(Base::Code::CarrierUnavailable,
                              "the printer " + uri_ + " says nothing of job " + std::to_string(id));
        return jobs.front();
    }

    void cancel(int id) {
        Message request = newRequest(IPP_OP_CANCEL_JOB);
        ippAddInteger(request.get(), IPP_TAG_OPERATION, IPP_TAG_INTEGER, "job-id", id);
        answerTo(std::move(request));
    }

    int create(std::string const& name, PrintWishes const& wishes) {
        Message request = newRequest(IPP_OP_CREATE_JOB);
        ippAddString(request.get(), IPP_TAG_OPERATION, IPP_TAG_NAME, "job-name", nullptr, name.c_str());
        for (auto const& [key, value] :
             {std::pair("sides", &wishes.sides), std::pair("print-color-mode", &wishes.colourMode),
              std::pair("media", &wishes.media)})
            if (!value->empty())
                ippAddString(request.get(), IPP_TAG_JOB, IPP_TAG_KEYWORD, key, nullptr, value->c_str());
        if (wishes.copies > 1)
            ippAddInteger(request.get(), IPP_TAG_JOB, IPP_TAG_INTEGER, "copies", wishes.copies);
        Message const told = answerTo(std::move(request));
        ipp_attribute_t* const id = ippFindAttribute(told.get(), "job-id", IPP_TAG_INTEGER);
        if (!id)
            throw Base::Error(Base::Code::CarrierUnavailable,
                              "the printer " + uri_ + " makes jobs without a number");
        return ippGetInteger(id, 0);
    }

    void send(int id, std::string_view pdf) {
        Message const request = newRequest(IPP_OP_SEND_DOCUMENT);
        ippAddInteger(request.get(), IPP_TAG_OPERATION, IPP_TAG_INTEGER, "job-id", id);
        ippAddString(request.get(), IPP_TAG_OPERATION, IPP_TAG_MIMETYPE, "document-format", nullptr, PDF);
        ippAddBoolean(request.get(), IPP_TAG_OPERATION, "last-document", 1);
        connect();
        http_status_t status = cupsSendRequest(connection_.get(), request.get(), path_.c_str(),
                                               ippLength(request.get()) + pdf.size());
        if (status == HTTP_STATUS_CONTINUE)
            status = cupsWriteRequestData(connection_.get(), pdf.data(), pdf.size());
        bool const isWhole = status == HTTP_STATUS_CONTINUE;
        Message const told(status == HTTP_STATUS_CONTINUE || status == HTTP_STATUS_OK
                               ? cupsGetResponse(connection_.get(), path_.c_str())
                               : nullptr,
                           &ippDelete);
        if (isGood(told.get()))
            return;
        std::string const words = failureInWords();
        connection_.reset();
        if (told && isRefusal(ippGetStatusCode(told.get())))
            throw PrinterRefusal(words);
        if (isWhole && !told)
            throw PrinterSilence(Base::Code::CarrierUnavailable, words);
        throw Base::Error(Base::Code::CarrierUnavailable, words);
    }

private:
    void connect() {
        if (connection_)
            return;
        connection_.reset(httpConnect2(host_.c_str(), port_, nullptr, AF_UNSPEC, HTTP_ENCRYPTION_IF_REQUESTED,
                                       1, silence_.stop().isRaised() ? 1000 : CONNECT_MILLISECONDS, nullptr));
        if (!connection_)
            throw Base::Error(Base::Code::CarrierUnavailable, failureInWords());
        httpSetTimeout(connection_.get(), 1, &Silence::another, &silence_);
    }

    Message newRequest(ipp_op_t operation) const {
        Message request(ippNewRequest(operation), &ippDelete);
        if (!request)
            throw std::bad_alloc();
        ippAddString(request.get(), IPP_TAG_OPERATION, IPP_TAG_URI, "printer-uri", nullptr, uri_.c_str());
        ippAddString(request.get(), IPP_TAG_OPERATION, IPP_TAG_NAME, "requesting-user-name", nullptr, USER);
        return request;
    }

    static void want(ipp_t* request, std::vector<char const*> const& attributes) {
        ippAddStrings(request, IPP_TAG_OPERATION, IPP_TAG_KEYWORD, "requested-attributes",
                      static_cast<int>(attributes.size()), nullptr, attributes.data());
    }
    static void wantJob(ipp_t* request) {
        want(request, {"job-id", "job-name", "job-state", "job-state-reasons", "time-at-processing"});
    }

    Message answerTo(Message request) {
        connect();
        Message told(cupsDoRequest(connection_.get(), request.release(), path_.c_str()), &ippDelete);
        if (isGood(told.get()))
            return told;
        std::string const words = failureInWords();
        connection_.reset();
        throw Base::Error(Base::Code::CarrierUnavailable, words);
    }

    std::string failureInWords() const {
        return "the printer " + uri_ + ": " + Base::plainLine(cupsLastErrorString());
    }

    Silence silence_;
    std::string uri_;
    std::string host_;
    int port_ = 0;
    std::string path_;
    Connection connection_;
};

PrinterSession::PrinterSession(std::string uri, StopSign stop)
    : impl_(std::make_unique<Impl>(std::move(uri), std::move(stop))) {}
PrinterSession::~PrinterSession() = default;

PrinterFacts PrinterSession::facts() { return impl_->facts(); }
std::vector<PrinterJob> PrinterSession::jobs() { return impl_->jobs(); }
PrinterJob PrinterSession::job(int id) { return impl_->job(id); }
void PrinterSession::cancel(int id) { impl_->cancel(id); }
int PrinterSession::create(std::string const& name, PrintWishes const& wishes) {
    return impl_->create(name, wishes);
}
void PrinterSession::send(int id, std::string_view pdf) { impl_->send(id, pdf); }

std::string mediaNamed(int width, int height) {
    pwg_media_t const* const media = pwgMediaForSize(width, height);
    return media ? media->pwg : std::string();
}

} // namespace Carriers
