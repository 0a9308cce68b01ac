// A connection profile of NetworkManager's with a wish in it.
#include "agent/keep/profile.h"

#include <gmock/gmock.h>

namespace {

using cvagent::keep::CannotKeep;
using cvagent::keep::differencesOf;
using cvagent::keep::editedProfile;
using cvagent::keep::ProfileIp;
using cvagent::keep::Wish;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

ProfileIp fixed() {
    ProfileIp profile;
    profile.ipv4.method = "manual";
    profile.ipv4.addresses = {{"192.0.2.10", 24, "eth0:1"}, {"198.51.100.5", 24}};
    profile.ipv4.gateway = "192.0.2.1";
    profile.ipv4.nameServers = {"192.0.2.53"};
    profile.ipv6.method = "auto";
    return profile;
}

ProfileIp leased() {
    ProfileIp profile;
    profile.ipv4.method = profile.ipv6.method = "auto";
    return profile;
}

std::vector<std::string> changedBy(const ProfileIp& profile, const std::function<void(Wish&)>& fill) {
    Wish wish;
    fill(wish);
    return differencesOf(profile, editedProfile(profile, wish));
}

std::string refusalOf(const ProfileIp& profile, const std::function<void(Wish&)>& fill) {
    try {
        changedBy(profile, fill);
        return "";
    } catch (const CannotKeep& cannot) {
        return cannot.what();
    }
}

TEST(Profile, HasTheNewAddressInThePlaceOfTheOldOne) {
    Wish wish;
    wish.ipv4.address = "192.0.2.77";
    wish.ipv4.likelyPrefix = 16;  // the profile's own counts
    const ProfileIp edited = editedProfile(fixed(), wish);
    EXPECT_THAT(
        differencesOf(fixed(), edited),
        ElementsAre("ipv4.addresses '192.0.2.10/24,198.51.100.5/24' -> '192.0.2.77/24,198.51.100.5/24'"));
    EXPECT_EQ(edited.ipv4.addresses[0].label, "eth0:1");
    EXPECT_EQ(editedProfile(edited, wish), edited);
}

TEST(Profile, HasTheNewAddressInThePlaceOfTheOneThatTheLinkIsKnownBy) {
    for (const auto& [old, expected] : {std::pair{"198.51.100.5", "-> '192.0.2.10/24,192.0.2.77/24'"},
                                        {"203.0.113.1", "-> '192.0.2.77/24,198.51.100.5/24'"},
                                        {"", "-> '192.0.2.77/24,198.51.100.5/24'"}}) {
        EXPECT_THAT(changedBy(fixed(),
                              [&](Wish& wish) {
                                  wish.ipv4.address = "192.0.2.77";
                                  wish.ipv4.likelyOld = old;
                              }),
                    ElementsAre(HasSubstr(expected)));
    }
}

TEST(Profile, HasAnAddressOnce) {
    EXPECT_THAT(changedBy(fixed(), [](Wish& wish) { wish.ipv4.address = "198.51.100.5"; }),
                ElementsAre(HasSubstr("-> '198.51.100.5/24'")));
}

TEST(Profile, BecomesAFixedOneWithTheGatewayOfTheLease) {
    const auto address = [](Wish& wish) {
        wish.dhcp = false;
        wish.ipv4.address = "192.0.2.77";
        wish.ipv4.likelyPrefix = 24;
        wish.ipv4.likelyGateway = "192.0.2.1";
    };
    EXPECT_THAT(changedBy(leased(), address),
                ElementsAre("ipv4.method 'auto' -> 'manual'", "ipv4.addresses '' -> '192.0.2.77/24'",
                            "ipv4.gateway '' -> '192.0.2.1'"));
    ProfileIp more = leased();
    more.ipv4.addresses = {{"198.51.100.5", 24}};
    EXPECT_THAT(changedBy(more, address), testing::Contains(HasSubstr("-> '192.0.2.77/24,198.51.100.5/24'")));
    EXPECT_EQ(refusalOf(leased(), [](Wish& wish) { wish.dhcp = false; }), "no address would be left");
}

TEST(Profile, BecomesALeasedOneWithNothingOfTheFixedOne) {
    EXPECT_THAT(
        changedBy(fixed(), [](Wish& wish) { wish.dhcp = true; }),
        ElementsAre("ipv4.method 'manual' -> 'auto'", "ipv4.addresses '192.0.2.10/24,198.51.100.5/24' -> ''",
                    "ipv4.gateway '192.0.2.1' -> ''"));
    ProfileIp more = leased();
    more.ipv4.addresses = {{"198.51.100.5", 24}};
    EXPECT_THAT(changedBy(more, [](Wish& wish) { wish.dhcp = true; }), IsEmpty());
    for (const auto& [address, prefix, gateway] :
         {std::tuple{"192.0.2.7", 0U, ""}, {"", 25U, ""}, {"", 0U, "192.0.2.2"}}) {
        EXPECT_EQ(refusalOf(leased(),
                            [&](Wish& wish) {
                                if (*address != '\0') wish.ipv4.address = address;
                                if (prefix != 0) wish.ipv4.prefix = prefix;
                                if (*gateway != '\0') wish.ipv4.gateway = gateway;
                            }),
                  "the address comes by DHCP");
    }
}

TEST(Profile, HasAMaskAndAGatewayOfItsAddress) {
    EXPECT_THAT(changedBy(fixed(),
                          [](Wish& wish) {
                              wish.ipv4.prefix = 25;
                              wish.ipv4.gateway = "";
                          }),
                ElementsAre(HasSubstr("-> '192.0.2.10/25,"), "ipv4.gateway '192.0.2.1' -> ''"));
    EXPECT_THAT(refusalOf(leased(), [](Wish& wish) { wish.ipv6.prefix = 64; }),
                HasSubstr("no address of this kind"));
    EXPECT_THAT(refusalOf(leased(), [](Wish& wish) { wish.ipv6.gateway = "2001:db8::1"; }),
                HasSubstr("no address of this kind"));
    EXPECT_THAT(refusalOf(leased(), [](Wish& wish) { wish.ipv6.address = "2001:db8::1"; }),
                HasSubstr("no mask or prefix length"));
    ProfileIp routed = fixed();
    routed.ipv4.hasDefaultRoute = true;
    EXPECT_THAT(refusalOf(routed, [](Wish& wish) { wish.ipv4.gateway = "192.0.2.2"; }),
                HasSubstr("the default route stands among"));
}

TEST(Profile, HasAnAddressOfIpv6BesideWhatRoutersAnnounce) {
    ProfileIp profile = leased();
    profile.ipv6.addresses = {{"fe80::1", 64}, {"2001:db8::7", 56}};
    EXPECT_THAT(changedBy(profile,
                          [](Wish& wish) {
                              wish.ipv6.address = "2001:DB8:0::8";
                              wish.ipv6.gateway = "2001:db8::1";
                          }),
                ElementsAre("ipv6.addresses 'fe80::1/64,2001:db8::7/56' -> 'fe80::1/64,2001:db8::8/56'",
                            "ipv6.gateway '' -> '2001:db8::1'"));
    profile.ipv6 = {"ignore"};
    EXPECT_THAT(changedBy(profile,
                          [](Wish& wish) {
                              wish.ipv6.address = "2001:db8::8";
                              wish.ipv6.prefix = 64;
                          }),
                ElementsAre("ipv6.method 'ignore' -> 'manual'", "ipv6.addresses '' -> '2001:db8::8/64'"));
}

TEST(Profile, IsLeftAloneWhereItsMethodIsNotUnderstood) {
    for (const char* method : {"shared", "new\nmethod", ""}) {
        ProfileIp profile = fixed();
        profile.ipv4.method = profile.ipv6.method = method;
        const std::string expected =
            *method == '\0' ? "no settings of this kind" : "the connection's method is '";
        for (const auto fill :
             {+[](Wish& wish) { wish.dhcp = true; }, +[](Wish& wish) { wish.ipv4.prefix = 25; },
              +[](Wish& wish) { wish.ipv6.gateway = "2001:db8::1"; }}) {
            EXPECT_THAT(refusalOf(profile, fill), HasSubstr(expected)) << method;
        }
    }
}

TEST(Profile, HasNameServersByFamilyAndDomainsOnce) {
    ProfileIp profile = fixed();
    profile.ipv6.searchDomains = {"old.example"};
    EXPECT_THAT(changedBy(profile,
                          [](Wish& wish) {
                              wish.nameServers = {"2001:DB8::53", "192.0.2.54"};
                              wish.searchDomains = {"example.org"};
                          }),
                ElementsAre("ipv4.dns '192.0.2.53' -> '192.0.2.54'", "ipv4.dns-search '' -> 'example.org'",
                            "ipv6.dns '' -> '2001:db8::53'", "ipv6.dns-search 'old.example' -> ''"));
}

TEST(Profile, TakesNothingThatIsNoAddress) {
    EXPECT_NE(refusalOf(fixed(), [](Wish& wish) { wish.ipv4.address = "192.0.2.7\nx=1"; }), "");
    EXPECT_NE(refusalOf(fixed(), [](Wish& wish) { wish.ipv4.gateway = "0.0.0.0"; }), "");
}

}  // namespace
