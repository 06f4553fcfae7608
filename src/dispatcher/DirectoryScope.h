#pragma once

namespace ZOVA {

/** The working directory, by its path. */
class [[nodiscard]] DirectoryScope {
public:
    DirectoryScope() = default;
    DirectoryScope(const DirectoryScope&) = delete;
    DirectoryScope& operator=(const DirectoryScope&) = delete;
    ~DirectoryScope() { Restore(); }

    /** Notes the current directory; one that cannot be named is not gone back to. */
    void Save();
    /** Goes back to the noted directory, once. */
    void Restore();

private:
    char* saved = nullptr;
};

}  // namespace ZOVA
