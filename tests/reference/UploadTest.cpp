#include <dirent.h>
#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/file.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstddef>
#include <cstdio>
#include <cstring>
#include <vector>

#include "PrivateDevice.h"
#include "Seam.h"
#include "zovacgi/PartFile.h"
#include "zovacgi/PartFolder.h"
#include "zovacgi/UploadBody.h"

using reference::PartFile;
using reference::PartFolder;
using reference::UploadBody;

namespace {

const std::string kGood =
    "--b\r\nContent-Disposition: form-data; name=a\r\n\r\n1\r\n"
    "--b\r\nContent-Disposition: form-data; name=f; filename=x\r\n\r\nfirst\r\n"
    "--b\r\nContent-Disposition: form-data; name=f; filename=y\r\n\r\nsecond\r\n"
    "--b--\r\n";

struct Hash {
    ZovaSzHash* all = QLIBCSzHashAlloc(4);

    Hash() = default;
    Hash(const Hash&) = delete;
    Hash& operator=(const Hash&) = delete;
    ~Hash() { QLIBCSzHashFree(all); }

    std::string Text() const {
        std::string text;
        for (unsigned int at = 0; at < all->count; ++at) {
            text += std::string(all->pairs[at].key) + "=" + all->pairs[at].value + "|";
        }
        return text;
    }
};

class Upload : public DeviceTest {
protected:
    Upload() : folder(InRoot("/parts")) {}

    void SetUp() override {
        DeviceTest::SetUp();
        mkdir(folder.c_str(), 0777);
        ASSERT_EQ(chmod(folder.c_str(), 0777), 0);
        RemoveFiles();
    }

    void RemoveFiles() const {
        for (const std::string& name : Files()) {
            unlink((folder + "/" + name).c_str());
        }
    }

    std::vector<std::string> Files() const {
        std::vector<std::string> names;
        DIR* entries = opendir(folder.c_str());
        while (const struct dirent* entry = readdir(entries)) {
            if (entry->d_name[0] != '.') {
                names.emplace_back(entry->d_name);
            }
        }
        closedir(entries);
        return names;
    }

    /** Runs `body` in a child whose standard input and environment are an upload's. 0 if it gave "". */
    static void InUpload(const std::string& input, const std::string& length,
                         const std::function<std::string()>& body) {
        const int status = StatusOfChild([&] {
            FILE* file = tmpfile();
            fwrite(input.data(), 1, input.size(), file);
            rewind(file);
            dup2(fileno(file), STDIN_FILENO);
            setenv("CONTENT_TYPE", "multipart/form-data; boundary=b", 1);
            setenv("CONTENT_LENGTH", length.c_str(), 1);
            const std::string problem = body();
            fprintf(stderr, "%s", problem.c_str());
            return problem.empty() ? 0 : 1;
        });
        EXPECT_EQ(status, 0);
    }

    std::string folder;
};

#define STATED(condition)                                      \
    if (!(condition)) {                                        \
        return std::string("does not hold: " #condition "\n"); \
    }

}  // namespace

TEST(UploadBody, TellsWhichDelimiterStandsBeforeTheRest) {
    std::string text = kGood;
    FILE* stream = fmemopen(text.data(), text.size(), "r");
    UploadBody body(stream, text.size(), "multipart/form-data; boundary=b", nullptr);
    body.SetExact(true);
    EXPECT_EQ(body.DelimiterBeforeRest(), "") << "nothing was read";
    EXPECT_EQ(body.Next(), UploadBody::Event::kField);
    EXPECT_EQ(body.DelimiterBeforeRest() + text.substr(static_cast<size_t>(ftell(stream))),
              kGood.substr(kGood.find("--b", 3)));
    fclose(stream);

    std::string last = kGood.substr(0, kGood.find("--b", 3)) + "--b--\r\n";
    stream = fmemopen(last.data(), last.size(), "r");
    UploadBody end(stream, last.size(), "multipart/form-data; boundary=b", nullptr);
    end.SetExact(true);
    EXPECT_EQ(end.Next(), UploadBody::Event::kField);
    EXPECT_EQ(end.DelimiterBeforeRest() + last.substr(static_cast<size_t>(ftell(stream))), "--b--\r\n");
    fclose(stream);
}

TEST_F(Upload, StoresFilesUnderRandomNamesAndKeepsTheLastOfAField) {
    InUpload(kGood, std::to_string(kGood.size()), [&]() -> std::string {
        Hash params;
        Hash files;
        STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == ZOVA_UPLOAD_COMPLETE);
        STATED(params.Text() == "a=1|");
        STATED(files.all->count == 1 && strcmp(files.all->pairs[0].key, "f") == 0);
        const std::string path = files.all->pairs[0].value;
        STATED(path.substr(0, folder.size() + 1) == folder + "/");
        STATED(PartFile::IsName(path.substr(folder.size() + 1)));
        STATED(ReadWholeFile(path) == "second");
        STATED(ModeOf(path) == 0600);
        STATED(Files().size() == 1);
        return "";
    });
    EXPECT_EQ(ModeOf(folder), 01777u);
}

TEST_F(Upload, ReadsNoMoreThanWasAnnouncedAndMissesWhatIsNotThere) {
    for (const auto& [length, status] :
         {std::pair(kGood.size() - 4, ZOVA_UPLOAD_CUT_OFF), std::pair(kGood.size() + 1, ZOVA_UPLOAD_COMPLETE),
          std::pair(kGood.size() - 2, ZOVA_UPLOAD_COMPLETE)}) {
        InUpload(kGood, std::to_string(length), [&, length = length, status = status]() -> std::string {
            Hash params;
            Hash files;
            STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == status);
            STATED(static_cast<size_t>(ftell(stdin)) <= length);
            return "";
        });
    }
    RemoveFiles();
    InUpload(kGood.substr(0, kGood.size() - 10), std::to_string(kGood.size()), [&]() -> std::string {
        Hash params;
        Hash files;
        STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == ZOVA_UPLOAD_CUT_OFF);
        STATED(files.all->count == 0 && Files().empty());
        return "";
    });
}

TEST_F(Upload, GivesAStatusForABodyThatIsNone) {
    for (const auto& [type, length, status] :
         {std::tuple("multipart/form-data; boundary=b", "0", ZOVA_UPLOAD_EMPTY),
          std::tuple("multipart/form-data; boundary=b", "-5", ZOVA_UPLOAD_EMPTY),
          std::tuple("multipart/form-data; boundary=b", "5x", ZOVA_UPLOAD_EMPTY),
          std::tuple("multipart/form-data; boundary=b", "18446744073709551616", ZOVA_UPLOAD_EMPTY),
          std::tuple("multipart/form-data", "5", ZOVA_UPLOAD_NO_UPLOAD),
          std::tuple("text/plain", "5", ZOVA_UPLOAD_NO_UPLOAD)}) {
        InUpload("12345", length, [&, type = type, status = status]() -> std::string {
            setenv("CONTENT_TYPE", type, 1);
            Hash params;
            Hash files;
            STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == status);
            return "";
        });
    }
}

TEST_F(Upload, ReadsTheFirstFieldsAndNotAByteMore) {
    const std::string fields =
        "--b\r\nContent-Disposition: form-data; name=api\r\n\r\nX\r\n"
        "--b\r\nContent-Disposition: form-data; name=version\r\n\r\n1\r\n";
    const std::string input = fields + kGood;
    InUpload(input, std::to_string(input.size()), [&]() -> std::string {
        ZovaCgi cgi{};
        ZovaCgiUploadState state{};
        char boundary[256] = "";
        STATED(ZovaCgiLoadUploadNumParams(&cgi, 2, nullptr, &state, boundary, sizeof(boundary)) == 2);
        STATED(strcmp(boundary, "b") == 0);
        STATED(state.readBytes == fields.size() + 5 && state.totalBytes == input.size());
        STATED(static_cast<size_t>(ftell(stdin)) == state.readBytes);
        STATED(cgi.params->count == 2);
        ZovaCgiFree(&cgi);
        Hash params;
        Hash files;
        STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == ZOVA_UPLOAD_COMPLETE);
        STATED(params.Text() == "a=1|" && files.all->count == 1);
        return "";
    });
}

TEST_F(Upload, GoesStepByStepAndStopsWithAStatus) {
    InUpload(kGood, std::to_string(kGood.size()), [&]() -> std::string {
        ZovaCgi cgi{};
        ZovaCgiUploadState state{};
        char boundary[256] = "";
        char name[64] = "";
        char value[491] = "";
        const auto fields = [&] {
            return ZovaCgiLoadUploadParams(&cgi, nullptr, &state, boundary, 256, name, 64, value, 491);
        };
        const auto store = [&] {
            return ZovaCgiLoadUploadFileToDir(&cgi, folder.c_str(), nullptr, &state, boundary, name);
        };
        STATED(store() < 0 && state.status == ZOVA_UPLOAD_NO_PART_REACHED);
        STATED(fields() == 1 && state.status == 0 && strcmp(name, "f") == 0 && strcmp(value, "x") == 0);
        STATED(store() == 1 && state.status == 0);
        STATED(ReadWholeFile(cgi.params->pairs[0].value) == "first");
        STATED(store() < 0 && state.status == ZOVA_UPLOAD_NO_PART_REACHED);
        STATED(fields() == 0 && strcmp(value, "y") == 0);
        STATED(fields() == 0 && state.status == ZOVA_UPLOAD_COMPLETE && name[0] == '\0');
        STATED(Files().size() == 1);
        ZovaCgiFree(&cgi);
        return "";
    });
}

TEST_F(Upload, ASliceIsOneFile) {
    InUpload("--b\r\nraw", "8", [&]() -> std::string {
        setenv("CONTENT_TYPE", "application/octet-stream", 1);
        setenv("HTTP_X_TYPE_NAME", "sliceUpload", 1);
        setenv("HTTP_X_FILE_NAME", "%e2%82%ac", 1);
        ZovaCgi cgi{};
        ZovaCgiUploadState state{};
        char boundary[256] = "";
        STATED(ZovaCgiLoadUploadNumParams(&cgi, 3, nullptr, &state, boundary, 256) == 0 && state.readBytes == 0);
        char name[64] = "";
        char value[491] = "";
        STATED(ZovaCgiLoadUploadParams(&cgi, nullptr, &state, boundary, 256, name, 64, value, 491) == 0);
        STATED(strcmp(name, "file") == 0 && strcmp(value, "€") == 0 && boundary[0] != '\0');
        STATED(ZovaCgiLoadUploadFileToDir(&cgi, folder.c_str(), nullptr, &state, boundary, name) == 1);
        STATED(ReadWholeFile(cgi.params->pairs[0].value) == "--b\r\nraw");
        STATED(ZovaCgiLoadUploadParams(&cgi, nullptr, &state, boundary, 256, name, 64, value, 491) == 0);
        STATED(state.status == ZOVA_UPLOAD_COMPLETE);
        ZovaCgiFree(&cgi);
        return "";
    });
}

TEST_F(Upload, AFormMayHaveMoreFilesThanTheUsualLimitOfDescriptorsAndTheHardLimitHolds) {
    std::string input;
    for (int number = 0; number < 100; ++number) {
        input += "--b\r\nContent-Disposition: form-data; name=f" + std::to_string(number) + "; filename=x\r\n\r\nx\r\n";
    }
    input += "--b--\r\n";
    for (const auto& [hardLimit, status] :
         {std::pair(rlim_t{4096}, ZOVA_UPLOAD_COMPLETE), std::pair(rlim_t{64}, ZOVA_UPLOAD_NO_FILE)}) {
        InUpload(input, std::to_string(input.size()), [&, hardLimit = hardLimit, status = status]() -> std::string {
            const struct rlimit limit { 64, hardLimit };
            STATED(setrlimit(RLIMIT_NOFILE, &limit) == 0);
            Hash params;
            Hash files;
            STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == status);
            STATED(files.all->count == (status == ZOVA_UPLOAD_COMPLETE ? 100 : 0));
            STATED(status == ZOVA_UPLOAD_COMPLETE || Files().empty());
            return "";
        });
        RemoveFiles();
    }
}

TEST_F(Upload, SurvivesNullsInEveryPlace) {
    Hash hash;
    ZovaCgi cgi{};
    ZovaCgiUploadState state{};
    char text[8] = "";
    EXPECT_LT(ZovaCgiLoadUploadAll(nullptr, &hash.all, "/", 0), 0);
    EXPECT_LT(ZovaCgiLoadUploadAll(&hash.all, &hash.all, nullptr, 0), 0);
    EXPECT_LT(ZovaCgiLoadUploadNumParams(nullptr, 3, nullptr, &state, text, 8), 0);
    EXPECT_LT(ZovaCgiLoadUploadParams(&cgi, nullptr, nullptr, text, 8, text, 8, text, 8), 0);
    EXPECT_LT(ZovaCgiLoadUploadFileToDir(&cgi, "/", nullptr, &state, text, nullptr), 0);
}

// ---- folders and files ----

TEST_F(Upload, UsesNoFolderOfAnotherUserNoLinkAndNoFile) {
    EXPECT_FALSE(PartFolder(InRoot("/nowhere").c_str()).IsOpen());
    const std::string link = InRoot("/link");
    unlink(link.c_str());
    ASSERT_EQ(symlink(folder.c_str(), link.c_str()), 0);
    EXPECT_FALSE(PartFolder(link.c_str()).IsOpen());
    EXPECT_EQ(ModeOf(folder), 0777u);
    ASSERT_EQ(chown(folder.c_str(), kAliceUid, 0), 0);
    EXPECT_FALSE(PartFolder(folder.c_str()).IsOpen());
    EXPECT_EQ(ModeOf(folder), 0777u);
    ASSERT_EQ(chown(folder.c_str(), 0, 0), 0);
    EXPECT_TRUE(PartFolder(folder.c_str()).IsOpen());
    EXPECT_EQ(ModeOf(folder), 01777u);
}

TEST_F(Upload, AUserUsesNoFolderInWhichOthersMoveFiles) {
    for (const auto& [mode, usable] : {std::pair(0777u, false), std::pair(01777u, true)}) {
        ASSERT_EQ(chmod(folder.c_str(), mode), 0);
        EXPECT_EQ(StatusOfChild([&] {
                      if (setresgid(kAliceGid, kAliceGid, kAliceGid) != 0 ||
                          setresuid(kAliceUid, kAliceUid, kAliceUid) != 0) {
                          return 9;
                      }
                      const PartFolder parts(folder.c_str());
                      return parts.IsOpen() ? 1 : 0;
                  }),
                  usable ? 1 : 0);
    }
}

TEST_F(Upload, AFileHasNoNameUntilItIsPublished) {
    const PartFolder parts(folder.c_str());
    {
        PartFile file(parts);
        ASSERT_TRUE(file.IsOpen());
        EXPECT_TRUE(file.Write("content"));
        EXPECT_TRUE(Files().empty());
        const std::string path = file.Publish();
        EXPECT_EQ(ReadWholeFile(path), "content");
        EXPECT_EQ(ModeOf(path), 0600u);
    }
    EXPECT_EQ(Files().size(), 1u);
    { const PartFile dropped(parts); }
    EXPECT_EQ(Files().size(), 1u);
}

TEST_F(Upload, AProcessThatEndsTakesItsFilesAlongUnlessTheyWereMoved) {
    for (const int ending : {0, SIGTERM, SIGINT, SIGHUP}) {
        // A process of its own that ends by exit or by a signal, as a host does.
        const pid_t child = fork();
        ASSERT_GE(child, 0);
        if (child == 0) {
            const PartFolder parts(folder.c_str());
            PartFile left(parts);
            PartFile moved(parts);
            left.Publish();
            const std::string path = moved.Publish();
            rename(path.c_str(), (folder + "/moved").c_str());
            WriteFile(path, "another file of this name");
            if (fork() == 0) {
                exit(0);
            }
            wait(nullptr);
            if (Files().size() == 3 && ending != 0) {
                raise(ending);
            }
            exit(Files().size() == 3 ? 0 : 1);
        }
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status, ending);
        const std::vector<std::string> names = Files();
        EXPECT_EQ(names.size(), 2u);
        EXPECT_EQ(std::count(names.begin(), names.end(), "moved"), 1);
        RemoveFiles();
    }
}

TEST_F(Upload, TheSweepRemovesOldFilesThatNobodyHolds) {
    const std::string digits(32, 'a');
    const auto place = [&](const std::string& name, long age) {
        const std::string path = folder + "/" + name;
        WriteFile(path, "left");
        MakeOlder(path, age);
        return path;
    };
    place("zova-upload-" + digits, 61);
    const std::string held = place("zova-upload-" + std::string(32, 'b'), 61);
    place("zova-upload-" + std::string(32, 'c'), 30);
    place("zova-upload-" + digits + "0", 61);
    place("zova-upload-" + std::string(32, 'G'), 61);
    place("other-" + digits, 61);
    const int lock = open(held.c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_EQ(flock(lock, LOCK_EX | LOCK_NB), 0);
    ASSERT_EQ(symlink("/etc/passwd", (folder + "/zova-upload-" + std::string(32, 'd')).c_str()), 0);
    ASSERT_EQ(mkfifo((folder + "/zova-upload-" + std::string(32, 'e')).c_str(), 0600), 0);

    PartFolder(folder.c_str()).Sweep();
    EXPECT_EQ(Files().size(), 7u);
    EXPECT_FALSE(Exists(folder + "/zova-upload-" + digits));
    close(lock);
    PartFolder(folder.c_str()).Sweep();
    EXPECT_FALSE(Exists(held));
    EXPECT_EQ(Files().size(), 6u);
}

// ---- a file system on which each file has a name ----

/** From here on no file of this process can be made without a name, as on file systems that do not know it. */
bool ForbidNamelessFiles() {
    constexpr unsigned int kNameless = O_TMPFILE & ~O_DIRECTORY;
    sock_filter steps[] = {
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_openat, 0, 3),
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, args[2])),
        BPF_JUMP(BPF_JMP | BPF_JSET | BPF_K, kNameless, 0, 1),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EOPNOTSUPP),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
    };
    const sock_fprog program{sizeof(steps) / sizeof(steps[0]), steps};
    return prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

/** The same statements, where each file has a name from its beginning. */
class NamedUpload : public Upload {
protected:
    static void InChild(const std::function<std::string()>& body) {
        EXPECT_EQ(StatusOfChild([&] {
                      const std::string problem = ForbidNamelessFiles() ? body() : "no filter";
                      fprintf(stderr, "%s", problem.c_str());
                      return problem.empty() ? 0 : 1;
                  }),
                  0);
    }
};

TEST_F(NamedUpload, AFileHasItsNameAtOnceAndLosesItUnlessItIsPublished) {
    InChild([&]() -> std::string {
        const PartFolder parts(folder.c_str());
        {
            const PartFile dropped(parts);
            STATED(dropped.IsOpen() && dropped.Write("content"));
            STATED(Files().size() == 1 && PartFile::IsName(Files()[0]));
            STATED(ModeOf(folder + "/" + Files()[0]) == 0600);
        }
        STATED(Files().empty());
        PartFile file(parts);
        PartFile moved(std::move(file));
        STATED(moved.Write("content"));
        const std::string path = moved.Publish();
        STATED(Files().size() == 1 && path == folder + "/" + Files()[0]);
        STATED(ReadWholeFile(path) == "content");
        return "";
    });
}

TEST_F(NamedUpload, StoresFilesAndKeepsTheLastOfAField) {
    InUpload(kGood, std::to_string(kGood.size()), [&]() -> std::string {
        STATED(ForbidNamelessFiles());
        Hash params;
        Hash files;
        STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == ZOVA_UPLOAD_COMPLETE);
        STATED(files.all->count == 1 && ReadWholeFile(files.all->pairs[0].value) == "second");
        STATED(Files().size() == 1);
        return "";
    });
}

TEST_F(NamedUpload, LeavesNothingOfABodyThatEndsTooEarly) {
    const std::string cut = kGood.substr(0, kGood.size() - 10);
    InUpload(cut, std::to_string(kGood.size()), [&]() -> std::string {
        STATED(ForbidNamelessFiles());
        Hash params;
        Hash files;
        STATED(ZovaCgiLoadUploadAll(&params.all, &files.all, folder.c_str(), 0) == ZOVA_UPLOAD_CUT_OFF);
        STATED(files.all->count == 0 && Files().empty());
        return "";
    });
}

TEST_F(NamedUpload, WhatAKilledProcessLeftGoesWithTheSweepAndWhatALiveOneHoldsStays) {
    EXPECT_EQ(StatusOfChild([&] {
                  const PartFolder parts(folder.c_str());
                  const bool hasFilter = ForbidNamelessFiles();
                  const PartFile file(parts);
                  return hasFilter && file.IsOpen() ? raise(SIGKILL) : 1;
              }),
              -1);
    ASSERT_EQ(Files().size(), 1u);
    const std::string left = folder + "/" + Files()[0];
    InChild([&]() -> std::string {
        const PartFolder parts(folder.c_str());
        const PartFile held(parts);
        for (const std::string& name : Files()) {
            MakeOlder(folder + "/" + name, 61);
        }
        parts.Sweep();
        STATED(Files().size() == 1 && folder + "/" + Files()[0] != left);
        return "";
    });
    EXPECT_TRUE(Files().empty());
}

// ---- the string hash, the error code and the volumes ----

TEST_F(Upload, AHashKeepsOneValueForAKey) {
    Hash hash;
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(QLIBCSzHashSetValue(&hash.all, ("k" + std::to_string(i % 50)).c_str(), std::to_string(i).c_str()), 0);
    }
    EXPECT_EQ(hash.all->count, 50u);
    EXPECT_STREQ(hash.all->pairs[49].value, "99");
    Json::Value out;
    EXPECT_TRUE(ZOVA::WebAPIUtil::SzHashToJsonObj(hash.all, out));
    EXPECT_EQ(out.size(), 50u);
    EXPECT_EQ(out["k0"], Json::Value("50"));
    QLIBCHashRemoveAll(hash.all);
    EXPECT_EQ(hash.all->count, 0u);
    EXPECT_LT(QLIBCSzHashSetValue(nullptr, "a", "b"), 0);
    EXPECT_LT(QLIBCSzHashSetValue(&hash.all, nullptr, "b"), 0);
    Json::Value list(Json::arrayValue);
    EXPECT_FALSE(ZOVA::WebAPIUtil::SzHashToJsonObj(hash.all, list));
    EXPECT_FALSE(ZOVA::WebAPIUtil::SzHashToJsonObj(nullptr, out));
    QLIBCHashRemoveAll(nullptr);
    QLIBCSzHashFree(nullptr);
}

TEST_F(Upload, TheErrorCodeStays) {
    QLIBCErrSetEx(0x2900, __FILE__, __LINE__);
    EXPECT_EQ(QLIBCErrGet(), 0x2900);
}

TEST_F(Upload, TheFirstVolumeWithRoomIsTaken) {
    ZovaVolumeInfo info{};
    int id = -1;
    EXPECT_EQ(VolumeAvailGet(1, &info, &id, 1), 0);
    const std::string table = InRoot("/etc/zova/volumes.json");
    for (const char* bad : {"", "[]", "{}", "{\"volumes\":{}}", "{\"volumes\":[1,null,\"\",\"/\",\"relative\"]}"}) {
        WriteFile(table, bad);
        EXPECT_EQ(VolumeAvailGet(1, &info, &id, 1), 0) << bad;
        EXPECT_EQ(id, -1);
    }
    WriteFile(table, "{\"volumes\":[\"/nowhere\",\"" + std::string(300, '/') + "\",\"" + folder + "\"]}");
    EXPECT_EQ(VolumeAvailGet(~0ULL, &info, &id, 1), 0);
    EXPECT_EQ(VolumeAvailGet(1, &info, &id, 1), 1);
    EXPECT_EQ(info.path, folder);
    EXPECT_EQ(id, 3);
    ASSERT_EQ(chmod(table.c_str(), 0666), 0);
    EXPECT_EQ(VolumeAvailGet(1, &info, &id, 1), 0);
}

TEST_F(Upload, AFolderMayBeMadeWithTheDirectoryBitInItsMode) {
    const std::string path = InRoot("/made-with-the-bit");
    rmdir(path.c_str());
    EXPECT_EQ(ZOVAFSMkdirP(path.c_str(), 0, 1, -1, -1, 040700), 0);
    EXPECT_EQ(ModeOf(path), 0700u);
}
