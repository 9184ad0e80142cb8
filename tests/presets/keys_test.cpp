// What records and parts tell of their keys is what they do: each key is tried with a value of its type, with
// one of another and, where it is required, without any.
#include "vlservice/presets/settings_parts.h"

#include "tests/support/json_helpers.h"

#include <functional>
#include <string>
#include <vector>

namespace Cfg {
namespace {

using json::Inheritance;
using json::KeyRow;
using json::KeyType;
using json::KeyUse;
using testing::ElementsAre;
using testing::IsNull;

/// A record with the least that it needs to be read and written as an object.
struct Sample {
    char const* name;
    json::RecordKeys const& keys;
    std::string least;
    std::function<json::Value(json::Object const&)> rewrite;
};

template<typename T>
std::function<json::Value(json::Object const&)> rewriting() {
    return [](json::Object const& object) { return json::Form<T>::write(json::Form<T>::read(object)); };
}

template<typename Part>
Sample partSample() {
    return {Part::PART_NAME.c_str(), Part::keys(), "{}",
            [](json::Object const& object) { return Part(object, false, false).serialize(); }};
}

std::vector<Sample> samples() {
    return {
        {"Point", Point::keys(), R"({"x": 7, "y": 7})", rewriting<Point>()},
        {"Rect", Rect::keys(), R"({"left": 7, "top": 7, "right": 7, "bottom": 7})", rewriting<Rect>()},
        {"Department", Department::keys(), R"({"name": "n", "descrip": "d"})", rewriting<Department>()},
        {"Profile", Profile::keys(), R"({"name": "n"})", rewriting<Profile>()},
        {"ExtractField", ExtractField::keys(), R"({"name": "n"})", rewriting<ExtractField>()},
        {"ExtractZone", ExtractZone::keys(), R"({"name": "n", "fields": []})", rewriting<ExtractZone>()},
        {"ExtractPreset", ExtractPreset::keys(), R"({"match": "m"})", rewriting<ExtractPreset>()},
        {"Attachment", PackPreset::Attachment::keys(), R"({"id": "i", "unknown": 1})",
         rewriting<PackPreset::Attachment>()},
        {"DelayInfo", PackPreset::DelayInfo::keys(), "{}", rewriting<PackPreset::DelayInfo>()},
        {"LetterheadInf", LetterheadInf::keys(), R"({"id": "i", "skip_letters": true, "on_top": true})",
         rewriting<LetterheadInf>()},
        {"PackPreset", PackPreset::keys(), R"({"name": "n"})", rewriting<PackPreset>()},
        partSample<App>(),
        partSample<Inet>(),
        partSample<PO>(),
        partSample<Departments>(),
        partSample<Profiles>(),
        partSample<Presets>(),
    };
}

Sample const& sampleOf(json::RecordKeys const& keys) {
    static std::vector<Sample> const all = samples();
    for (Sample const& sample : all)
        if (&sample.keys == &keys)
            return sample;
    throw std::logic_error("a record without a sample");
}

/// A value of the row's type, other than any default.
std::string valueFor(KeyRow const& row) {
    switch (row.form.type) {
    case KeyType::Text:
        return R"("text")";
    case KeyType::Flag:
        return "true";
    case KeyType::Int32:
    case KeyType::UInt32:
    case KeyType::Int64:
    case KeyType::UInt64:
    case KeyType::Bits:
        return "1";
    case KeyType::Number:
        return "0.5";
    case KeyType::Record:
        return sampleOf(*row.form.record).least;
    case KeyType::Records:
        return '[' + sampleOf(*row.form.record).least + ']';
    case KeyType::Numbers:
        return "[1,2]";
    case KeyType::Texts:
        return R"(["text"])";
    case KeyType::Any:
        break;
    }
    return R"("whatever")";
}

/// The least of the record with that key as well, or with another value there.
json::Object with(Sample const& sample, KeyRow const& row, std::string const& value) {
    json::Object object = parse(sample.least);
    object.set(row.name, valueOf(value));
    return object;
}

json::Object without(Sample const& sample, KeyRow const& row) {
    json::Object object;
    for (auto const& [key, value] : parse(sample.least))
        if (key != row.name)
            object.set(key, value);
    return object;
}

/// What stands there is kept as it is beside the field, so that the field's reading does not show.
bool isKeptToo(KeyRow const& row) { return row.name == "lock_pack_ui"; }

template<typename Check>
void forEachRow(Check check) {
    for (Sample const& sample : samples()) {
        EXPECT_FALSE(sample.keys.rows.empty()) << sample.name;
        for (KeyRow const& row : sample.keys.rows) {
            SCOPED_TRACE(sample.name + (": " + row.name));
            check(sample, row);
        }
    }
}

TEST(KeysOfRecords, AreReadAndWrittenBackInTheTypeThatTheyTell) {
    forEachRow([](Sample const& sample, KeyRow const& row) {
        if (row.form.type == KeyType::Any)
            return;
        json::Value const back = sample.rewrite(with(sample, row, valueFor(row)));
        ASSERT_TRUE(back.isObject());
        EXPECT_EQ(print(back.toObject().get(row.name)), print(valueOf(valueFor(row))));
    });
}

TEST(KeysOfRecords, OfAnotherTypeAreReadAsTheDefaultOrRefused) {
    forEachRow([](Sample const& sample, KeyRow const& row) {
        if (row.form.type == KeyType::Any || isKeptToo(row))
            return;
        bool const isText = row.form.type == KeyType::Text;
        json::Object const wrong = with(sample, row, isText ? "5" : R"("text")");
        if (row.use == KeyUse::Lenient) {
            EXPECT_EQ(print(sample.rewrite(wrong)), print(sample.rewrite(without(sample, row))));
        } else {
            EXPECT_THROW(sample.rewrite(wrong), json::Exc);
        }
    });
}

TEST(KeysOfRecords, ThatAreMissingReadAsTheirDefaultUnlessTheyAreRequired) {
    forEachRow([](Sample const& sample, KeyRow const& row) {
        if (row.use == KeyUse::Required) {
            EXPECT_THROW(sample.rewrite(without(sample, row)), json::Exc);
        } else if (!row.missing.empty() && row.inheritance == Inheritance::None && !isKeptToo(row)) {
            EXPECT_EQ(print(sample.rewrite(without(sample, row))),
                      print(sample.rewrite(with(sample, row, row.missing))));
        }
    });
}

TEST(KeysOfRecords, ThatAreDroppedAreGoneAndUnknownOnesAreKeptWhereTheyTell) {
    forEachRow([](Sample const& sample, KeyRow const& row) {
        if (row.use == KeyUse::Dropped) {
            EXPECT_FALSE(sample.rewrite(with(sample, row, "1")).toObject().get(row.name));
        }
    });
    for (Sample const& sample : samples()) {
        json::Value const back = sample.rewrite(with(sample, {.name = "unheard_of", .form = {}}, "1"));
        bool const isKept = back && back.toObject().get("unheard_of");
        EXPECT_EQ(isKept, sample.keys.keepsOthers) << sample.name;
    }
}

TEST(KeysOfRecords, TellWhereATextMayStandForTheObject) {
    EXPECT_TRUE(Department::keys().mayBeText);
    EXPECT_TRUE(LetterheadInf::keys().mayBeText);
    EXPECT_TRUE(PackPreset::Attachment::keys().mayBeText);
    EXPECT_FALSE(Profile::keys().mayBeText);
    EXPECT_FALSE(PackPreset::keys().mayBeText);
}

/// All keys of the part as that of the root, inherited.
json::Object rootOf(Sample const& sample) {
    json::Object root;
    for (KeyRow const& row : sample.keys.rows)
        root.set(row.name, valueOf(row.missing));
    return root;
}

template<typename Part>
void expectDefaultsOfTheRoot() {
    json::Object written;
    for (auto const& [key, value] : Part(json::Value(), true, false).serialize().toObject())
        written.set(key, isWrapper(value) ? unwrap(value) : value);
    EXPECT_EQ(print(rootOf(partSample<Part>())), print(written)) << Part::PART_NAME;
}

TEST(KeysOfParts, ComeInTheOrderOfWritingWithTheDefaultsOfTheRoot) {
    expectDefaultsOfTheRoot<App>();
    expectDefaultsOfTheRoot<Inet>();
    expectDefaultsOfTheRoot<PO>();
    expectDefaultsOfTheRoot<Departments>();
    expectDefaultsOfTheRoot<Profiles>();
}

TEST(KeysOfParts, TellWhetherAValueIsInheritedWholeOrByElements) {
    for (PartInfo const& part : settingsParts()) {
        bool const byElements = part.name == "profiles" || part.name == "presets";
        for (KeyRow const& row : part.keys.rows)
            EXPECT_EQ(row.inheritance, byElements ? Inheritance::ByElements : Inheritance::Whole)
                << part.name << ' ' << row.name;
    }
}

TEST(KeysOfParts, LeadDownToTheFieldsOfZones) {
    json::RecordKeys const* keys = &Presets::keys();
    for (char const* name : {"extract_presets", "zones", "fields"}) {
        ASSERT_TRUE(keys->find(name)) << name;
        keys = keys->find(name)->form.record;
    }
    EXPECT_EQ(keys, &ExtractField::keys());
}

TEST(SettingsParts, AreSixInTheOrderInWhichTheyAreShown) {
    std::vector<std::string> names;
    for (PartInfo const& part : settingsParts())
        names.push_back(part.name);
    EXPECT_THAT(names, ElementsAre("app", "inet", "po", "deps", "profiles", "presets"));
}

TEST(SettingsParts, AreFoundByName) {
    EXPECT_EQ(&findSettingsPart("deps")->keys, &Departments::keys());
    EXPECT_THAT(findSettingsPart("dep"), IsNull());
    EXPECT_THAT(findSettingsPart(""), IsNull());
}

// The reserved keys of a pack preset are those of its table but one, which stays among the additional keys.
TEST(KeysOfPackPresets, AreReservedButForTheLock) {
    for (KeyRow const& row : PackPreset::keys().rows) {
        json::Object const object = with(sampleOf(PackPreset::keys()), row, valueFor(row));
        PackPreset const preset(object, {});
        EXPECT_EQ(static_cast<bool>(preset.jAdditional()), row.name == "lock_pack_ui") << row.name;
    }
    EXPECT_EQ(PackPreset::keys().rows.size(), 27U);
}

} // namespace
} // namespace Cfg
