// What the client's headers tell of its device.

#include <cerrno>

#include "FrameworkTest.h"
#include "webapi/APIRequest.h"

using unit::J;
using ZOVA::APIRequest;

namespace {

/** The accessors that are true, in their order, with blanks between. */
std::string TrueOnes(APIRequest& request) {
    const struct {
        const char* name;
        bool value;
    } answers[] = {
        {"Mobile", request.IsMobile()},     {"MobileDevice", request.IsMobileDevice()},
        {"IPhone", request.IsIPhone()},     {"Android", request.IsAndroid()},
        {"IEMobile", request.IsIEMobile()}, {"IPad", request.IsIPad()},
        {"PlayBook", request.IsPlayBook()}, {"BlackBerry6", request.IsBlackBerry6()},
        {"WebKit", request.IsWebKit()},     {"SupportWebApp", request.IsSupportWebApp()},
    };
    std::string names;
    for (const auto& answer : answers) {
        if (answer.value) {
            names.append(names.empty() ? "" : " ").append(answer.name);
        }
    }
    return names;
}

class UserAgentTest : public unit::FrameworkTest {
protected:
    void Set(const std::string& name, const std::string& value) {
        Json::Value env(Json::objectValue);
        env[name] = value;
        request.InitEnv(env);
    }

    const Json::Value& Section() const { return request.Serialize()["userAgent"]; }

    APIRequest request{Json::Value()};
};

struct HeaderCase {
    const char* name;
    const char* header;
    const char* answers;
};

class Headers : public UserAgentTest, public ::testing::WithParamInterface<HeaderCase> {};

TEST_P(Headers, AreClassifiedByTheirWords) {
    Set("HTTP_USER_AGENT", GetParam().header);
    EXPECT_EQ(TrueOnes(request), GetParam().answers);
}

const auto kName = [](const auto& row) { return std::string(row.param.name); };

// ---- the rules, one by one ----

INSTANTIATE_TEST_SUITE_P(
    Rules, Headers,
    ::testing::Values(
        HeaderCase{"AnIPadWithWebKitIsAnIPhoneAsWell", "x iPad x WebKit x",
                   "Mobile MobileDevice IPhone IPad WebKit SupportWebApp"},
        HeaderCase{"AnIPadWithoutWebKitHasNoWebApp", "x iPad x", "Mobile MobileDevice IPhone IPad"},
        HeaderCase{"AnIPhoneIsNoIPad", "iPhone WebKit", "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"AnIPodIsAnIPhone", "iPod WebKit", "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"AnIPhoneWithoutWebKitHasNoWebApp", "iPhone", "Mobile MobileDevice IPhone"},
        HeaderCase{"AndroidWithWebKit", "Android WebKit", "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"AndroidWithoutWebKitHasNoWebApp", "Android", "Mobile MobileDevice Android"},
        HeaderCase{"PlayBookWithWebKit", "PlayBook WebKit", "Mobile MobileDevice PlayBook WebKit SupportWebApp"},
        HeaderCase{"PlayBookWithoutWebKitHasNoWebApp", "PlayBook", "Mobile MobileDevice PlayBook"},
        HeaderCase{"BlackBerryWithWebKit", "BlackBerry WebKit", "Mobile MobileDevice BlackBerry6 WebKit SupportWebApp"},
        HeaderCase{"BlackBerryWithoutWebKitIsMobileWithoutAFamily", "BlackBerry", "Mobile MobileDevice"},
        HeaderCase{"IPadComesBeforeIPhone", "iPhone iPad", "Mobile MobileDevice IPhone IPad"},
        HeaderCase{"IPhoneComesBeforeAndroid", "Android iPhone", "Mobile MobileDevice IPhone"},
        HeaderCase{"AndroidComesBeforePlayBook", "PlayBook Android", "Mobile MobileDevice Android"},
        HeaderCase{"PlayBookComesBeforeBlackBerry", "BlackBerry PlayBook WebKit",
                   "Mobile MobileDevice PlayBook WebKit SupportWebApp"},
        HeaderCase{"OperaMiniIsMobileWithoutAFamily", "Opera Mini", "Mobile MobileDevice"},
        HeaderCase{"OperaMiniOnAndroidIsAndroid", "Android Opera Mini", "Mobile MobileDevice Android"},
        HeaderCase{"AMobilePatternWithWebKitHasNoWebApp", "SymbianOS WebKit", "Mobile MobileDevice WebKit"},
        HeaderCase{"ADesktopBrowserWithWebKitIsOnlyThat", "x WebKit x", "WebKit"},
        HeaderCase{"ADesktopBrowserWithMSIEIsNothing", "MSIE 9.0", ""},
        HeaderCase{"MSIEOnAMobileDevice", "MSIE Windows CE", "Mobile MobileDevice IEMobile"},
        HeaderCase{"IEMobileOnAMobileDevice", "Android IEMobile", "Mobile MobileDevice Android IEMobile"},
        HeaderCase{"AnEmptyHeaderIsNothing", "", ""},
        HeaderCase{"CapitalsAreSmallLetters", "ANDROID", "Mobile MobileDevice Android"},
        HeaderCase{"WordsInsideOfWordsCount", "xxandroidxx", "Mobile MobileDevice Android"},
        HeaderCase{"WordsInPiecesDoNot", "andr oid i pad", ""},
        HeaderCase{"LettersBeyondASCIIPass",
                   "\xc3\x84ndroid \xff\xfe Andro\xc3\xaf"
                   "d",
                   ""}),
    kName);

// Each alternative of the pattern, in letters that are not its own.
INSTANTIATE_TEST_SUITE_P(MobilePattern, Headers,
                         ::testing::Values(HeaderCase{"SymbianOS", "symbianos", "Mobile MobileDevice"},
                                           HeaderCase{"WindowsCE", "WINDOWS CE", "Mobile MobileDevice"},
                                           HeaderCase{"PalmOS", "palmos", "Mobile MobileDevice"},
                                           HeaderCase{"BlackBerry", "blackberry", "Mobile MobileDevice"},
                                           HeaderCase{"Vodafone", "VODAFONE", "Mobile MobileDevice"},
                                           HeaderCase{"OperaMobi", "opera mobi", "Mobile MobileDevice"},
                                           HeaderCase{"OperaMini", "opera mini", "Mobile MobileDevice"},
                                           HeaderCase{"UPBrowser", "up.browser", "Mobile MobileDevice"},
                                           HeaderCase{"TheDotOfUPBrowserIsADot", "upxbrowser", ""},
                                           HeaderCase{"AvantGo", "avantgo", "Mobile MobileDevice"},
                                           HeaderCase{"EudoraWeb", "eudoraweb", "Mobile MobileDevice"},
                                           HeaderCase{"PLink", "plink", "Mobile MobileDevice"},
                                           HeaderCase{"Plucker", "plucker", "Mobile MobileDevice"},
                                           HeaderCase{"NetFront", "netfront", "Mobile MobileDevice"},
                                           HeaderCase{"Xiino", "xiino", "Mobile MobileDevice"},
                                           HeaderCase{"Blazer", "blazer", "Mobile MobileDevice"},
                                           HeaderCase{"WebPro", "webpro", "Mobile MobileDevice"},
                                           HeaderCase{"ProxiNet", "proxinet", "Mobile MobileDevice"},
                                           HeaderCase{"Elaine", "elaine", "Mobile MobileDevice"},
                                           HeaderCase{"WindowsPhoneIsNotAmongThem", "Windows Phone", ""}),
                         kName);

// ---- headers of real clients, and what the rules make of them, right or not ----

INSTANTIATE_TEST_SUITE_P(
    Phones, Headers,
    ::testing::Values(
        HeaderCase{"SafariOnAnIPhone",
                   "Mozilla/5.0 (iPhone; CPU iPhone OS 17_4 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/17.4 Mobile/15E148 Safari/604.1",
                   "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"ChromeOnAnIPhone",
                   "Mozilla/5.0 (iPhone; CPU iPhone OS 17_4 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "CriOS/123.0.6312.52 Mobile/15E148 Safari/604.1",
                   "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"SafariOnAnIPodTouch",
                   "Mozilla/5.0 (iPod touch; CPU iPhone OS 12_5_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like "
                   "Gecko) Version/12.1.2 Mobile/15E148 Safari/604.1",
                   "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"AnAppOnAnIPhoneWithoutABrowser", "ExampleApp/3.2 (iPhone; iOS 17.4; Scale/3.00)",
                   "Mobile MobileDevice IPhone"},
        HeaderCase{"ChromeOnAndroid",
                   "Mozilla/5.0 (Linux; Android 10; K) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/124.0.0.0 Mobile "
                   "Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"FirefoxOnAndroidHasNoWebKit",
                   "Mozilla/5.0 (Android 14; Mobile; rv:125.0) Gecko/125.0 Firefox/125.0",
                   "Mobile MobileDevice Android"},
        HeaderCase{"OperaOnAndroid",
                   "Mozilla/5.0 (Linux; U; Android 9; en-us; SM-G960F Build/PPR1) AppleWebKit/537.36 (KHTML, like "
                   "Gecko) Version/4.0 Chrome/90.0.4430.210 Mobile Safari/537.36 OPR/56.1.2254.57583",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"OperaMiniOnAJavaPhone",
                   "Opera/9.80 (J2ME/MIDP; Opera Mini/7.1.32052/29.3709; U; en) Presto/2.8.119 Version/11.10",
                   "Mobile MobileDevice"},
        HeaderCase{"WindowsPhone81CallsItselfAndroidAndIPhone",
                   "Mozilla/5.0 (Mobile; Windows Phone 8.1; Android 4.0; ARM; Trident/7.0; Touch; rv:11.0; "
                   "IEMobile/11.0; NOKIA; Lumia 520) like iPhone OS 7_0_3 Mac OS X AppleWebKit/537 (KHTML, like Gecko) "
                   "Mobile Safari/537",
                   "Mobile MobileDevice IPhone IEMobile WebKit SupportWebApp"},
        HeaderCase{"WindowsPhone8IsTakenForADesktop",
                   "Mozilla/5.0 (compatible; MSIE 10.0; Windows Phone 8.0; Trident/6.0; IEMobile/10.0; ARM; Touch; "
                   "NOKIA; Lumia 920)",
                   ""},
        HeaderCase{"WindowsMobile6", "Mozilla/4.0 (compatible; MSIE 6.0; Windows CE; IEMobile 7.11) Sprint:PPC6800",
                   "Mobile MobileDevice IEMobile"},
        HeaderCase{"BlackBerry6",
                   "Mozilla/5.0 (BlackBerry; U; BlackBerry 9800; en) AppleWebKit/534.1+ (KHTML, like Gecko) "
                   "Version/6.0.0.337 Mobile Safari/534.1+",
                   "Mobile MobileDevice BlackBerry6 WebKit SupportWebApp"},
        HeaderCase{"BlackBerry42HasNoFamily",
                   "BlackBerry8320/4.2.2 Profile/MIDP-2.0 Configuration/CLDC-1.1 VendorID/100", "Mobile MobileDevice"},
        HeaderCase{"BlackBerry10IsTakenForADesktop",
                   "Mozilla/5.0 (BB10; Touch) AppleWebKit/537.10+ (KHTML, like Gecko) Version/10.0.9.2372 Mobile "
                   "Safari/537.10+",
                   "WebKit"},
        HeaderCase{"ASymbianPhoneHasNoFamily",
                   "Mozilla/5.0 (SymbianOS/9.4; Series60/5.0 NokiaN97-1/20.0.019; Profile/MIDP-2.1 "
                   "Configuration/CLDC-1.1) AppleWebKit/525 (KHTML, like Gecko) BrowserNG/7.1.18124",
                   "Mobile MobileDevice WebKit"},
        HeaderCase{"KaiOSIsTakenForADesktop",
                   "Mozilla/5.0 (Mobile; Nokia_8110_4G; rv:48.0) Gecko/48.0 Firefox/48.0 KAIOS/2.5", ""}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    Tablets, Headers,
    ::testing::Values(
        HeaderCase{"SafariOnAnOlderIPad",
                   "Mozilla/5.0 (iPad; CPU OS 12_5_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/12.1.2 Mobile/15E148 Safari/604.1",
                   "Mobile MobileDevice IPhone IPad WebKit SupportWebApp"},
        HeaderCase{"SafariOnTodaysIPadCallsItselfAMac",
                   "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_7) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/17.4 Safari/605.1.15",
                   "WebKit"},
        HeaderCase{"FirefoxOnAnAndroidTablet", "Mozilla/5.0 (Android 13; Tablet; rv:109.0) Gecko/118.0 Firefox/118.0",
                   "Mobile MobileDevice Android"},
        HeaderCase{"SilkOnAFireTablet",
                   "Mozilla/5.0 (Linux; Android 9; KFMAWI) AppleWebKit/537.36 (KHTML, like Gecko) Silk/122.4.1 like "
                   "Chrome/122.0.6261.119 Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"SilkThatAsksForDesktopPages",
                   "Mozilla/5.0 (X11; Linux x86_64) AppleWebKit/537.36 (KHTML, like Gecko) Silk/122.4.1 like "
                   "Chrome/122.0.6261.119 Safari/537.36",
                   "WebKit"},
        HeaderCase{"PlayBook",
                   "Mozilla/5.0 (PlayBook; U; RIM Tablet OS 2.1.0; en-US) AppleWebKit/536.2+ (KHTML, like Gecko) "
                   "Version/7.2.1.0 Safari/536.2+",
                   "Mobile MobileDevice PlayBook WebKit SupportWebApp"},
        HeaderCase{"AnEarlyKindle",
                   "Mozilla/4.0 (compatible; Linux 2.6.22) NetFront/3.4 Kindle/2.5 (screen 824x1200;rotate)",
                   "Mobile MobileDevice"},
        HeaderCase{"ALaterKindle",
                   "Mozilla/5.0 (X11; U; Linux armv7l like Android; en-us) AppleWebKit/531.2+ (KHTML, like Gecko) "
                   "Version/5.0 Safari/533.2+ Kindle/3.0+",
                   "Mobile MobileDevice Android WebKit SupportWebApp"}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    Desktops, Headers,
    ::testing::Values(
        HeaderCase{"ChromeOnWindows",
                   "Mozilla/5.0 (Windows NT 10.0; Win64; x64) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/124.0.0.0 "
                   "Safari/537.36",
                   "WebKit"},
        HeaderCase{"EdgeOnWindows",
                   "Mozilla/5.0 (Windows NT 10.0; Win64; x64) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/124.0.0.0 "
                   "Safari/537.36 Edg/124.0.0.0",
                   "WebKit"},
        HeaderCase{"FirefoxOnWindows",
                   "Mozilla/5.0 (Windows NT 10.0; Win64; x64; rv:125.0) Gecko/20100101 Firefox/125.0", ""},
        HeaderCase{"FirefoxOnLinux", "Mozilla/5.0 (X11; Linux x86_64; rv:125.0) Gecko/20100101 Firefox/125.0", ""},
        HeaderCase{"OperaOnAMac",
                   "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_7) AppleWebKit/537.36 (KHTML, like Gecko) "
                   "Chrome/123.0.0.0 Safari/537.36 OPR/109.0.0.0",
                   "WebKit"},
        HeaderCase{"ChromeOS",
                   "Mozilla/5.0 (X11; CrOS x86_64 14541.0.0) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/124.0.0.0 "
                   "Safari/537.36",
                   "WebKit"},
        HeaderCase{"InternetExplorer9", "Mozilla/5.0 (compatible; MSIE 9.0; Windows NT 6.1; Win64; x64; Trident/5.0)",
                   ""},
        HeaderCase{"InternetExplorer11", "Mozilla/5.0 (Windows NT 10.0; WOW64; Trident/7.0; rv:11.0) like Gecko", ""}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    OtherDevices, Headers,
    ::testing::Values(
        HeaderCase{"ATizenTelevision",
                   "Mozilla/5.0 (SMART-TV; Linux; Tizen 5.0) AppleWebKit/537.36 (KHTML, like Gecko) "
                   "SamsungBrowser/2.2 Chrome/63.0.3239.84 TV Safari/537.36",
                   "WebKit"},
        HeaderCase{"AWebOSTelevision",
                   "Mozilla/5.0 (Web0S; Linux/SmartTV) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/79.0.3945.79 "
                   "Safari/537.36 WebAppManager",
                   "WebKit"},
        HeaderCase{"AnAndroidTelevisionIsAMobileDevice",
                   "Mozilla/5.0 (Linux; Android 12; BRAVIA 4K VH2) AppleWebKit/537.36 (KHTML, like Gecko) "
                   "Chrome/120.0.0.0 Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"PlayStation5",
                   "Mozilla/5.0 (PlayStation; PlayStation 5/6.50) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/15.4 Safari/605.1.15",
                   "WebKit"},
        HeaderCase{"XboxSeriesX",
                   "Mozilla/5.0 (Windows NT 10.0; Win64; x64; Xbox; Xbox Series X) AppleWebKit/537.36 (KHTML, like "
                   "Gecko) Chrome/48.0.2564.82 Safari/537.36 Edge/20.02",
                   "WebKit"},
        HeaderCase{"NintendoSwitch",
                   "Mozilla/5.0 (Nintendo Switch; WifiWebAuthApplet) AppleWebKit/609.4 (KHTML, like Gecko) "
                   "NF/6.0.2.21.3 NintendoBrowser/5.1.0.22474",
                   "WebKit"},
        HeaderCase{"Nintendo3DSCallsItselfAnIPhone",
                   "Mozilla/5.0 (New Nintendo 3DS like iPhone) AppleWebKit/536.30 (KHTML, like Gecko) NX/3.0.0.5.20 "
                   "Mobile NintendoBrowser/1.10.10166.EU",
                   "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"AHeadsetWithAndroid",
                   "Mozilla/5.0 (X11; Linux x86_64; Quest 3) AppleWebKit/537.36 (KHTML, like Gecko) "
                   "OculusBrowser/32.0.0.4.36 SamsungBrowser/4.0 Chrome/122.0.6261.119 VR Safari/537.36",
                   "WebKit"}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    Programs, Headers,
    ::testing::Values(
        HeaderCase{"GooglebotForDesktops",
                   "Mozilla/5.0 AppleWebKit/537.36 (KHTML, like Gecko; compatible; Googlebot/2.1; "
                   "+http://www.google.com/bot.html) Chrome/124.0.0.0 Safari/537.36",
                   "WebKit"},
        HeaderCase{"GooglebotForPhonesIsAPhone",
                   "Mozilla/5.0 (Linux; Android 6.0.1; Nexus 5X Build/MMB29P) AppleWebKit/537.36 (KHTML, like Gecko) "
                   "Chrome/124.0.0.0 Mobile Safari/537.36 (compatible; Googlebot/2.1; +http://www.google.com/bot.html)",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"Bingbot", "Mozilla/5.0 (compatible; bingbot/2.0; +http://www.bing.com/bingbot.htm)", ""},
        HeaderCase{"Curl", "curl/8.5.0", ""}, HeaderCase{"Wget", "Wget/1.21.4", ""},
        HeaderCase{"Python", "python-requests/2.31.0", ""},
        HeaderCase{"AnAndroidHttpClient", "Dalvik/2.1.0 (Linux; U; Android 14; Pixel 8 Build/UQ1A.240105.004)",
                   "Mobile MobileDevice Android"},
        HeaderCase{"OkHttpDoesNotTell", "okhttp/4.12.0", ""}),
    kName);

INSTANTIATE_TEST_SUITE_P(
    ClientsOf2026, Headers,
    ::testing::Values(
        HeaderCase{"SafariOnAnIPhoneWithFrozenSystemVersion",
                   "Mozilla/5.0 (iPhone; CPU iPhone OS 18_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/26.1 Mobile/15E148 Safari/604.1",
                   "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"FirefoxOnAnIPhone",
                   "Mozilla/5.0 (iPhone; CPU iPhone OS 18_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "FxiOS/150.0 Mobile/15E148 Safari/605.1.15",
                   "Mobile MobileDevice IPhone WebKit SupportWebApp"},
        HeaderCase{"ChromeOnAnIPad",
                   "Mozilla/5.0 (iPad; CPU OS 18_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "CriOS/148.0.7778.42 Mobile/15E148 Safari/604.1",
                   "Mobile MobileDevice IPhone IPad WebKit SupportWebApp"},
        HeaderCase{"SafariOnAHeadsetCallsItselfAMac",
                   "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_7) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/26.1 Safari/605.1.15",
                   "WebKit"},
        HeaderCase{"ReducedChromeOnAPhone",
                   "Mozilla/5.0 (Linux; Android 10; K) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/148.0.0.0 Mobile "
                   "Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"ReducedChromeOnATablet",
                   "Mozilla/5.0 (Linux; Android 10; K) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/148.0.0.0 "
                   "Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"ChromeOnATabletThatAsksForDesktopPages",
                   "Mozilla/5.0 (X11; Linux x86_64) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/148.0.0.0 "
                   "Safari/537.36",
                   "WebKit"},
        HeaderCase{"SamsungInternet",
                   "Mozilla/5.0 (Linux; Android 10; K) AppleWebKit/537.36 (KHTML, like Gecko) SamsungBrowser/29.0 "
                   "Chrome/136.0.0.0 Mobile Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"AViewInAnAndroidApp",
                   "Mozilla/5.0 (Linux; Android 16; Pixel 10 Build/BP3A.250905.014; wv) AppleWebKit/537.36 (KHTML, "
                   "like Gecko) Version/4.0 Chrome/148.0.7778.60 Mobile Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"FirefoxOnAnAndroidPhone", "Mozilla/5.0 (Android 16; Mobile; rv:150.0) Gecko/150.0 Firefox/150.0",
                   "Mobile MobileDevice Android"},
        HeaderCase{"HarmonyOSIsTakenForADesktop",
                   "Mozilla/5.0 (Phone; OpenHarmony 5.0) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/114.0.0.0 "
                   "Safari/537.36 ArkWeb/4.1.6.1 Mobile",
                   "WebKit"},
        HeaderCase{"EdgeOnWindows",
                   "Mozilla/5.0 (Windows NT 10.0; Win64; x64) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/148.0.0.0 "
                   "Safari/537.36 Edg/148.0.0.0",
                   "WebKit"},
        HeaderCase{"FirefoxOnAMac",
                   "Mozilla/5.0 (Macintosh; Intel Mac OS X 10.15; rv:150.0) Gecko/20100101 Firefox/150.0", ""},
        HeaderCase{"HeadlessChrome",
                   "Mozilla/5.0 (X11; Linux x86_64) AppleWebKit/537.36 (KHTML, like Gecko) HeadlessChrome/148.0.0.0 "
                   "Safari/537.36",
                   "WebKit"},
        HeaderCase{"ATizenTelevisionOf2025",
                   "Mozilla/5.0 (SMART-TV; LINUX; Tizen 9.0) AppleWebKit/537.36 (KHTML, like Gecko) Version/9.0 "
                   "Chrome/120.0.6099.5 TV Safari/537.36",
                   "WebKit"},
        HeaderCase{"AWebOSTelevisionOf2025",
                   "Mozilla/5.0 (Web0S; Linux/SmartTV) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/120.0.6099.270 "
                   "Safari/537.36 WebAppManager",
                   "WebKit"},
        HeaderCase{"ATelevisionStickWithAndroid",
                   "Mozilla/5.0 (Linux; Android 11; AFTKRT Build/RS8101; wv) AppleWebKit/537.36 (KHTML, like Gecko) "
                   "Version/4.0 Chrome/128.0.6613.187 Mobile Safari/537.36",
                   "Mobile MobileDevice Android WebKit SupportWebApp"},
        HeaderCase{"TheBotOfALanguageModel",
                   "Mozilla/5.0 AppleWebKit/537.36 (KHTML, like Gecko; compatible; GPTBot/1.3; "
                   "+https://openai.com/gptbot)",
                   "WebKit"},
        HeaderCase{"ABotThatPreviewsLinks", "facebookexternalhit/1.1 (+http://www.facebook.com/externalhit_uatext.php)",
                   ""},
        HeaderCase{"TheBotOfAPhone",
                   "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_5) AppleWebKit/605.1.15 (KHTML, like Gecko) "
                   "Version/13.1.1 Safari/605.1.15 (Applebot/0.1; +http://www.apple.com/go/applebot)",
                   "WebKit"},
        HeaderCase{"AnIPhoneAppWithCFNetwork", "Example/26.1 CFNetwork/3860.200.71 Darwin/25.1.0", ""},
        HeaderCase{"GoHttpClient", "Go-http-client/2.0", ""}),
    kName);

// ---- the other headers ----

TEST_F(UserAgentTest, WithoutAHeaderEverythingIsFalseEvenWithAProfile) {
    Set("HTTP_X_WAP_PROFILE", "http://example.com/profile.xml");
    Set("HTTP_UA_OS", "x");
    EXPECT_EQ(TrueOnes(request), "");
    EXPECT_JSON(Section(), R"({"initialized": true})");
}

TEST_F(UserAgentTest, ADesktopHeaderBesideAnotherOfAPhoneIsAMobileDeviceWithoutAFamily) {
    for (const char* name : {"HTTP_UA_OS", "HTTP_X_WAP_PROFILE"}) {
        for (const char* value : {"", "x"}) {
            APIRequest other{Json::Value()};
            Json::Value env = J(R"({"HTTP_USER_AGENT": "MSIE WebKit"})");
            env[name] = value;
            other.InitEnv(env);
            EXPECT_EQ(TrueOnes(other), "Mobile MobileDevice IEMobile WebKit") << name << "=" << value;
        }
    }
}

TEST_F(UserAgentTest, AnEmptyHeaderIsAHeader) {
    Set("HTTP_USER_AGENT", "");
    Set("HTTP_UA_OS", "");
    EXPECT_EQ(TrueOnes(request), "Mobile MobileDevice");
}

// ---- the desktop view ----

struct DesktopCase {
    const char* name;
    const char* cookies;
    bool mobile;
};

class ForceDesktop : public UserAgentTest, public ::testing::WithParamInterface<DesktopCase> {};

TEST_P(ForceDesktop, IsAskedForByANumberButZero) {
    Set("HTTP_USER_AGENT", "iPhone");
    Set("HTTP_COOKIE", GetParam().cookies);
    EXPECT_EQ(request.IsMobile(), GetParam().mobile);
    EXPECT_TRUE(request.IsMobileDevice());
    EXPECT_TRUE(request.IsIPhone());
}

INSTANTIATE_TEST_SUITE_P(
    Rows, ForceDesktop,
    ::testing::Values(DesktopCase{"One", "forceDesktop=1", false}, DesktopCase{"Zero", "forceDesktop=0", true},
                      DesktopCase{"Yes", "forceDesktop=yes", true}, DesktopCase{"Nothing", "", true},
                      DesktopCase{"Empty", "forceDesktop=", true}, DesktopCase{"Negative", "forceDesktop=-1", false},
                      DesktopCase{"DigitsThenLetters", "forceDesktop=2x", false},
                      DesktopCase{"BlankBefore", "forceDesktop=%20 1", false},
                      DesktopCase{"Hexadecimal", "forceDesktop=0x1", true},
                      DesktopCase{"TooLarge", "forceDesktop=99999999999999999999999", false},
                      DesktopCase{"WrapsToZeroIn32Bits", "forceDesktop=4294967296", false},
                      DesktopCase{"WrapsToZeroIn64Bits", "forceDesktop=18446744073709551616", false},
                      DesktopCase{"NulBefore", "forceDesktop=%001", true},
                      DesktopCase{"OtherCapitals", "forcedesktop=1", true}),
    kName);

TEST_F(UserAgentTest, TheDesktopViewIsNoMatterToADesktop) {
    Set("HTTP_USER_AGENT", "WebKit");
    Set("HTTP_COOKIE", "forceDesktop=0");
    EXPECT_EQ(TrueOnes(request), "WebKit");
}

TEST_F(UserAgentTest, ACookieThatIsTooLargeLeavesErrnoAlone) {
    Set("HTTP_USER_AGENT", "iPhone");
    Set("HTTP_COOKIE", "forceDesktop=99999999999999999999999");
    errno = 0;
    EXPECT_FALSE(request.IsMobile());
    EXPECT_EQ(errno, 0);
}

// ---- once, and what is kept ----

TEST_F(UserAgentTest, TheSectionHoldsAllTenFlagsAfterTheFirstQuestion) {
    Set("HTTP_USER_AGENT", "x");
    EXPECT_JSON(Section(), "{}");
    EXPECT_FALSE(request.IsWebKit());
    EXPECT_JSON(Section(), R"({"initialized": true, "uaMobile": false, "uaMobileDevice": false, "uaIPhone": false,
                               "uaAndroid": false, "uaIEMobile": false, "uaIPad": false, "uaPlayBook": false,
                               "uaBlackBerry6": false, "uaWebKit": false, "uaSupportWebAPP": false})");
}

TEST_F(UserAgentTest, EveryQuestionClassifiesAndTheFirstOneCounts) {
    bool (APIRequest::*const questions[])() = {
        &APIRequest::IsMobile,   &APIRequest::IsMobileDevice, &APIRequest::IsIPhone,   &APIRequest::IsAndroid,
        &APIRequest::IsIEMobile, &APIRequest::IsIPad,         &APIRequest::IsPlayBook, &APIRequest::IsBlackBerry6,
        &APIRequest::IsWebKit,   &APIRequest::IsSupportWebApp};
    for (const auto question : questions) {
        APIRequest other{J(R"({"environ": {"HTTP_USER_AGENT": "iPhone WebKit"}})")};
        (other.*question)();
        other.InitEnv(J(R"({"HTTP_USER_AGENT": "Android", "HTTP_COOKIE": "forceDesktop=1"})"));
        EXPECT_EQ(TrueOnes(other), "Mobile MobileDevice IPhone WebKit SupportWebApp");
    }
}

TEST_F(UserAgentTest, TheLibraryMakesTheLettersSmallOnceWithTheClosingZero) {
    Set("HTTP_USER_AGENT", "iPad");
    TrueOnes(request);
    EXPECT_EQ(platform.CallsOf({"QLIBCStrCaseLower"}), (std::vector<std::string>{"QLIBCStrCaseLower(0, 0, 5)"}));
    EXPECT_EQ(Json::asString(request.GetEnv("HTTP_USER_AGENT", "")), "iPad");
}

TEST_F(UserAgentTest, WithoutMemoryForTheHeaderEverythingIsFalseForGood) {
    Set("HTTP_USER_AGENT", "iPad WebKit");
    platform.Fail("calloc", ENOMEM);
    EXPECT_EQ(TrueOnes(request), "");
    EXPECT_JSON(Section(), R"({"initialized": true})");
    platform.StopFailing();
    EXPECT_EQ(TrueOnes(request), "");
}

TEST_F(UserAgentTest, TheAnswersTravelWithASerialisedRequest) {
    Set("HTTP_USER_AGENT", "iPad");
    request.IsMobile();
    Json::Value sections = request.Serialize();
    sections["environ"].clear();
    APIRequest other{Json::Value()};
    other.Deserialize(sections);
    EXPECT_EQ(TrueOnes(other), "Mobile MobileDevice IPhone IPad");
}

TEST_F(UserAgentTest, ACopyKeepsTheAnswers) {
    Set("HTTP_USER_AGENT", "iPad");
    request.IsMobile();
    APIRequest copy(request);
    copy.InitEnv(J(R"({"HTTP_USER_AGENT": "Android"})"));
    EXPECT_EQ(TrueOnes(copy), "Mobile MobileDevice IPhone IPad");
}

// ---- bad forms ----

TEST_F(UserAgentTest, AHeaderEndsAtItsFirstZeroByte) {
    Set("HTTP_USER_AGENT", std::string("WebKit\0iPad", 11));
    EXPECT_EQ(TrueOnes(request), "WebKit");
}

TEST_F(UserAgentTest, AHeaderOfAMegabyteIsClassified) {
    Set("HTTP_USER_AGENT", std::string(500000, 'p') + " opera min" + std::string(500000, '(') + " Elaine");
    EXPECT_EQ(TrueOnes(request), "Mobile MobileDevice");
}

TEST_F(UserAgentTest, AHeaderThatIsNoTextIsNone) {
    for (const char* value : {"null", "5", "true", "[\"iPad\"]", R"({"a": "iPad"})"}) {
        Json::Value sections = request.Serialize();
        sections["environ"]["HTTP_USER_AGENT"] = J(value);
        APIRequest other{Json::Value()};
        other.Deserialize(sections);
        EXPECT_EQ(TrueOnes(other), "") << value;
    }
}

TEST_F(UserAgentTest, ASectionOfAnyTypeIsSurvived) {
    for (const char* value :
         {"null", "5", "[]", "\"x\"", R"({"initialized": false, "uaMobile": "x", "uaIPad": [1]})"}) {
        Json::Value sections = request.Serialize();
        sections["environ"]["HTTP_USER_AGENT"] = "iPad WebKit";
        sections["userAgent"] = J(value);
        APIRequest other{Json::Value()};
        other.Deserialize(sections);
        EXPECT_EQ(TrueOnes(other), "") << value;
        EXPECT_EQ(other.Serialize()["userAgent"], J(value)) << value;
    }
}

}  // namespace
