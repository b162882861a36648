// A share record of the platform, freed with QIRAShareFree on every way out.
#pragma once

#include <memory>
#include <string>

#include "qira/qira_share.h"

namespace QIRA {
namespace FILEINDEX {
namespace detail {

struct ShareRecordFree {
    void operator()(QIRASHARE* share) const { QIRAShareFree(share); }
};
using ShareRecord = std::unique_ptr<QIRASHARE, ShareRecordFree>;

// QIRAShareGet of `name`; empty when the platform does not know the share.
inline ShareRecord GetShareRecord(const std::string& name) {
    QIRASHARE* raw = nullptr;
    return ShareRecord(QIRAShareGet(name.c_str(), &raw) < 0 ? nullptr : raw);
}

}  // namespace detail
}  // namespace FILEINDEX
}  // namespace QIRA
