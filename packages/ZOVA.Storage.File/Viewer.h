#pragma once

#include <sys/stat.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

#include <string>
#include <vector>

#include "../common/UniqueFd.h"
#include "Caller.h"
#include "EntryJson.h"
#include "FileErrors.h"
#include "LinkFence.h"

namespace package {

/**
 * Reading for an account, or for a visitor of a link in the name of the link's owner, who then reads what the link
 * shares and nothing else. The process runs as that account afterwards, for good.
 */
class Viewer {
public:
    /**
     * Takes the identity. Where a visitor asks for something that is not shared nothing of it is opened.
     * @param paths all that will be opened.
     * @return false with the error in the response.
     */
    bool Begin(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, const std::vector<std::string>& paths);

    /** The same for the folders of an account, or for what a link shares and is still there. @param paths them. */
    bool BeginAtTop(const ZOVA::APIRequest* request, ZOVA::APIResponse* response, std::vector<std::string>& paths);

    bool IsVisitor() const { return isVisitor; }
    EntryView View() const { return isVisitor ? EntryView::kVisitor : EntryView::kAccount; }
    const Caller& Account() const { return *caller; }

    /** Opens one of the paths and says what it is. @param flags as for `OpenBeneath`. */
    FileError Open(const std::string& path, int flags, UniqueFd& out, struct stat& status) const;
    /** Whether this viewer may see what lies below an opened folder. */
    bool MaySee(const struct stat& status) const { return !isVisitor || fence.IsShared(status); }

private:
    bool BecomeCaller(ZOVA::APIResponse* response) const;

    const Caller* caller = nullptr;
    bool isVisitor = false;
    LinkFence fence;
};

}  // namespace package
