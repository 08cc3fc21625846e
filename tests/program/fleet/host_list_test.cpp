#include "program/fleet/host_list.h"

#include <sys/stat.h>

#include "program/commands/failure.h"
#include "tests/support/ipmi_sim.h"

namespace ipmisel {
namespace {

using namespace ::testing;

using Names = std::vector<std::string>;

Names Sources(const std::vector<HostEntry>& hosts) {
    Names names;
    for (const HostEntry& host : hosts) names.push_back(host.source);
    return names;
}

Names Sources(const std::string& list) { return Sources(ParseHostLists({list}, nullptr)); }

/// What is said of a list that is refused.
std::string Refusal(const std::vector<std::string>& lists, const FindGroup& group = nullptr) {
    try {
        ParseHostLists(lists, group);
    } catch (const Failure& failure) {
        EXPECT_EQ(failure.exitStatus, kExitUsage);
        return failure.what();
    }
    return "";
}

TEST(HostList, RangesAreWrittenOut) {
    const struct {
        const char* list;
        Names sources;
    } cases[] = {
        {"rack7", {"lan:rack7"}},
        {"lan:rack7:6230, [fe80::1]:623", {"lan:rack7:6230", "lan:[fe80::1]:623"}},
        {"n[8-11]-bmc,x", {"lan:n8-bmc", "lan:n9-bmc", "lan:n10-bmc", "lan:n11-bmc", "lan:x"}},
        {"n[098-101]", {"lan:n098", "lan:n099", "lan:n100", "lan:n101"}},
        {"n[1,07-08]", {"lan:n1", "lan:n07", "lan:n08"}},
        {"r[1-2]n[3-4]", {"lan:r1n3", "lan:r1n4", "lan:r2n3", "lan:r2n4"}},
        {"10.0.0.1:[6230-6231]", {"lan:10.0.0.1:6230", "lan:10.0.0.1:6231"}},
        {"b,a,b,n[1-2],n2", {"lan:b", "lan:a", "lan:n1", "lan:n2"}},
    };
    for (const auto& c : cases) EXPECT_EQ(Sources(c.list), c.sources) << c.list;
}

TEST(HostList, WhatIsNoListIsRefusedWithItsPlace) {
    for (const char* list :
         {"n[1-", "n1-3]", "n[3-1]", "n[]", "n[a-b]", "n[1-2-3]", "n[1,]", "a/b", "a$b", "n\x01",
          ",", "[fe80::1", "n[1-1234567890]", "n[1-1000001]", "@/no/such/file", "%rack"}) {
        EXPECT_NE(Refusal({list}), "") << list;
    }
    EXPECT_THAT(Refusal({std::string(301, 'h')}),
                AllOf(HasSubstr("too long for a host"), SizeIs(testing::Lt(150u))));
    EXPECT_THAT(Refusal({"n[3-1]"}), AllOf(HasSubstr("n[3-1]"), HasSubstr("is no range")));
}

TEST(HostList, AFileHasAHostALineWithOptionsOfItsOwn) {
    ipmiseltest::TemporaryFolder folder;
    const std::string file = folder.Write("bmcs",
                                          "# all of them\n\n"
                                          "node[1-2]  user=admin cipher-suite=3 # old\r\n"
                                          "rack7\tuser=a=b\n"
                                          "last");
    const auto hosts = ParseHostLists({"rack7,@" + file, "node1"}, nullptr);
    EXPECT_EQ(Sources(hosts), (Names{"lan:rack7", "lan:node1", "lan:node2", "lan:last"}));
    using Options = std::vector<std::pair<std::string, std::string>>;
    EXPECT_EQ(hosts[0].options, (Options{{"user", "a=b"}}));
    EXPECT_EQ(hosts[2].options, (Options{{"user", "admin"}, {"cipher-suite", "3"}}));
    EXPECT_EQ(hosts[2].origin, file + ", line 3");
    EXPECT_THAT(hosts[3].options, IsEmpty());
}

TEST(HostList, AFileIsRefusedWithTheLineThatIsWrong) {
    ipmiseltest::TemporaryFolder folder;
    for (const char* line : {"node1 admin", "node1 =x", "@other", "%rack", "node[1 user=a"}) {
        const std::string file = folder.Write("bmcs", std::string("good\n") + line + "\n");
        EXPECT_THAT(Refusal({"@" + file}), HasSubstr(file + ", line 2: ")) << line;
    }
    const std::string twice = folder.Write("bmcs", "n1 user=a\nn[1-2] user=b\n");
    EXPECT_THAT(Refusal({"@" + twice}), HasSubstr("line 2: n1 has other options"));
}

TEST(HostList, AFileWithPasswordsIsForNobodyElse) {
    ipmiseltest::TemporaryFolder folder;
    const std::string file = folder.Write("bmcs", "node1 password=one,[two\n");
    chmod(file.c_str(), 0640);
    EXPECT_THAT(Refusal({"@" + file}), AllOf(HasSubstr("chmod 600"), Not(HasSubstr("one"))));
    chmod(file.c_str(), 0600);
    EXPECT_EQ(ParseHostLists({"@" + file}, nullptr)[0].options[0].second, "one,[two");
}

TEST(HostList, AGroupIsAListByName) {
    const FindGroup find = [](const std::string& name) -> std::optional<HostGroup> {
        if (name == "all") return HostGroup{"%rack,x", {{"user", "all"}, {"window", "4"}}};
        if (name == "rack") return HostGroup{"n[1-2]", {{"user", "rack"}}};
        if (name == "circle") return HostGroup{"a,%circle"};
        return std::nullopt;
    };
    const auto hosts = ParseHostLists({"%all"}, find);
    EXPECT_EQ(Sources(hosts), (Names{"lan:n1", "lan:n2", "lan:x"}));
    using Options = decltype(HostEntry::options);
    EXPECT_EQ(hosts[0].options, (Options{{"window", "4"}, {"user", "rack"}}))
        << "the inner group's";
    EXPECT_EQ(hosts[2].options, (Options{{"user", "all"}, {"window", "4"}}));
    EXPECT_THAT(Refusal({"%none"}, find), HasSubstr("no group %none"));
    EXPECT_THAT(Refusal({"%circle"}, find), HasSubstr("circle"));
}

TEST(Shard, EachHostBelongsToOnePartWhateverTheList) {
    std::vector<unsigned> sizes(8);
    for (const std::string& source : Sources("node[0001-1000]")) {
        unsigned parts = 0;
        for (std::size_t i = 1; i <= 8; ++i) {
            if (!Shard{i, 8}.Has(source)) continue;
            ++parts;
            ++sizes[i - 1];
        }
        EXPECT_EQ(parts, 1u) << source;
    }
    // Within four standard deviations of a binomial distribution (125, 10.5).
    EXPECT_THAT(sizes, Each(AllOf(Gt(83u), Lt(167u))));
    // By the first 64 bits of SHA-256, worked out with Python's hashlib.
    EXPECT_TRUE((Shard{2, 8}.Has("lan:a")));
    EXPECT_TRUE((Shard{4, 8}.Has("lan:node1-bmc")));
    EXPECT_TRUE((Shard{5, 8}.Has("lan:rack7")));
}

TEST(Shard, IsWrittenAsIndexAndCount) {
    EXPECT_EQ(ParseShard("3/8")->index, 3u);
    EXPECT_EQ(ParseShard("3/8")->count, 8u);
    for (const char* text : {"", "3", "0/8", "9/8", "a/8", "3/", "/8", "3/8/1", "-1/8", "1/0"}) {
        EXPECT_FALSE(ParseShard(text)) << text;
    }
}

}  // namespace
}  // namespace ipmisel
