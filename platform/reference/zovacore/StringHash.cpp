#include <cstdlib>
#include <cstring>

#include "Seam.h"

// Pairs stand in the order in which their keys came. There are at most about a thousand, so that looking at each in
// turn is as good as anything.

namespace {

constexpr unsigned int kSmallest = 16;

void FreePair(ZovaSzPair& pair) {
    free(pair.key);
    free(pair.value);
}

/** Makes room for one pair more. */
bool Grow(ZovaSzHash& hash) {
    if (hash.count < hash.size) {
        return true;
    }
    const unsigned int size = hash.size < kSmallest ? kSmallest : hash.size * 2;
    void* pairs = reallocarray(hash.pairs, size, sizeof(ZovaSzPair));
    if (pairs == nullptr) {
        return false;
    }
    hash.pairs = static_cast<ZovaSzPair*>(pairs);
    hash.size = size;
    return true;
}

}  // namespace

ZovaSzHash* QLIBCSzHashAlloc(int size) {
    auto* hash = static_cast<ZovaSzHash*>(calloc(1, sizeof(ZovaSzHash)));
    if (hash == nullptr || size <= 0) {
        return hash;
    }
    hash->pairs = static_cast<ZovaSzPair*>(calloc(static_cast<size_t>(size), sizeof(ZovaSzPair)));
    hash->size = hash->pairs != nullptr ? static_cast<unsigned int>(size) : 0;
    return hash;
}

int QLIBCSzHashSetValue(ZovaSzHash** place, const char* key, const char* value) {
    if (place == nullptr || *place == nullptr || key == nullptr || value == nullptr) {
        return -1;
    }
    ZovaSzHash& hash = **place;
    char* copy = strdup(value);
    if (copy == nullptr) {
        return -1;
    }
    for (unsigned int at = 0; at < hash.count; ++at) {
        if (strcmp(hash.pairs[at].key, key) == 0) {
            free(hash.pairs[at].value);
            hash.pairs[at].value = copy;
            return 0;
        }
    }
    char* name = strdup(key);
    if (name == nullptr || !Grow(hash)) {
        free(name);
        free(copy);
        return -1;
    }
    hash.pairs[hash.count++] = {name, copy};
    return 0;
}

void QLIBCHashRemoveAll(ZovaSzHash* hash) {
    for (unsigned int at = 0; hash != nullptr && at < hash->count; ++at) {
        FreePair(hash->pairs[at]);
    }
    if (hash != nullptr) {
        hash->count = 0;
    }
}

void QLIBCSzHashFree(ZovaSzHash* hash) {
    if (hash != nullptr) {
        QLIBCHashRemoveAll(hash);
        free(hash->pairs);
        free(hash);
    }
}
