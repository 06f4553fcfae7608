#include "webapi/Json.h"

#include <fcntl.h>
#include <json/reader.h>
#include <json/writer.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <cstdio>
#include <limits>
#include <memory>

#include "base/DecimalText.h"
#include "base/UniqueFd.h"

using ZOVA::base::UniqueFd;

namespace Json {

namespace {

constexpr off_t kMaximumFileSize = 64 * 1024 * 1024;

std::unique_ptr<CharReader> NewReader() {
    CharReaderBuilder builder;
    builder["collectComments"] = false;
    builder["allowComments"] = false;
    builder["allowTrailingCommas"] = false;
    builder["failIfExtra"] = true;
    // Beyond what NestsTooDeep lets through: the reader counts a scalar as a level of its own.
    builder["stackLimit"] = kMaximumDepth + 2;
    return std::unique_ptr<CharReader>(builder.newCharReader());
}

/** Whether more than kMaximumDepth arrays and objects stand open at once anywhere in the text. */
bool NestsTooDeep(const std::string& text) {
    int depth = 0;
    bool inString = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const char c = text[i];
        if (inString) {
            if (c == '\\') {
                ++i;
            } else if (c == '"') {
                inString = false;
            }
        } else if (c == '"') {
            inString = true;
        } else if (c == '[' || c == '{') {
            if (++depth > kMaximumDepth) {
                return true;
            }
        } else if (c == ']' || c == '}') {
            --depth;
        }
    }
    return false;
}

/** A real number cut to an integer; 0 if it does not fit. The bounds are exact: both are powers of two. */
template <class Integer>
Integer FromReal(double number) {
    constexpr double low = static_cast<double>(std::numeric_limits<Integer>::min());
    const double limit = std::ldexp(1.0, std::numeric_limits<Integer>::digits);
    return number >= low && number < limit ? static_cast<Integer>(number) : 0;
}

/** What the stock writer makes of an infinite number; no JSON reader takes it back. */
constexpr const char* kInfinity = "1e+9999";

/** Turns every number that JSON cannot hold into null. */
void MakeFinite(Value& value) {
    if (value.type() == realValue) {
        if (!std::isfinite(value.asDouble())) {
            value = Value();
        }
    } else if (value.type() == arrayValue || value.type() == objectValue) {
        for (Value& element : value) {
            MakeFinite(element);
        }
    }
}

bool ReadText(int fd, std::size_t size, std::string& text) {
    text.resize(size);
    std::size_t done = 0;
    while (done < size) {
        ssize_t got = read(fd, text.data() + done, size - done);
        if (got < 0) {
            if (errno == EINTR) {
                continue;
            }
            return false;
        }
        if (got == 0) {
            break;
        }
        done += static_cast<std::size_t>(got);
    }
    text.resize(done);
    return true;
}

bool WriteText(int fd, const std::string& text) {
    std::size_t done = 0;
    while (done < text.size()) {
        ssize_t written = write(fd, text.data() + done, text.size() - done);
        if (written < 0) {
            if (errno == EINTR) {
                continue;
            }
            return false;
        }
        done += static_cast<std::size_t>(written);
    }
    return true;
}

/** Writes the whole text into a new file that only its owner can read, with the mode of the file it will replace. */
bool WriteNewFile(const std::string& path, const std::string& oldPath, const std::string& text) {
    UniqueFd file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!file.IsOpen()) {
        return false;
    }
    struct stat old {};
    if (stat(oldPath.c_str(), &old) == 0 && fchmod(file.Get(), old.st_mode & 07777) != 0) {
        return false;
    }
    return WriteText(file.Get(), text) && close(file.Release()) == 0;
}

}  // namespace

bool fromString(Value& value, const std::string& text) {
    if (NestsTooDeep(text)) {
        return false;
    }
    try {
        Value parsed;
        if (!NewReader()->parse(text.data(), text.data() + text.size(), &parsed, nullptr)) {
            return false;
        }
        value.swap(parsed);
        return true;
    } catch (const std::exception&) {
        return false;
    }
}

bool fromFile(Value& value, const std::string& path) {
    UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    struct stat status {};
    if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !S_ISREG(status.st_mode) ||
        status.st_size > kMaximumFileSize) {
        return false;
    }
    std::string text;
    return ReadText(file.Get(), static_cast<std::size_t>(status.st_size), text) && fromString(value, text);
}

std::string toString(const Value& value) {
    StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    try {
        std::string text = writeString(builder, value);
        if (text.find(kInfinity) == std::string::npos) {
            return text;
        }
        Value finite = value;
        MakeFinite(finite);
        return writeString(builder, finite);
    } catch (const std::exception&) {
        return "null";
    }
}

bool toFile(const Value& value, const std::string& path) {
    const std::string newPath = path + ".new." + std::to_string(getpid());
    unlink(newPath.c_str());
    if (WriteNewFile(newPath, path, toString(value)) && rename(newPath.c_str(), path.c_str()) == 0) {
        return true;
    }
    unlink(newPath.c_str());
    return false;
}

ArrayIndex searchArrayIndex(const Value& array, const Value& element) {
    if (array.type() == arrayValue) {
        for (ArrayIndex index = 0; index < array.size(); ++index) {
            if (array[index] == element) {
                return index;
            }
        }
    }
    return Value::maxUInt;
}

bool isObject(const Value& value) {
    return value.type() == objectValue || value.type() == nullValue;
}

bool isArray(const Value& value) {
    return value.type() == arrayValue || value.type() == nullValue;
}

bool hasMember(const Value& value, const std::string& name) {
    return value.type() == objectValue && value.find(name.data(), name.data() + name.size()) != nullptr;
}

const Value& member(const Value& value, const std::string& name) {
    if (value.type() == objectValue) {
        if (const Value* found = value.find(name.data(), name.data() + name.size())) {
            return *found;
        }
    }
    return Value::nullSingleton();
}

int asInt(const Value& value) {
    long long number = asInt64(value);
    return number >= std::numeric_limits<int>::min() && number <= std::numeric_limits<int>::max()
               ? static_cast<int>(number)
               : 0;
}

long long asInt64(const Value& value) {
    switch (value.type()) {
        case intValue:
            return value.asInt64();
        case uintValue:
            return value.isInt64() ? value.asInt64() : 0;
        case realValue:
            return FromReal<long long>(value.asDouble());
        case booleanValue:
            return value.asBool() ? 1 : 0;
        case stringValue:
            return ZOVA::base::DecimalNumberThatFits(asString(value)).value_or(0);
        default:
            return 0;
    }
}

unsigned long long asUInt64(const Value& value) {
    switch (value.type()) {
        case intValue:
            return value.isUInt64() ? value.asUInt64() : 0;
        case uintValue:
            return value.asUInt64();
        case realValue:
            return FromReal<unsigned long long>(value.asDouble());
        case booleanValue:
            return value.asBool() ? 1 : 0;
        case stringValue:
            return ZOVA::base::UnsignedDecimalNumberThatFits(asString(value)).value_or(0);
        default:
            return 0;
    }
}

std::string asString(const Value& value) {
    switch (value.type()) {
        case stringValue: {
            const char* begin = nullptr;
            const char* end = nullptr;
            value.getString(&begin, &end);
            return std::string(begin, end);
        }
        case intValue:
            return std::to_string(value.asInt64());
        case uintValue:
            return std::to_string(value.asUInt64());
        case realValue:
            return toString(value);
        case booleanValue:
            return value.asBool() ? "true" : "false";
        default:
            return "";
    }
}

bool asBool(const Value& value) {
    switch (value.type()) {
        case booleanValue:
            return value.asBool();
        case intValue:
            return value.asInt64() != 0;
        case uintValue:
            return value.asUInt64() != 0;
        case realValue:
            return value.asDouble() != 0.0;
        default:
            return false;
    }
}

}  // namespace Json
