#include "programs/vlmail/workbench/settings_store.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/pending_file.h"
#include "programs/base/quoting.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/workbench/request.h"

#include <system_error>
#include <utility>

namespace VlMail::Workbench {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view OTHER_LINE_END = "\r\n";

std::string withLineEnds(std::string const& text, std::string_view from, std::string_view to) {
    std::string changed;
    std::size_t at = 0;
    for (std::size_t end = text.find(from); end != std::string::npos; end = text.find(from, at)) {
        changed += text.substr(at, end - at);
        changed += to;
        at = end + from.size();
    }
    return changed + text.substr(at);
}

class InFile : public SettingsStore {
public:
    explicit InFile(fs::path file) : file_(std::move(file)) {}

    char const* kind() const override { return "file"; }
    std::string name() const override { return Base::validUtf8(file_.string()); }

    StoredSettings read() override { return stored(Base::readFile(file_, MAX_BODY_BYTES)); }

    StoredSettings write(std::string const& text, std::string const& version) override {
        std::string const before = Base::readFile(file_, MAX_BODY_BYTES);
        if (stored(before).version != version)
            throw settingsChanged();
        bool const isOther = before.find(OTHER_LINE_END) != std::string::npos;
        std::string const bytes = isOther ? withLineEnds(text, "\n", OTHER_LINE_END) : text;
        try {
            fs::path const target = fs::canonical(file_);
            fs::perms const rights = fs::status(target).permissions();
            Base::PendingFile pending(target);
            Base::writeFile(pending.temporary(), bytes);
            fs::permissions(pending.temporary(), rights);
            pending.commit();
        } catch (std::system_error const& failure) {
            throw Base::Error(Base::Code::FileUnwritable, "cannot write " + Base::inQuotes(name()) + ": " +
                                                              failure.code().message() +
                                                              "; make room or get the right, and save again");
        }
        return stored(bytes);
    }

private:
    static StoredSettings stored(std::string const& bytes) {
        return {withLineEnds(Base::validUtf8(bytes), OTHER_LINE_END, "\n"), Base::sha256(bytes)};
    }

    fs::path file_;
};

class Nowhere : public SettingsStore {
public:
    char const* kind() const override { return "none"; }
    std::string name() const override { return {}; }
    StoredSettings read() override {
        return {"{\n  \"extract_presets\": [],\n  \"pack_presets\": []\n}\n", "none"};
    }
    StoredSettings write(std::string const&, std::string const&) override {
        throw Base::Error(Base::Code::Usage, "these settings lie in no file and at no node; begin the "
                                             "workbench with --settings NODE.json or --node NODE and put "
                                             "them there");
    }
};

} // namespace

Base::Error settingsChanged() {
    return {Base::Code::SettingsChanged, "the settings were changed by somebody else since they were read; "
                                         "look at both and save what is to stay"};
}

std::unique_ptr<SettingsStore> settingsInFile(fs::path file) {
    return std::make_unique<InFile>(std::move(file));
}

std::unique_ptr<SettingsStore> settingsNowhere() { return std::make_unique<Nowhere>(); }

} // namespace VlMail::Workbench
