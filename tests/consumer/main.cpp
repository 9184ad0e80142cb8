// A program as others write them: it uses the installed package alone, each of its subsystems once, and what
// comes along with the library.
#include <vlservice/vlservice.h>

#include <jansson.h>
#include <tinyxml.h>
#include <unicode/uversion.h>
#include <zlib.h>

#include <boost/filesystem/path.hpp>

#include <iostream>
#include <string>

namespace {

// The library's texts are ready for a program's static objects, whatever compiler either was built with.
std::string const TEXTS = Cfg::Id::USER_PREFIX + Cfg::Id::ACCOUNT_PREFIX + Cfg::App::PART_NAME +
                          Cfg::Presets::PART_NAME + Cfg::Presets::CATCH_ALL_PATTERN +
                          Cfg::PackPreset::NAME_FLD_NAME + Cfg::ExtractZone::DEF_ZONE_NAME +
                          PackWrapper::TAG_CORBULET;
Cfg::Id const BOB("bob/sales/acme");

int failures = 0;

void expect(bool holds, char const* what) {
    if (holds)
        return;
    std::cerr << "failed: " << what << '\n';
    ++failures;
}

void useSettings() {
    Cfg::App part(json::Object{{"descr", "Acme"}}, false, false);
    part.combineParent(Cfg::App(json::Value(), true, false));
    expect(part.value<Cfg::AppFieldIdxs::MaxLetterSheets>() == 999, "a setting is inherited");
    expect(part.getDescription() == "Acme", "a setting is the node's own");
    part.setOwn<Cfg::AppFieldIdxs::MaxLetterSheets>(7);
    expect(part.serialize() == json::Object{{"descr", "Acme"}, {"max_letter_sheets", 7}},
           "a part is written");
    expect(BOB.str() == "u=bob/ou=sales/a=acme", "a static id is complete");
    expect(TEXTS == "u=a=apppresets.*name_Addresscorbulet", "static texts are complete");
}

void usePresets() {
    Cfg::Presets const presets(json::Value(), true, false);
    auto const [extract, pack] = presets.findMatch("letter.pdf");
    expect(pack.name() == Cfg::Presets::CATCH_ALL_PACK_PRES_NAME, "a document has its presets");
    expect(extract.order() == Cfg::ExtractPreset::MAX_ORDER, "the highest order is one object");
}

void catchFailures() {
    try {
        json::strToObject("[]", 2);
        expect(false, "a wrong type is refused");
    } catch (json::Exc const& e) {
        expect(std::string(e.what()) == "JSON error: Wrong type: array. Expected type: object",
               "a failure is told");
    }
}

void useWhatComesAlong() {
    json::Value const number(json_integer(5));
    expect(json_integer_value(number.node()) == 5, "jansson is there");
    expect(crc32(0, nullptr, 0) == 0, "zlib is there");
    expect(boost::filesystem::path("a/b").filename() == "b", "Boost is there");
    TiXmlElement element("e");
    expect(element.ValueStr() == "e", "TinyXML is there");
    UVersionInfo version;
    u_getVersion(version);
    expect(version[0] > 0, "ICU is there");
}

} // namespace

int main() {
    useSettings();
    usePresets();
    catchFailures();
    useWhatComesAlong();
    return failures == 0 ? 0 : 1;
}
