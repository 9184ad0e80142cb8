#include "programs/vlserviced/store/backup_file.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"
#include "programs/base/pending_file.h"
#include "programs/base/safe_name.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cstdint>
#include <fcntl.h>
#include <sstream>
#include <string_view>
#include <sys/stat.h>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view MAGIC = "VLSERVICED BACKUP ";
constexpr std::string_view FORM = "1\n";
/// Digits and the end of their line.
constexpr std::size_t DIGEST_BYTES = 65;
/// Of the line that says what there is.
constexpr std::size_t MAX_HEADER_BYTES = 64 << 20;
constexpr std::size_t SOME_BYTES = 1 << 20;
constexpr std::string_view OUTBOX = "outbox/";
constexpr std::string_view CONTAINER = ".mailing";

/// Nothing else is written, whatever a file says.
bool isMemberName(std::string const& name) {
    if (name == "service.db" || name == "packs.db" || name == "token")
        return true;
    std::string const container = name.starts_with(OUTBOX) ? name.substr(OUTBOX.size()) : std::string();
    return container.ends_with(CONTAINER) && Base::safeFileName(container) == container;
}

std::uint64_t sizeOf(Base::FileDescriptor const& file) {
    struct stat status {};
    ::fstat(file.number(), &status);
    return static_cast<std::uint64_t>(status.st_size);
}

/// A file that is written and summed up.
class SummedFile {
public:
    explicit SummedFile(fs::path const& file) : file_(file, O_WRONLY) {}

    void write(std::string_view bytes) {
        file_.writeAll(bytes);
        sum_.add(bytes);
    }
    void finish() {
        file_.writeAll(sum_.digest() + '\n');
        file_.sync();
        file_.close();
    }

private:
    Base::FileDescriptor file_;
    Base::Sha256 sum_;
};

struct OpenMember {
    std::string name;
    Base::FileDescriptor file;
    std::uint64_t bytes;
};

std::vector<OpenMember> opened(std::vector<BackupMember> const& members) {
    std::vector<OpenMember> all;
    for (BackupMember const& member : members) {
        Base::FileDescriptor file(member.file, O_RDONLY);
        std::uint64_t const bytes = sizeOf(file);
        all.push_back({member.name, std::move(file), bytes});
    }
    return all;
}

std::string headerOf(std::vector<OpenMember> const& members, long long madeAt) {
    json::Array list;
    for (OpenMember const& member : members)
        list.append(json::Object{{"name", member.name}, {"bytes", static_cast<long long>(member.bytes)}});
    std::ostringstream text;
    text << json::Object{{"made", madeAt}, {"members", list}};
    return std::move(text).str() + '\n';
}

[[noreturn]] void failForeign(fs::path const& file) {
    throw Base::Error(Base::Code::FileUnsuitable, file.string() + " is no backup of vlserviced");
}

[[noreturn]] void failDamaged(fs::path const& file) {
    throw Base::Error(Base::Code::FileUnsuitable,
                      "the backup " + file.string() + " is damaged or cut off: take another one");
}

struct Member {
    std::string name;
    std::uint64_t bytes = 0;
};

/// A backup that is read from its beginning to its end.
class BackupReader {
public:
    explicit BackupReader(fs::path const& file) : file_(file, O_RDONLY | O_CLOEXEC), left_(sizeOf(file_)) {
        requireMagic();
        readHeader();
    }

    long long madeAt() const { return madeAt_; }
    std::vector<Member> const& members() const { return members_; }

    /// The next bytes, of all that are left of a member some.
    std::string take(std::uint64_t most) {
        std::string bytes(std::min<std::uint64_t>(most, SOME_BYTES), '\0');
        bytes.resize(file_.read(bytes.data(), bytes.size()));
        if (bytes.empty())
            failDamaged(file_.file());
        sum_.add(bytes);
        return bytes;
    }

    /// That behind the members there is their digest, and nothing else.
    void finish() {
        std::string behind(DIGEST_BYTES + 1, '\0');
        behind.resize(file_.read(behind.data(), behind.size()));
        if (behind != sum_.digest() + '\n')
            failDamaged(file_.file());
    }

private:
    void requireMagic() {
        std::string begin(MAGIC.size() + FORM.size(), '\0');
        begin.resize(file_.read(begin.data(), begin.size()));
        if (!begin.starts_with(MAGIC))
            failForeign(file_.file());
        if (begin.substr(MAGIC.size()) != FORM)
            throw Base::Error(Base::Code::VersionMismatch,
                              "the backup " + file_.file().string() +
                                  " was made by a newer version of this program: use that version");
        sum_.add(begin);
        left_ -= begin.size();
    }

    void readHeader() {
        try {
            json::Object const header = parsedHeader();
            madeAt_ = header.get("made").toInt();
            for (json::Value const& member : header.get("members").toArray())
                add(member.toObject());
        } catch (json::Exc const&) {
            failDamaged(file_.file());
        }
        if (left_ != DIGEST_BYTES)
            failDamaged(file_.file());
    }

    json::Object parsedHeader() {
        std::string line;
        for (char c = 0; c != '\n'; line += c)
            if (line.size() > MAX_HEADER_BYTES || file_.read(&c, 1) == 0)
                failDamaged(file_.file());
        sum_.add(line);
        left_ -= line.size();
        return json::strToObject(line.data(), line.size());
    }

    void add(json::Object const& member) {
        std::string const name = member.get("name").toString();
        long long const bytes = member.get("bytes").toInt();
        bool const isThere =
            std::ranges::any_of(members_, [&](Member const& one) { return one.name == name; });
        if (!isMemberName(name) || isThere || bytes < 0 || static_cast<std::uint64_t>(bytes) > left_)
            failDamaged(file_.file());
        left_ -= static_cast<std::uint64_t>(bytes);
        members_.push_back({name, static_cast<std::uint64_t>(bytes)});
    }

    Base::FileDescriptor file_;
    /// Of the file, behind what was read, and at last behind all members.
    std::uint64_t left_;
    Base::Sha256 sum_;
    long long madeAt_ = 0;
    std::vector<Member> members_;
};

void extract(BackupReader& backup, Member const& member, fs::path const& target) {
    fs::create_directories(target.parent_path());
    Base::FileDescriptor out(target, O_WRONLY | O_CREAT | O_EXCL, 0600);
    for (std::uint64_t left = member.bytes; left > 0;) {
        std::string const bytes = backup.take(left);
        out.writeAll(bytes);
        left -= bytes.size();
    }
    out.sync();
    out.close();
}

} // namespace

void writeBackup(fs::path const& target, std::vector<BackupMember> const& members, long long madeAt) {
    if (fs::exists(target))
        throw Base::Error(Base::Code::FileExists, target.string() + " is there already: name another file");
    Base::PendingFile pending(target);
    fs::permissions(pending.temporary(), fs::perms::owner_read | fs::perms::owner_write);
    SummedFile out(pending.temporary());
    std::vector<OpenMember> files = opened(members);
    out.write(std::string(MAGIC) + std::string(FORM) + headerOf(files, madeAt));
    std::string bytes(SOME_BYTES, '\0');
    for (OpenMember& member : files)
        for (std::uint64_t left = member.bytes; left > 0;) {
            std::size_t const size =
                member.file.read(bytes.data(), std::min<std::uint64_t>(left, SOME_BYTES));
            if (size == 0)
                throw Base::Error(Base::Code::FileUnreadable,
                                  member.file.file().string() + " became shorter while it was read");
            out.write(std::string_view(bytes).substr(0, size));
            left -= size;
        }
    out.finish();
    pending.commit();
}

long long extractBackup(fs::path const& file, fs::path const& folder) {
    BackupReader backup(file);
    for (Member const& member : backup.members())
        extract(backup, member, folder / member.name);
    backup.finish();
    return backup.madeAt();
}

} // namespace VlServiced
