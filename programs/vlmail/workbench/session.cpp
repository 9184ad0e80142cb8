#include "programs/vlmail/workbench/session.h"

#include "programs/base/error.h"
#include "programs/base/pending_file.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/golden/test_case.h"
#include "programs/vlmail/schema/schemas.h"
#include "programs/vlmail/workbench/document_list.h"
#include "programs/vlmail/workbench/settings_text.h"
#include "programs/vlmail/workbench/verdict.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <filesystem>
#include <new>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

namespace VlMail::Workbench {
namespace {

/// What a reading process does.
struct Reading {
    std::string_view name;
    bool isReplaceable = false;
    bool isOfDocument = true;
};

constexpr std::array READINGS{
    Reading{"evaluate", true},
    Reading{"lint", true, false},
    Reading{"edit", false, false},
    Reading{"picture"},
    Reading{"blocks"},
    Reading{"propose", true, false},
    Reading{"adopt", false, false},
};

ReaderProcess::Work deskWork(Folders const& folders) {
    return [desk = std::make_shared<Desk>(folders)](std::string const& what, std::string const& query) {
        return desk->answer(what, query);
    };
}

json::Object toJson(ListedDocument const& document) {
    return {{"name", document.name},
            {"size", static_cast<long long>(document.size)},
            {"version", document.version},
            {"golden", document.isGolden}};
}

template<typename List>
json::Array arrayOf(List const& list) {
    json::Array array;
    for (auto const& one : list)
        array.append(one);
    return array;
}

/// A person sees the first of many documents soon, and none of them holds up a newer change.
constexpr std::chrono::milliseconds BATCH_TIME{500};
constexpr std::size_t MOST_IN_BATCH = 50;

std::vector<std::string> documentsOf(json::Object const& query) {
    std::vector<std::string> names;
    for (json::Value const& name : query.get("documents").toArray())
        names.push_back(name.toString());
    if (names.empty() || names.size() > MOST_IN_BATCH)
        throw Base::Error(Base::Code::RequestInvalid, "1 to 50 documents can be asked for at once");
    return names;
}

json::Object failedVerdict(std::string const& document, json::Object const& answer) {
    json::Object verdict = DocumentVerdict().toJson();
    for (auto const& [key, value] : json::Object{{"document", document},
                                                 {"verdict", "failed"},
                                                 {"says", "failed"},
                                                 {"error", answer.get("error")},
                                                 {"before", json::Value(json_null())},
                                                 {"change", json::Value(json_null())},
                                                 {"changes", json::Array()}})
        verdict.set(key, value);
    return verdict;
}

std::string missing(std::string const& document) {
    return "there is no document " + Base::inQuotes(Base::validUtf8(document)) + " in the folder any more";
}

Answer writeGolden(std::filesystem::path const& file, std::string const& text, bool mayReplace) {
    std::string const name = Base::validUtf8(file.filename().string());
    if (!mayReplace && std::filesystem::exists(file))
        return failureOf(409, Base::Code::FileExists,
                         "there is a file " + Base::inQuotes(name) + " already; replace it or leave it");
    try {
        Base::writeFile(file, text);
    } catch (std::system_error const& failure) {
        return failureOf(422, Base::Code::FileUnwritable,
                         "cannot write " + Base::inQuotes(name) + ": " + failure.code().message());
    }
    return answerOf({{"file", name}, {"text", text}});
}

} // namespace

struct Batch {
    std::vector<std::string> documents;
    std::string settings;
    /// The empty handle when nothing is compared.
    json::Value before;
    Door::Respond respond;
    std::chrono::steady_clock::time_point begin = std::chrono::steady_clock::now();
    json::Array verdicts = {};

    bool isDone() const {
        return verdicts.size() == documents.size() ||
               (!verdicts.empty() && std::chrono::steady_clock::now() > begin + BATCH_TIME);
    }
    /// The next one.
    std::string const& document() const { return documents[verdicts.size()]; }
    std::string query() const {
        json::Object query{{"document", document()}, {"settings", settings}};
        if (before.isString())
            query.set("before", before);
        return json::toText(query);
    }
    void take(Answer const& answer) {
        json::Object const object = json::strToObject(answer.body.data(), answer.body.size());
        verdicts.append(answer.status == 200 ? object : failedVerdict(document(), object));
    }
};

Session::Session(boost::asio::io_context& io, Folders folders, JobLimits const& limits,
                 std::unique_ptr<SettingsStore> store)
    : folders_(std::move(folders)), store_(std::move(store)), front_(io, limits, deskWork(folders_)),
      back_(io, limits, deskWork(folders_)) {}

void Session::answer(std::string const& what, std::string body, Door::Respond const& respond) {
    try {
        json::Object const query = json::strToObject(body.data(), body.size());
        auto const* const reading = std::ranges::find(READINGS, what, &Reading::name);
        if (what == "verdicts")
            return judge(query, respond);
        if (what == "golden")
            return keepGolden(query, std::move(body), respond);
        if (reading == READINGS.end())
            return respond(here(what, query));
        std::string const document = query.get("document").textOrEmpty();
        if (reading->isOfDocument)
            requireDocument(document);
        if (what == "propose")
            for (std::string const& name : documentsOf(query))
                requireDocument(name);
        ReaderProcess& process = query.get("checks").isTrue() ? back_ : front_;
        process.ask({what, std::move(body), document, reading->isReplaceable}, respond);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (json::Exc const& wrong) {
        respond(failureOf(400, Base::Code::RequestInvalid,
                          std::string("the request is not what is wanted: ") + wrong.what()));
    } catch (std::exception const& failure) {
        respond(failureOf(failure));
    }
}

void Session::requireDocument(std::string const& name) const {
    if (!isNameInside(folders_.documents, name))
        throw Base::Error(Base::Code::DocumentUnknown, missing(name));
}

void Session::judge(json::Object const& query, Door::Respond const& respond) {
    auto const batch = std::make_shared<Batch>(
        Batch{documentsOf(query), query.get("settings").toString(), query.get("before"), respond});
    if (auto const broken = whatIsBroken(batch->settings))
        throw Base::Error(Base::Code::JsonMalformed, "the settings are no JSON: " + broken->says);
    if (auto const older = std::exchange(batch_, batch))
        older->respond(
            failureOf(409, Base::Code::Superseded, "newer verdicts were asked for before these were there"));
    judgeNext(batch);
}

/// One that was removed meanwhile is no reason to tell nothing of the others.
void Session::passOverMissing(Batch& batch) const {
    while (!batch.isDone() && !isNameInside(folders_.documents, batch.document()))
        batch.take(failureOf(404, Base::Code::DocumentUnknown, missing(batch.document())));
}

/// One job a document: whatever brings its reader down has no verdict, and the others have.
void Session::judgeNext(std::shared_ptr<Batch> const& batch) {
    passOverMissing(*batch);
    if (batch->isDone()) {
        batch_.reset();
        return batch->respond(answerOf({{"verdicts", batch->verdicts}}));
    }
    back_.ask({"verdict", batch->query(), batch->document(), true}, [this, batch](Answer const& answer) {
        if (batch_ != batch)
            return;
        batch->take(answer);
        judgeNext(batch);
    });
}

void Session::keepGolden(json::Object const& query, std::string body, Door::Respond const& respond) {
    std::string const document = query.get("document").toString();
    requireDocument(document);
    bool const mayReplace = query.get("replace").isTrue();
    auto const file = expectationBeside(folders_.documents / document);
    front_.ask({"expectation", std::move(body), document}, [=](Answer answer) {
        if (answer.status != 200)
            return respond(std::move(answer));
        json::Object const kept = json::strToObject(answer.body.data(), answer.body.size());
        respond(writeGolden(file, kept.get("text").toString(), mayReplace));
    });
}

Answer Session::here(std::string const& what, json::Object const& query) {
    if (what == "state")
        return state();
    if (what == "reload")
        return reload();
    if (what == "save")
        return save(query);
    if (what == "schema")
        return schema();
    return failureOf(404, Base::Code::RequestInvalid,
                     "there is no request " + Base::inQuotes(Base::validUtf8(what)));
}

Answer Session::state() {
    DocumentList const list = documentsIn(folders_.documents);
    json::Array documents;
    for (ListedDocument const& document : list.documents)
        documents.append(toJson(document));
    StoredSettings const stored = store_->read();
    return answerOf({{"folder", Base::validUtf8(folders_.documents.string())},
                     {"settings", json::Object{{"kind", store_->kind()},
                                               {"name", store_->name()},
                                               {"text", stored.text},
                                               {"version", stored.version}}},
                     {"documents", documents},
                     {"problems", arrayOf(list.problems)}});
}

Answer Session::reload() {
    StoredSettings const stored = store_->read();
    return answerOf({{"text", stored.text}, {"version", stored.version}});
}

Answer Session::save(json::Object const& query) {
    std::string const text = query.get("text").toString();
    std::string const version = query.get("version").toString();
    SettingsText const known(text);
    StoredSettings const theirs = store_->read();
    if (theirs.version != version)
        return answerOf(
            {{"error",
              json::Object{{"code", Base::nameOf(Base::Code::SettingsChanged)},
                           {"line",
                            "the settings were changed by somebody else since they were read; look at "
                            "both and save what is to stay"}}},
             {"theirs", theirs.text},
             {"version", theirs.version}},
            statusFor(Base::Code::SettingsChanged));
    StoredSettings const written = store_->write(known.text());
    return answerOf({{"text", written.text}, {"version", written.version}});
}

Answer Session::schema() { return answerOf(documentOf(*schemaNamed("settings"))); }

} // namespace VlMail::Workbench
