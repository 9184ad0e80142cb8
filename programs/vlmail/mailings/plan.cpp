#include "programs/vlmail/mailings/plan.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/json_schema.h"
#include "programs/base/read_file.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/mailings/dispatch.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <set>
#include <sstream>
#include <string_view>
#include <utility>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

/// Of the form of the document; another one is refused.
constexpr int PLAN_VERSION = 1;

constexpr char const* VERSION_KEY = "plan";
constexpr char const* SETTINGS_KEY = "settings";
constexpr char const* DOCUMENTS_KEY = "documents";
constexpr char const* OUTCOME_KEY = "outcome";
constexpr char const* DIGEST_KEY = "digest";
constexpr char const* USED_DOCUMENTS_KEY = "used_documents";
constexpr char const* ID_KEY = "id";
constexpr char const* FILE_KEY = "file";
constexpr char const* SHA256_KEY = "sha256";
constexpr char const* SERVICE_KEY = "service";
constexpr char const* PLACE_KEY = "place";

std::string textOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return std::move(text).str();
}

/// All members but the digest itself, which is the last, and the name of a schema, which says nothing.
std::string digestOf(json::Object const& plan) {
    json::Object rest;
    for (auto const& [key, member] : plan) {
        if (std::string_view(key) != DIGEST_KEY && std::string_view(key) != Base::Schema::KEY)
            rest.set(key, member);
    }
    return Base::sha256(textOf(rest));
}

json::Object fileToJson(fs::path const& file, std::string const& digest) {
    return {{FILE_KEY, file.string()}, {SHA256_KEY, digest}};
}

json::Array toJson(std::vector<UsedDocument> const& documents) {
    json::Array array;
    for (UsedDocument const& used : documents) {
        json::Object object = fileToJson(used.file, used.sha256);
        object.set(ID_KEY, used.id);
        if (used.isOfService)
            object.set(SERVICE_KEY, true);
        array.append(object);
    }
    return array;
}

std::vector<UsedDocument> usedDocumentsIn(json::Value const& array) {
    std::vector<UsedDocument> documents;
    if (array)
        for (json::Value const& value : array.toArray()) {
            json::Object const& object = value.toObject();
            documents.push_back({object.get(ID_KEY).toString(), object.get(FILE_KEY).toString(),
                                 object.get(SHA256_KEY).toString(), object.get(SERVICE_KEY).isTrue()});
        }
    return documents;
}

/// It may have changed while it was being used.
void requireSame(UsedDocument const& used, std::vector<UsedDocument> const& planned) {
    auto const same = [&](UsedDocument const& one) { return one.id == used.id && one.sha256 == used.sha256; };
    if (std::none_of(planned.begin(), planned.end(), same))
        throw Base::Error(Base::Code::PlanOutdated, "cannot carry out the plan: \"" + used.file.string() +
                                                        "\" has changed; make it again with vlmail plan");
}

/// What is wrong with a file now, or nothing.
std::string changeOf(fs::path const& file, std::string const& digest) {
    try {
        return Base::sha256(Base::readFile(file)) == digest ? std::string()
                                                            : '"' + file.string() + "\" has changed";
    } catch (Base::Error const&) {
        return '"' + file.string() + "\" cannot be read any more";
    }
}

} // namespace

Plan::Plan(NodeSettings const& settings, std::vector<UsedDocument> used)
    : answer_(settings.answer()), place_(settings.place()), usedDocuments_(std::move(used)) {
    if (settings.file().empty())
        return;
    settingsFile_ = fs::absolute(settings.file());
    settingsSha256_ = settings.sha256();
}

Plan Plan::fromFile(fs::path const& file) {
    std::string const text = Base::readFile(file);
    try {
        json::Object const object = json::strToObject(text.data(), text.size());
        if (object.get(VERSION_KEY).intOrZero() != PLAN_VERSION)
            throw Base::Error(Base::Code::PlanMalformed, "it is no plan of this version");
        if (object.get(DIGEST_KEY).textOrEmpty() != digestOf(object))
            throw Base::Error(Base::Code::PlanMalformed, "it was changed since it was made");
        Plan plan;
        if (json::Value const settings = object.get(SETTINGS_KEY); settings.isObject())
            plan.readSettings(settings.toObject());
        plan.usedDocuments_ = usedDocumentsIn(object.get(USED_DOCUMENTS_KEY));
        for (json::Value const& value : object.get(DOCUMENTS_KEY).toArray()) {
            json::Object const& document = value.toObject();
            plan.add({document.get(FILE_KEY).toString(), document.get(SHA256_KEY).textOrEmpty(),
                      DocumentReading::fromJson(document)});
        }
        return plan;
    } catch (std::exception const& wrong) {
        throw Base::Error(Base::Code::PlanMalformed, "cannot use the plan \"" + file.string() + "\": " +
                                                         wrong.what() + "; make it again with vlmail plan");
    }
}

void Plan::readSettings(json::Object const& settings) {
    answer_ = settings.get(SERVICE_KEY);
    place_ = settings.get(PLACE_KEY).textOrEmpty();
    if (answer_)
        return;
    settingsFile_ = settings.get(FILE_KEY).toString();
    settingsSha256_ = settings.get(SHA256_KEY).toString();
}

json::Value Plan::settingsToJson() const {
    if (answer_)
        return json::Object{{SERVICE_KEY, answer_}, {PLACE_KEY, place_}};
    return settingsFile_.empty() ? json::Value(json_null()) : fileToJson(settingsFile_, settingsSha256_);
}

std::string Plan::toText(json::Object const& outcome) const {
    json::Array documents;
    for (DecidedDocument const& document : documents_) {
        json::Object object = fileToJson(document.file, document.sha256);
        for (auto const& [key, member] : document.reading.toJson())
            object.set(key, member);
        documents.append(object);
    }
    json::Object plan{{VERSION_KEY, PLAN_VERSION},
                      {SETTINGS_KEY, settingsToJson()},
                      {DOCUMENTS_KEY, documents},
                      {OUTCOME_KEY, outcome}};
    if (!usedDocuments_.empty())
        plan.set(USED_DOCUMENTS_KEY, toJson(usedDocuments_));
    plan.set(DIGEST_KEY, digestOf(plan));
    return textOf(plan) + '\n';
}

json::Object Plan::schema() {
    namespace Schema = Base::Schema;
    using Schema::Members;
    json::Object const settings = Members(Members::Others::Refused)
                                      .add(FILE_KEY, Schema::text())
                                      .add(SHA256_KEY, Schema::text())
                                      .add(SERVICE_KEY, Schema::mapOf(Schema::anything()))
                                      .add(PLACE_KEY, Schema::text())
                                      .schema();
    Members document(Members::Others::Refused);
    document.require(FILE_KEY, Schema::text()).require(SHA256_KEY, Schema::text());
    DocumentReading::describe(document);
    json::Object const used = Members(Members::Others::Refused)
                                  .require(ID_KEY, Schema::text())
                                  .require(FILE_KEY, Schema::text())
                                  .require(SHA256_KEY, Schema::text())
                                  .add(SERVICE_KEY, Schema::flag())
                                  .schema();
    return Members(Members::Others::Refused)
        .add(Schema::KEY, Schema::text())
        .require(VERSION_KEY, Schema::constant(PLAN_VERSION))
        .require(SETTINGS_KEY, Schema::orNull(settings))
        .require(DOCUMENTS_KEY, Schema::listOf(document.schema()))
        .require(OUTCOME_KEY, Dispatch::schema())
        .add(USED_DOCUMENTS_KEY, Schema::listOf(used))
        .require(DIGEST_KEY, Schema::text())
        .schema();
}

void Plan::requireUnchanged() const {
    std::string changes;
    auto const check = [&](fs::path const& file, std::string const& digest) {
        std::string const change = changeOf(file, digest);
        if (!change.empty())
            changes += (changes.empty() ? "" : ", ") + change;
    };
    if (!settingsFile_.empty())
        check(settingsFile_, settingsSha256_);
    for (UsedDocument const& used : usedDocuments_)
        if (!used.isOfService)
            check(used.file, used.sha256);
    for (DecidedDocument const& document : documents_) {
        if (!document.reading.failed())
            check(document.file, document.sha256);
    }
    if (!changes.empty())
        throw Base::Error(Base::Code::PlanOutdated,
                          "cannot carry out the plan: " + changes + "; make it again with vlmail plan");
}

NodeSettings Plan::settings() const {
    if (answer_)
        return NodeSettings::resolved(Protocol::SettingsAnswer(answer_.toObject()), place_);
    return settingsFile_.empty() ? NodeSettings() : NodeSettings::fromFile(settingsFile_);
}

bool Plan::usesService() const {
    return std::any_of(usedDocuments_.begin(), usedDocuments_.end(),
                       [](UsedDocument const& used) { return used.isOfService; });
}

DocumentFolder Plan::usedDocuments(Fetch const& fetch) const {
    DocumentFolder folder;
    for (UsedDocument const& used : usedDocuments_) {
        try {
            folder.fix(used.id,
                       {used.file, used.isOfService ? std::make_shared<std::string const>(fetch(used.sha256))
                                                    : nullptr});
        } catch (Base::Error const& gone) {
            throw Base::Error(Base::Code::PlanOutdated, "cannot carry out the plan: \"" + used.file.string() +
                                                            "\": " + gone.what() +
                                                            "; make it again with vlmail plan");
        }
    }
    return folder;
}

void Plan::prepare(MakingReady& making, Cfg::Presets const& presets, Workers const& workers,
                   Fetch const& fetch) const {
    std::set<std::string> names;
    for (DecidedDocument const& document : documents_)
        names.insert(document.reading.packPreset);
    std::vector<Cfg::PackPreset> used;
    for (std::string const& name : names)
        if (Cfg::PackPreset const* const preset = packPresetNamed(name, presets))
            used.push_back(*preset);
    making.prepare(used, usedDocuments(fetch), workers);
    for (UsedDocument const& document : making.usedDocuments())
        requireSame(document, usedDocuments_);
}

} // namespace VlMail
