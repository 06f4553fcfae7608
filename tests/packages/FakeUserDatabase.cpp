#include "FakeUserDatabase.h"

#include <errno.h>
#include <grp.h>
#include <pwd.h>

namespace {

char* Writable(const std::string& text) {
    return const_cast<char*>(text.c_str());
}

/** The texts stay with the fake, so that the caller's buffer is needed for its size only. */
void Fill(passwd& out, const FakeUserDatabase::Entry& entry) {
    out.pw_name = Writable(entry.name);
    out.pw_uid = entry.uid;
    out.pw_gid = entry.gid;
    out.pw_gecos = Writable(entry.comment);
    out.pw_dir = Writable(entry.home);
    out.pw_shell = Writable(entry.shell);
}

}  // namespace

FakeUserDatabase& FakeUserDatabase::Instance() {
    static FakeUserDatabase fake;
    return fake;
}

FakeUserDatabase& FakeUserDatabase::Renew() {
    return Instance() = FakeUserDatabase();
}

extern "C" {

int getpwnam_r(const char* name, passwd* out, char*, size_t size, passwd** found) {
    const FakeUserDatabase& fake = FakeUserDatabase::Instance();
    *found = nullptr;
    if (fake.lookupError != 0) {
        return fake.lookupError;
    }
    for (const FakeUserDatabase::Entry& entry : fake.users) {
        if (entry.name == name) {
            if (size < fake.smallestBuffer) {
                return ERANGE;
            }
            Fill(*out, entry);
            *found = out;
        }
    }
    return 0;
}

void setpwent() {
    FakeUserDatabase::Instance().listed = 0;
}

passwd* getpwent() {
    static passwd current;
    FakeUserDatabase& fake = FakeUserDatabase::Instance();
    if (fake.listError != 0 && fake.listed == 1) {
        errno = fake.listError;
        return nullptr;
    }
    if (fake.listed == fake.users.size()) {
        return nullptr;
    }
    Fill(current, fake.users[fake.listed++]);
    return &current;
}

void endpwent() {}

int getgrnam_r(const char* name, group* out, char*, size_t, group** found) {
    *found = nullptr;
    for (const auto& [gid, known] : FakeUserDatabase::Instance().groups) {
        if (known == name) {
            out->gr_gid = gid;
            *found = out;
        }
    }
    return 0;
}

int getgrgid_r(gid_t gid, group* out, char*, size_t size, group** found) {
    const FakeUserDatabase& fake = FakeUserDatabase::Instance();
    *found = nullptr;
    const auto known = fake.groups.find(gid);
    if (known == fake.groups.end()) {
        return 0;
    }
    if (size < fake.smallestBuffer) {
        return ERANGE;
    }
    out->gr_name = Writable(known->second);
    out->gr_gid = gid;
    *found = out;
    return 0;
}

int getgrouplist(const char* user, gid_t gid, gid_t* ids, int* count) {
    const FakeUserDatabase& fake = FakeUserDatabase::Instance();
    std::vector<gid_t> all = {gid};
    const auto known = fake.memberships.find(user);
    if (known != fake.memberships.end()) {
        all.insert(all.end(), known->second.begin(), known->second.end());
    }
    const int room = *count;
    *count = static_cast<int>(all.size());
    for (int at = 0; at < room && at < *count; ++at) {
        ids[at] = all[at];
    }
    return *count > room ? -1 : *count;
}

}  // extern "C"
