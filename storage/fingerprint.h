#pragma once

#include <string>

namespace IC {

/// One digest of an extract of the disk snapshot: what it was when the nodes were last built from it, and
/// what it is now. Empty when its tool gave nothing.
struct Fingerprint {
    std::string reference;
    std::string current;

    bool differs() const { return current != reference; }
    void accept() {
        reference = current;
        current.clear();
    }
};

/// Two digests of the same lines made by two tools: a host that lacks one of them still sees every change
/// through the other.
struct FingerprintPair {
    Fingerprint md5;
    Fingerprint sha1;

    bool differs() const { return md5.differs() || sha1.differs(); }
    /// What is now becomes what later passes compare with.
    void accept() {
        md5.accept();
        sha1.accept();
    }
};

}  // namespace IC
