#include "act/request_watch.h"

#include "base/clock.h"
#include "config/config_records.h"
#include "model/look_errors.h"

#include <algorithm>
#include <utility>

namespace vesk {
namespace {
// A document of a hundred thousand records takes a sixth of a second to read: it is read when it
// was replaced, and now and then, since within a tick of the clock that might not show.
const int64_t kReadAgainMs = 1000;

bool IsStored(const RequestBatch &batch, const std::vector<StoredRequest> &requests) {
    return std::any_of(requests.begin(), requests.end(), [&](const StoredRequest &request) {
        return request.type == batch.type && request.mountPath == batch.mountPath &&
               BatchIsStoredAs(batch, request.data);
    });
}
} // namespace

bool RequestWatch::HasChanged() {
    struct stat now {};
    const bool isThere = stat(configPath_.c_str(), &now) == 0;
    const bool isSame = isThere && now.st_ino == seen_.st_ino && now.st_size == seen_.st_size &&
                        now.st_mtim.tv_sec == seen_.st_mtim.tv_sec &&
                        now.st_mtim.tv_nsec == seen_.st_mtim.tv_nsec;
    seen_ = now;
    return !isSame || NowMs() - readAt_ >= kReadAgainMs;
}

std::vector<RequestBatch> RequestWatch::TakeFinished() {
    if (waiting_.empty() || !HasChanged()) {
        return {};
    }
    ConfigRecords records;
    readAt_ = NowMs();
    const bool isRead = ConfigReadRecords(configPath_.c_str(), &records) == 0;
    LookLogTake("");
    if (!isRead || !records.areRequestsKnown) {
        return {};
    }
    const auto finished =
        std::stable_partition(waiting_.begin(), waiting_.end(), [&](const RequestBatch &batch) {
            return IsStored(batch, records.requests);
        });
    std::vector<RequestBatch> taken(std::make_move_iterator(finished),
                                    std::make_move_iterator(waiting_.end()));
    waiting_.erase(finished, waiting_.end());
    return taken;
}

std::vector<RequestBatch> RequestWatch::TakeAll() {
    return std::exchange(waiting_, {});
}
} // namespace vesk
