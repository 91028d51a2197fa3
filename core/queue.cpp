#include "core/queue.h"

#include <algorithm>

#include "core/image_filter.h"

TovQueue::TovQueue(DevicePointer device) : TovObject(kType), device_(std::move(device)) {}

std::vector<ObjectRef>::iterator TovQueue::position(const TovImageFilter& filter) {
    return std::find_if(filters_.begin(), filters_.end(),
                        [&](const ObjectRef& entry) { return entry.get() == &filter; });
}

void TovQueue::attach(TovImageFilter& filter) {
    if (position(filter) != filters_.end()) throw TovException{TOV_ERROR_INVALID_PARAMETER};
    filters_.emplace_back(&filter);
}

void TovQueue::detach(TovImageFilter& filter) {
    const auto entry = position(filter);
    if (entry == filters_.end()) throw TovException{TOV_ERROR_INVALID_PARAMETER};
    filters_.erase(entry);
}

void TovQueue::execute() {
    for (const ObjectRef& filter : filters_) require<TovImageFilter>(filter).apply();
    device_->finish();
}
