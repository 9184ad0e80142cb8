#include "programs/vlmail/workbench/session.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/schema/schemas.h"
#include "programs/vlmail/workbench/document_list.h"
#include "programs/vlmail/workbench/settings_text.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <array>
#include <new>
#include <string_view>
#include <utility>

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
};

ReaderProcess::Work deskWork(Folders const& folders) {
    return [desk = std::make_shared<Desk>(folders)](std::string const& what, std::string const& query) {
        return desk->answer(what, query);
    };
}

json::Object toJson(ListedDocument const& document) {
    return {{"name", document.name},
            {"size", static_cast<long long>(document.size)},
            {"golden", document.isGolden}};
}

template<typename List>
json::Array arrayOf(List const& list) {
    json::Array array;
    for (auto const& one : list)
        array.append(one);
    return array;
}

} // namespace

Session::Session(boost::asio::io_context& io, Folders folders, JobLimits const& limits,
                 std::unique_ptr<SettingsStore> store)
    : folders_(std::move(folders)), store_(std::move(store)), front_(io, limits, deskWork(folders_)) {}

void Session::answer(std::string const& what, std::string body, Door::Respond const& respond) {
    try {
        json::Object const query = json::strToObject(body.data(), body.size());
        auto const* const reading = std::ranges::find(READINGS, what, &Reading::name);
        if (reading == READINGS.end())
            return respond(here(what, query));
        std::string const document = query.get("document").textOrEmpty();
        if (reading->isOfDocument && !isNameInside(folders_.documents, document))
            throw Base::Error(Base::Code::DocumentUnknown,
                              "there is no document " + Base::inQuotes(document) + " in the folder any more");
        front_.ask({what, std::move(body), document, reading->isReplaceable}, respond);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (json::Exc const& wrong) {
        respond(failureOf(400, Base::Code::RequestInvalid,
                          std::string("the request is not what is wanted: ") + wrong.what()));
    } catch (std::exception const& failure) {
        respond(failureOf(failure));
    }
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
