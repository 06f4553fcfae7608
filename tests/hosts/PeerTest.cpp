#include "prefork/Peer.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/wait.h>

#include <vector>

#include "Connect.h"
#include "Folder.h"
#include "prefork/ListeningSocket.h"

namespace {

using host::Descriptor;

constexpr uid_t kUser = 61001;
constexpr gid_t kOwnGroup = 61001;
constexpr gid_t kTrusted = 61100;

struct Identity {
    uid_t user;
    gid_t group;
    std::vector<gid_t> groups;
};

class PeerTest : public ::testing::Test {
protected:
    void SetUp() override {
        host::SocketPlace place;
        place.path = folder.In("socket");
        place.mode = 0666;
        std::string problem;
        listening = host::ListeningSocket::Bind(place, problem);
        ASSERT_TRUE(listening) << problem;
        // The folder is root's alone.
        std::filesystem::permissions(folder.In(""), std::filesystem::perms(0755));
    }

    /** The served end of a connection from a process with this identity, which has ended by then. */
    Descriptor ConnectionFrom(const Identity& identity) const {
        const pid_t child = fork();
        if (child == 0) {
            const bool taken = setgroups(identity.groups.size(), identity.groups.data()) == 0 &&
                               setresgid(identity.group, identity.group, identity.group) == 0 &&
                               setresuid(identity.user, identity.user, identity.user) == 0;
            _exit(taken && ConnectTo(folder.In("socket")).IsOpen() ? 0 : 1);
        }
        int status = -1;
        EXPECT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
        return Descriptor(accept(listening->Get(), nullptr, nullptr));
    }

    bool Allows(const Identity& identity, std::optional<gid_t> group) const {
        return host::IsAllowedPeer(ConnectionFrom(identity).Get(), group);
    }

    Folder folder;
    std::optional<host::ListeningSocket> listening;
};

TEST_F(PeerTest, RootMayAlwaysCall) {
    EXPECT_TRUE(Allows({0, 0, {}}, std::nullopt));
    EXPECT_TRUE(Allows({0, kOwnGroup, {}}, kTrusted));
}

TEST_F(PeerTest, WithoutAGroupNobodyElseMay) {
    EXPECT_FALSE(Allows({kUser, kOwnGroup, {}}, std::nullopt));
    EXPECT_FALSE(Allows({kUser, 0, {0}}, std::nullopt)) << "the group root is not the user root";
}

TEST_F(PeerTest, MembersOfTheGroupMayByPrimaryAndBySupplementaryGroup) {
    EXPECT_TRUE(Allows({kUser, kTrusted, {}}, kTrusted));
    EXPECT_TRUE(Allows({kUser, kOwnGroup, {kOwnGroup, kTrusted}}, kTrusted));
    EXPECT_FALSE(Allows({kUser, kOwnGroup, {kOwnGroup}}, kTrusted));
    EXPECT_FALSE(Allows({kUser, kOwnGroup, {}}, kTrusted));
}

TEST_F(PeerTest, MoreGroupsThanUsualAreAllLookedAt) {
    std::vector<gid_t> groups;
    for (gid_t group = 1; group <= 200; ++group) {
        groups.push_back(group);
    }
    EXPECT_FALSE(Allows({kUser, kOwnGroup, groups}, kTrusted));
    groups.push_back(kTrusted);
    EXPECT_TRUE(Allows({kUser, kOwnGroup, groups}, kTrusted));
}

TEST_F(PeerTest, ADescriptionNamesProcessAndUser) {
    EXPECT_NE(host::DescribePeer(ConnectionFrom({kUser, kOwnGroup, {}}).Get()).find(" of user 61001"),
              std::string::npos);
}

TEST_F(PeerTest, WhatTellsNothingOfItsPeerIsRefused) {
    const Descriptor network(socket(AF_INET, SOCK_STREAM, 0));
    for (int descriptor : {network.Get(), 0, -1, 1000}) {
        EXPECT_FALSE(host::IsAllowedPeer(descriptor, kTrusted)) << descriptor;
        EXPECT_NE(host::DescribePeer(descriptor), "");
    }
}

}  // namespace
