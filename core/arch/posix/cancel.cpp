#include "core/arch/qvcancel.h"

#include <sys/eventfd.h>
#include <unistd.h>
#include <algorithm>
#include <cerrno>

#include "core/arch/platform.h"

QvCancellable::~QvCancellable() = default;

QvCancel::~QvCancel() {
    if (const int descriptor = descriptor_.load(); descriptor >= 0) close(descriptor);
}

void QvCancel::wake(int descriptor) const {
    const eventfd_t one = 1;
    // Fails only when the counter is full, and then it is readable.
    while (write(descriptor, &one, sizeof one) < 0 && errno == EINTR) {
    }
}

// Either this sees the descriptor of a writer, or the writer that makes it sees the request.
void QvCancel::request() {
    long long none = 0;
    at_.compare_exchange_strong(none, std::max(qv_platform().steadyNs(), 1LL));
    if (const int descriptor = descriptor_.load(); descriptor >= 0) wake(descriptor);
}

int QvCancel::descriptor() {
    int known = descriptor_.load();
    if (known >= 0) return known;
    const int made = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (made < 0) return -1;
    if (!descriptor_.compare_exchange_strong(known, made)) {
        close(made);
        return known;
    }
    if (requested()) wake(made);
    return made;
}

void QvCancel::clear() {
    at_ = 0;
    gaveUp_ = false;
    eventfd_t count;
    if (const int descriptor = descriptor_.load(); descriptor >= 0)
        while (read(descriptor, &count, sizeof count) < 0 && errno == EINTR) {
        }
}

long long QvCancel::graceLeft() const {
    const long long at = at_.load();
    return at == 0 ? graceNs : std::max(graceNs - (qv_platform().steadyNs() - at), 0LL);
}
