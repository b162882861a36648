// Simulated share service: the share table in shares.json.
#include <cstdlib>
#include <cstring>
#include <string>

#include "qira/qira_share.h"
#include "sim_state.h"

namespace {

constexpr int kErrNoSuchShare = 0x0B00;
constexpr int kErrBufferTooSmall = 0x0C00;

bool Flag(const Json::Value& share, const char* key) {
    return share.isMember(key) && share[key].isBool() && share[key].asBool();
}

bool CopyOut(const std::string& value, char* buffer, int size) {
    if (size <= 0 || value.size() >= static_cast<size_t>(size)) return false;
    std::memcpy(buffer, value.c_str(), value.size() + 1);
    return true;
}

}  // namespace

extern "C" {

int QIRAShareGet(const char* szName, QIRASHARE** ppShare) {
    using namespace qira_sim::detail;
    const std::string name = szName ? szName : "";
    if (Faulted("QIRAShareGet", name)) return -1;
    static const Json::Value kNone(Json::objectValue);
    const Json::Value& shares = ReadState("shares.json", kNone);
    if (!shares.isObject() || !shares.isMember(name) || !shares[name]["path"].isString()) {
        SetError(kErrNoSuchShare, __FILE__, __LINE__);
        return -1;
    }
    const Json::Value& entry = shares[name];
    auto* share = static_cast<QIRASHARE*>(std::calloc(1, sizeof(QIRASHARE)));
    if (!CopyOut(name, share->szName, sizeof share->szName) ||
        !CopyOut(entry["path"].asString(), share->szPath, sizeof share->szPath)) {
        std::free(share);
        SetError(kErrBufferTooSmall, __FILE__, __LINE__);
        return -1;
    }
    share->encrypted = Flag(entry, "encrypted");
    share->encryption = Flag(entry, "encryption");
    share->readOnly = Flag(entry, "read_only");
    *ppShare = share;
    return 0;
}

void QIRAShareFree(QIRASHARE* pShare) { std::free(pShare); }

int QIRAShareNamePathGet(const char* szFullPath, char* szName, int cbName, char* szPath, int cbPath) {
    using namespace qira_sim::detail;
    const std::string fullPath = szFullPath ? szFullPath : "";
    if (Faulted("QIRAShareNamePathGet", fullPath)) return -1;
    std::string name;
    Json::Value share;
    if (!FindShareOf(fullPath, name, share)) {
        SetError(kErrNoSuchShare, __FILE__, __LINE__);
        return -1;
    }
    std::string inside = fullPath.substr(share["path"].asString().size());
    if (inside.empty()) inside = "/";
    if (!CopyOut(name, szName, cbName) || !CopyOut(inside, szPath, cbPath)) {
        SetError(kErrBufferTooSmall, __FILE__, __LINE__);
        return -1;
    }
    return 0;
}

int QIRAShareIsShareRecycle(const char* szFullPath) {
    using namespace qira_sim::detail;
    const std::string fullPath = szFullPath ? szFullPath : "";
    if (Faulted("QIRAShareIsShareRecycle", fullPath)) return -1;
    std::string name;
    Json::Value share;
    if (!FindShareOf(fullPath, name, share)) return 0;
    return IsUnder(fullPath, share["path"].asString() + "/#recycle") ? 1 : 0;
}

static int ShareFlag(const char* op, const QIRASHARE* pShare, int* pOut, int value) {
    if (pShare == nullptr || pOut == nullptr) {
        qira_sim::detail::SetError(0x0D00, __FILE__, __LINE__);
        return -1;
    }
    if (qira_sim::detail::Faulted(op, pShare->szName)) return -1;
    *pOut = value;
    return 0;
}

int QLIBShareIsEncryptedGet(const QIRASHARE* pShare, int* pIsEncrypted) {
    return ShareFlag("QLIBShareIsEncryptedGet", pShare, pIsEncrypted, pShare ? pShare->encrypted : 0);
}

int QLIBShareIsEncryptionGet(const QIRASHARE* pShare, int* pIsEncryption) {
    return ShareFlag("QLIBShareIsEncryptionGet", pShare, pIsEncryption, pShare ? pShare->encryption : 0);
}

int QLIBShareIsReadOnlyGet(const QIRASHARE* pShare, int* pIsReadOnly) {
    return ShareFlag("QLIBShareIsReadOnlyGet", pShare, pIsReadOnly, pShare ? pShare->readOnly : 0);
}
}
