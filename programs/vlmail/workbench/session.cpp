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

constexpr std::string_view STATE = "state";
constexpr std::string_view SAVE = "save";
/// What the store is asked for.
constexpr std::array OF_STORE{STATE, std::string_view("reload"), SAVE};

json::Object toJson(StoredSettings const& stored) {
    return {{"text", stored.text}, {"version", stored.version}, {INHERITED, stored.inherited}};
}

Answer conflict(StoredSettings const& theirs, Base::Error const& failure) {
    return answerOf(
        {{"error", json::Object{{"code", Base::nameOf(failure.code())}, {"line", failure.what()}}},
         {"theirs", theirs.text},
         {"version", theirs.version},
         {INHERITED, theirs.inherited}},
        statusFor(failure.code()));
}

Answer save(SettingsStore& store, json::Object const& query) {
    SettingsText const known(query.get("text").toString());
    std::string const version = query.get("version").toString();
    try {
        return answerOf(toJson(store.write(known.text(), version)));
    } catch (Base::Error const& failure) {
        if (failure.code() != Base::Code::SettingsChanged)
            throw;
        return conflict(store.read(), failure);
    }
}

ReaderProcess::Work storeWork(std::shared_ptr<SettingsStore> store) {
    return [store = std::move(store)](std::string const& what, std::string const& query) {
        return answered([&] {
            return what == SAVE ? save(*store, json::strToObject(query.data(), query.size()))
                                : answerOf(toJson(store->read()));
        });
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
    std::string inherited;
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
        json::Object query{{"document", document()}, {"settings", settings}, {INHERITED, inherited}};
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
    : folders_(std::move(folders)), store_(std::move(store)), inherited_(store_->read().inherited),
      keeper_(io, limits, storeWork(store_)), front_(io, limits, deskWork(folders_)),
      back_(io, limits, deskWork(folders_)) {}

void Session::answer(std::string const& what, std::string body, Door::Respond const& respond) {
    try {
        json::Object const query = json::strToObject(body.data(), body.size());
        auto const* const reading = std::ranges::find(READINGS, what, &Reading::name);
        if (what == "verdicts")
            return judge(query, respond);
        if (what == "golden")
            return keepGolden(query, std::move(body), respond);
        if (std::ranges::find(OF_STORE, what) != OF_STORE.end())
            return ofStore(what, std::move(body), respond);
        if (reading == READINGS.end())
            return respond(here(what));
        std::string const document = query.get("document").textOrEmpty();
        if (reading->isOfDocument)
            requireDocument(document);
        if (what == "propose")
            for (std::string const& name : documentsOf(query))
                requireDocument(name);
        ReaderProcess& process = query.get("checks").isTrue() ? back_ : front_;
        process.ask({what, inContext(query, std::move(body)), document, reading->isReplaceable}, respond);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        respond(failureOf(failure));
    }
}

void Session::requireDocument(std::string const& name) const {
    if (!isNameInside(folders_.documents, name))
        throw Base::Error(Base::Code::DocumentUnknown, missing(name));
}

void Session::judge(json::Object const& query, Door::Respond const& respond) {
    auto const batch = std::make_shared<Batch>(Batch{documentsOf(query), query.get("settings").toString(),
                                                     inherited_, query.get("before"), respond});
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
    front_.ask({"expectation", inContext(query, std::move(body)), document}, [=](Answer answer) {
        if (answer.status != 200)
            return respond(std::move(answer));
        json::Object const kept = json::strToObject(answer.body.data(), answer.body.size());
        respond(writeGolden(file, kept.get("text").toString(), mayReplace));
    });
}

Answer Session::here(std::string const& what) {
    if (what == "schema")
        return schema();
    return failureOf(404, Base::Code::RequestInvalid,
                     "there is no request " + Base::inQuotes(Base::validUtf8(what)));
}

void Session::ofStore(std::string const& what, std::string body, Door::Respond const& respond) {
    keeper_.ask({what, std::move(body), store_->name()}, [=, this](Answer const& answer) {
        json::Object const told = takeInherited(json::strToObject(answer.body.data(), answer.body.size()));
        bool const isState = what == STATE && answer.status == 200;
        respond(answerOf(isState ? state(told) : told, answer.status));
    });
}

/// It stays here, and goes with each question that wants it.
json::Object Session::takeInherited(json::Object const& told) {
    json::Object rest;
    for (auto const& [key, value] : told)
        if (std::string_view(key) == INHERITED)
            inherited_ = value.textOrEmpty();
        else
            rest.set(key, value);
    return rest;
}

json::Object Session::state(json::Object const& stored) const {
    DocumentList const list = documentsIn(folders_.documents);
    json::Array documents;
    for (ListedDocument const& document : list.documents)
        documents.append(toJson(document));
    json::Object settings{{"kind", store_->kind()}, {"name", store_->name()}};
    for (auto const& [key, value] : stored)
        settings.set(key, value);
    return {{"folder", Base::validUtf8(folders_.documents.string())},
            {"settings", settings},
            {"documents", documents},
            {"problems", arrayOf(list.problems)}};
}

std::string Session::inContext(json::Object query, std::string body) const {
    if (inherited_.empty())
        return body;
    query.set(INHERITED, inherited_);
    return json::toText(query);
}

Answer Session::schema() { return answerOf(documentOf(*schemaNamed("settings"))); }

} // namespace VlMail::Workbench
