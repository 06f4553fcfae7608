"""Bad input as data: rows of a name, what is sent, and the error number that has to come back."""

import collections

# query: bytes of the query string; body: bytes of a POST body, or None for a GET.
Row = collections.namedtuple("Row", "name query body code")

CALL = b"api=ZOVA.Core.User&version=1&method=get"
NO_LOGIN = 119
BAD_REQUEST = 101
NO_SUCH_API = 102
NO_SUCH_METHOD = 103
WRONG_VERSION = 104


def nested(depth):
    return b"[" * depth + b"]" * depth


def call(api=b"ZOVA.Core.User", version=b"1", method=b"get"):
    return b"api=" + api + b"&version=" + version + b"&method=" + method


def named(name, query, code):
    """The same pairs once as a query string and once as a body."""
    return [Row(name + ", in the query", query, None, code), Row(name + ", in the body", b"", query, code)]


ESCAPES = [row for rows in (
    named("escape cut at the end of a value", CALL + b"&x=%", NO_LOGIN),
    named("escape with one digit", CALL + b"&x=%4", NO_LOGIN),
    named("escape with no digits", CALL + b"&x=%zz&%=%%%", NO_LOGIN),
    named("broken escape in the API name", call(api=b"ZOVA.Core.User%"), NO_SUCH_API),
    named("broken escape in the method", call(method=b"get%g1"), NO_SUCH_METHOD),
    named("invalid UTF-8 in name and value", CALL + b"&%ff%fe=%c3%28%80", NO_LOGIN),
    named("escaped NUL in a value", CALL + b"&x=a%00b", NO_LOGIN),
    named("escaped NUL in the API name", call(api=b"ZOVA.Core.User%00x"), NO_SUCH_API),
    named("escaped NUL in the method", call(method=b"get%00x"), NO_SUCH_METHOD),
    named("nothing but separators", b"&&&===&=&", BAD_REQUEST),
    named("pairs without a name", CALL + b"&=1&=2", NO_LOGIN),
) for row in rows]

SIZES = [
    Row("one parameter of 1 MB", b"", CALL + b"&x=" + b"a" * 1000000, NO_LOGIN),
    Row("an API name of 1 MB", b"", call(api=b"A" * 1000000), NO_SUCH_API),
    Row("an API name of 1 MB of parts", b"", call(api=b"A." * 500000 + b"A"), NO_SUCH_API),
    Row("a method of 1 MB", b"", call(method=b"m" * 1000000), NO_SUCH_METHOD),
    Row("a parameter name of 1 MB", b"", CALL + b"&" + b"n" * 1000000 + b"=1", NO_LOGIN),
    Row("100,000 parameters", b"", CALL + b"".join(b"&p%d=%d" % (n, n) for n in range(100000)), NO_LOGIN),
    Row("100,000 times the same parameter", b"", CALL + b"&p=1" * 100000, NO_LOGIN),
]

DEPTHS = [row for depth in (256, 257, 100000) for row in (
    Row(f"a value nested {depth} deep", b"", CALL + b"&x=" + nested(depth), NO_LOGIN),
    Row(f"objects nested {depth} deep", b"", CALL + b"&x=" + b'{"a":' * depth + b"1" + b"}" * depth, NO_LOGIN),
    Row(f"a value of {depth} open brackets", b"", CALL + b"&x=" + b"[" * depth, NO_LOGIN),
)] + [
    Row("an API name nested 256 deep", b"", call(api=nested(256)), BAD_REQUEST),
    Row("an API name nested 257 deep, which is a text", b"", call(api=nested(257)), NO_SUCH_API),
    Row("a version nested 100000 deep", b"", call(version=nested(100000)), BAD_REQUEST),
]

DIGITS = b"1" * 1000
NUMBERS = [row for rows in (
    named("a number of 1,000 digits", CALL + b"&x=" + DIGITS, NO_LOGIN),
    named("a fraction of 1,000 digits", CALL + b"&x=0." + DIGITS, NO_LOGIN),
    named("an exponent of 1,000 digits", CALL + b"&x=1e" + DIGITS, NO_LOGIN),
    named("a version of 1,000 digits", call(version=DIGITS), BAD_REQUEST),
    named("a negative version of 1,000 digits", call(version=b"-" + DIGITS), BAD_REQUEST),
    named("a version of 64 bits", call(version=b"18446744073709551615"), BAD_REQUEST),
    named("a version that is 1 in its lower 32 bits", call(version=b"4294967297"), BAD_REQUEST),
    named("a version above the highest", call(version=b"2147483647"), WRONG_VERSION),
    named("version 0", call(version=b"0"), BAD_REQUEST),
    named("version -1", call(version=b"-1"), BAD_REQUEST),
    named("a version with a letter", call(version=b"1x"), BAD_REQUEST),
    named("a version that is an object", call(version=b"{}"), BAD_REQUEST),
    named("a version that is an array", call(version=b"[1]"), BAD_REQUEST),
    named("a version that is null", call(version=b"null"), BAD_REQUEST),
) for row in rows]

TYPES = [row for rows in (
    named("an API name that is an object", call(api=b'{"a":1}'), BAD_REQUEST),
    named("an API name that is an empty object", call(api=b"{}"), BAD_REQUEST),
    named("an API name that is an array", call(api=b'["ZOVA.Core.User"]'), BAD_REQUEST),
    named("an API name that is a number", call(api=b"5"), NO_SUCH_API),
    named("an API name that is null", call(api=b"null"), BAD_REQUEST),
    named("a method that is an object", call(method=b'{"get":1}'), BAD_REQUEST),
    named("a method that is an array", call(method=b'["get"]'), BAD_REQUEST),
    named("a method that is a number", call(method=b"5"), NO_SUCH_METHOD),
    named("a method that is null", call(method=b"null"), BAD_REQUEST),
    named("an empty method", call(method=b""), BAD_REQUEST),
    named("an empty API name", call(api=b""), BAD_REQUEST),
) for row in rows]

API_NAMES = [row for name in (
    b"../../../etc/passwd", b"/etc/passwd", b"../webapi/ZOVA.Core.User", b"./ZOVA.Core.User", b"ZOVA.Core.User/",
    b"ZOVA/Core/User", b"ZOVA..Core.User", b".ZOVA.Core.User", b"ZOVA.Core.User.", b".", b"..", b"...", b"ZOVA.Core",
    b"ZOVA", b"lib", b"*", b"ZOVA.Core.*", b"ZOVA.Core.User%0a", b"ZOVA.Core.User%2f..%2fx", b"%2e%2e%2f%2e%2e%2fetc",
    b"ZOVA.Core.User.lib", b"ZOVA.Core.User.A.B.C.D.E.F.G", b"ZOVA.Core.User%20", b"zova.core.user", b"%s%n%x",
) for row in named(f"API name {name.decode()}", call(api=name), NO_SUCH_API)]

CUT_BODIES = [
    Row("a NUL byte behind the pairs cuts them there", b"", CALL + b"\0&method=list&api=X", NO_LOGIN),
    Row("a NUL byte before the pairs leaves none", b"", b"\0" + CALL, BAD_REQUEST),
    Row("a NUL byte in the API name leaves its beginning", b"", b"version=1&method=get&api=ZOVA.Core.User\0x",
        NO_LOGIN),
    Row("a body of NUL bytes", b"", b"\0" * 1000, BAD_REQUEST),
    Row("a body of all bytes but NUL", b"", bytes(range(1, 256)) * 40, BAD_REQUEST),
    Row("an empty body", b"", b"", BAD_REQUEST),
    Row("an envelope of nothing", b"", b"__cIpHeRtExT=", BAD_REQUEST),
    Row("an envelope that is none", b"", b"__cIpHeRtExT=" + b"A" * 2000, BAD_REQUEST),
    Row("a pair of the AES scheme that is none", b"", CALL + b"&__nEkOtReHpIc=t&__tXeTrEhPiC=AAAA", BAD_REQUEST),
    Row("an empty cipher text beside a token", b"", CALL + b"&__nEkOtReHpIc=t&__tXeTrEhPiC=", BAD_REQUEST),
    Row("a broken envelope inside webapi is passed over", b"", CALL + b'&webapi={"__cIpHeRtExT":"x"}', NO_LOGIN),
    Row("a webapi that is a number", b"", CALL + b"&webapi=1", NO_LOGIN),
]

ROWS = ESCAPES + SIZES + DEPTHS + NUMBERS + TYPES + API_NAMES + CUT_BODIES
