#pragma once

#include <json/value.h>

#include <cstdint>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "FakeHttp.h"
#include "FakeProcess.h"
#include "ForkedChildren.h"
#include "zovasharing.h"

namespace fake {

/** One call that reached the fake, platform library or system. */
struct Call {
    std::string name;
    std::string arguments;

    std::string Text() const { return name + "(" + arguments + ")"; }
};

struct User {
    uid_t uid = 0;
    gid_t gid = 0;
    std::vector<gid_t> groups;
    bool admin = false;
};

/** A login session as the CGI library would judge it. */
struct Session {
    std::string user;
    int result = 1;
    unsigned int uid = 0;
    /** Values by the number that `ZovaCgiGetOption` takes. */
    std::map<int, std::string> options;
};

struct DeviceToken {
    std::string user;
    std::set<std::pair<std::string, std::string>> calls;
};

/** A connection to a service, and the last text sent over it. */
struct Connection {
    std::string path;
    std::string request;
};

/** The upload that comes with the call, as the CGI library would read it. */
struct FakeUpload {
    using Pairs = std::vector<std::pair<std::string, std::string>>;

    Pairs fields;
    /** Field and path of each part file. */
    Pairs files;
    std::string boundary = "boundary";
    std::string partName;
    std::string partValue;
    unsigned long long readBytes = 0;
    unsigned long long totalBytes = 0;
    int status = 1;
};

/** What `QLIBCProcFork` does: the code behind it runs as the parent, as the child, or sees a refusal. */
enum class ForkAs { kParent, kChild, kRefused };

/** How far `ResetCredentialsByName` gets before it fails. */
enum class BreakCredentials { kNever, kAfterGroups, kAfterGroup };

/**
 * The closed libraries and the process's surroundings as plain data. One object is active at a time; it records every
 * call, answers from its state, and fails on demand. A call that it does not model ends the test program.
 */
class FakePlatform {
public:
    FakePlatform();
    FakePlatform(const FakePlatform&) = delete;
    FakePlatform& operator=(const FakePlatform&) = delete;
    ~FakePlatform();

    /** The active object, null if there is none: system calls then pass through. */
    static FakePlatform* Active();
    /** The active object; ends the program if there is none. */
    static FakePlatform& Required(const char* caller);

    // ---- state ----

    std::map<std::string, User> users;
    std::map<std::string, Session> sessions;
    std::map<std::string, DeviceToken> deviceTokens;
    /** Result for a session id that is in nobody's list. */
    int unknownSessionResult = -2;
    std::string language = "enu";
    int tokenEnable = 0;
    /** Empty: the address cannot be worked out. */
    std::string remoteAddress = "192.0.2.7";
    int cgiTimeout = 15;
    int cgiSkipCheckIP = 0;
    std::string sessionDirectory = "/run/fake/sessions";
    int systemTimeout = 20;
    /** User, privilege, address. */
    std::set<std::vector<std::string>> appPrivileges;
    std::map<std::string, std::string> userPreferenceDirs;
    std::map<std::string, std::string> groupPreferenceDirs;
    bool confined = false;
    /** What the system takes for the name of a host, of a domain, and for an address, with its family. */
    std::set<std::string> hostNames;
    std::set<std::string> domainNames;
    std::map<std::string, int> addressTypes;
    BreakCredentials breakCredentials = BreakCredentials::kNever;
    /** Files that `QLIBCFileExist`, `ReadJsonFile` and `glob` see, by path. */
    std::map<std::string, std::string> files;
    /** Content of key="value" files, by path. */
    std::map<std::string, std::map<std::string, std::string>> keyValueFiles;
    /** Lock files that somebody else holds. */
    std::set<std::string> lockedFiles;
    std::set<std::string> directories;
    /** Path prefixes under which the framework's own file calls are led elsewhere. */
    std::map<std::string, std::string> redirects;
    ForkAs forkAs = ForkAs::kParent;
    /** How many more times a forked child that asks finds its parent, a process of root, alive. */
    int parentPolls = 0;
    int serverRestarts = 0;
    /** Whether the web server is told to send files itself. */
    bool fastOutput = true;
    /** Seconds since the epoch; below 0: the real clock. */
    long long clock = -1;
    /** Enciphered text to clear text, for lines, envelopes and AES (there as key, NUL-free blank, cipher text). */
    std::map<std::string, std::string> cipherLines;
    std::map<std::string, std::string> cipherEnvelopes;
    std::map<std::string, std::string> cipherAES;
    /** Pairs of parameters at which the JSON library throws. */
    std::string pairsThatThrow;
    /** Sharing links by hash. */
    std::map<std::string, ZOVA::sharing::record::Entry> sharingEntries;
    /** What a visitor's session id is found as. */
    ZOVA::sharing::record::Session sharingSession;
    bool sharingDatabaseGood = true;
    int sharingResult = 1;
    /** What the URL of sharing links is told to be; "" for none. */
    std::string sharingURL;
    /** User whose identity belongs to a file, by path. */
    std::map<std::string, std::string> executableIdentities;
    /** Accounts that nobody has given back. */
    int userRecords = 0;

    /** Services behind unix sockets: what each answers to a text, by path. */
    std::map<std::string, std::function<std::string(const std::string&)>> services;
    std::vector<Connection> connections;
    int openConnections = 0;
    std::uint16_t httpsPort = 5001;
    /** What peer devices answer, by number; others are unknown. */
    std::map<long, std::string> peers;
    /** What a failed relay tells as its reason. */
    int relayError = 0;
    /** What answers at an URL; any other cannot be reached. */
    std::map<std::string, HttpAnswer> httpServers;
    std::vector<HttpRequest> httpRequests;
    /** Handles and header lines of libcurl that nobody has given back. */
    int curlObjects = 0;

    FakeUpload upload;
    /** Hashes that nobody has given back. */
    int openHashes = 0;
    /** Free bytes of file systems by path; those of others cannot be told. */
    std::map<std::string, unsigned long long> freeBytes;
    /** Mount path of the data volume with room, "" if there is none. */
    std::string volume;
    /** Error codes that were stored. */
    std::vector<int> coreErrors;

    FakeProcess process;
    ForkedChildren children;

    // ---- calls ----

    std::vector<Call> calls;

    /**
     * Notes a call. `error` is what a failure of it leaves in `errno`, 0 for a call that cannot fail.
     * @return false if the call has to fail; `errno` is set then.
     */
    bool Enter(const char* name, const std::string& arguments, int error);

    /** Texts of the calls with one of these names, in order. */
    std::vector<std::string> CallsOf(const std::set<std::string>& names) const;
    int CountOf(const std::string& name) const;

    // ---- faults ----

    /** Fails the `number`th call from now on that can fail, once. */
    void FailCall(int number);
    /** What `FailCall` made fail; empty if it has not come to that. */
    std::string FailedCall() const { return failedCall; }
    /** Position of the failed call in `calls`. */
    std::size_t FailedIndex() const { return failedIndex; }
    /** Fails the calls of this name, after letting `skip` pass, `times` times (below 0: always). */
    void Fail(const std::string& name, int error, int skip = 0, int times = -1);
    void StopFailing();

    /** Where the framework's file calls are really led to. */
    std::string Redirected(const std::string& path) const;

private:
    struct NamedFault {
        int error;
        int skip;
        int times;
    };

    std::map<std::string, NamedFault> namedFaults;
    int failNumber = 0;
    int failableSeen = 0;
    std::string failedCall;
    std::size_t failedIndex = 0;
};

/** Takes the active object away for its scope, so that what the test program itself does is not recorded. */
class [[nodiscard]] Suspended {
public:
    Suspended();
    Suspended(const Suspended&) = delete;
    Suspended& operator=(const Suspended&) = delete;
    ~Suspended();

private:
    FakePlatform* platform;
};

/** Ends the test program: the fake does not model this. */
[[noreturn]] void Unmodelled(const std::string& what);

}  // namespace fake
