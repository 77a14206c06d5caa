// Shared shapes of the library's C++ code: the entry/exit tracer, the null
// pointer refusal and RAII guards for semaphores and reader/writer locks whose
// release takes the fatal path.
#pragma once

#include <cstdarg>
#include <cstdlib>
#include <cstring>
#include <type_traits>

#include "kvi/KviLogging.h"
#include "kvi/KviRwLock.h"
#include "kvi/KviSemaphore.h"

// The va_list form of kviCsLogger, for wrappers that forward a format.
SaErrorT kviCsVLogger(const char *SourceFile, SaHpiInt16T LineNumber, const char *FunctionName,
                      SaHpiUint32T Level, const char *Message, va_list Args) noexcept;

// Logs the entry line when constructed and the exit line when the scope ends,
// so a function with many returns needs no log call before each of them.
class KviFunctionTrace
{
  public:
    KviFunctionTrace(const char *file, int line, const char *func) noexcept
        : file_(file), func_(func), line_(static_cast<SaHpiInt16T>(line))
    {
    }
    ~KviFunctionTrace()
    {
        if (kviCsLogWanted(KVI_LOG_FUNC_OUT_NUM))
            kviCsLogger(file_, line_, func_, KVI_LOG_FUNC_OUT_NUM, "%s", exit_);
    }
    KviFunctionTrace(const KviFunctionTrace &) = delete;
    KviFunctionTrace &operator=(const KviFunctionTrace &) = delete;

    // The entry line; KVI_TRACE calls it only when the level wants it, so a
    // filtered trace costs no call.
    void enter(const char *format, ...) noexcept __attribute__((format(printf, 2, 3)))
    {
        va_list args;
        va_start(args, format);
        kviCsVLogger(file_, line_, func_, KVI_LOG_FUNC_IN_NUM, format, args);
        va_end(args);
    }

    // The text of the exit line; must outlive the scope (a literal).
    void exitMessage(const char *text) noexcept { exit_ = text; }

  private:
    const char *file_;
    const char *func_;
    SaHpiInt16T line_;
    const char *exit_ = "";
};

// Refuses a null pointer argument before any lock is taken.
#define KVI_NULL_CHECK(Ptr)                                                                        \
    do {                                                                                           \
        if ((Ptr) == nullptr) {                                                                    \
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, #Ptr " pointer is NULL.");                              \
            return SA_ERR_HPI_INVALID_PARAMS;                                                      \
        }                                                                                          \
    } while (0)

// Where a guard was made, so lock traces and fatal lines name the real caller.
struct KviCallSite {
    const char *file;
    const char *func;
    int line;
    const char *text; // the lock argument's source text, for the fatal line
};
#define KVI_CALL_SITE(text)                                                                        \
    KviCallSite                                                                                    \
    {                                                                                              \
        __FILE__, __func__, __LINE__, text                                                         \
    }

// Ends the process after a release that must not fail did fail.
[[noreturn]] void kviCsFatalRelease(const KviCallSite &site, const char *what,
                                    SaErrorT rc) noexcept;

// Holds a counting semaphore from a successful wait until release() or the end
// of the scope.
class KviSemGuard
{
  public:
    KviSemGuard(KviCsSemaphore *sem, SaHpiUint32T timeout, const KviCallSite &site) noexcept
        : sem_(sem), site_(site)
    {
        rc_ = kviCsSemWait(site.file, site.func, site.line, sem, timeout);
    }
    ~KviSemGuard() { release(); }
    KviSemGuard(const KviSemGuard &) = delete;
    KviSemGuard &operator=(const KviSemGuard &) = delete;

    SaErrorT result() const noexcept { return rc_; }
    bool held() const noexcept { return rc_ == SA_OK; }
    void release() noexcept
    {
        if (!held())
            return;
        rc_ = SA_ERR_HPI_INVALID_REQUEST;
        SaErrorT rc = kviCsSemPost(site_.file, site_.func, site_.line, sem_);
        if (rc != SA_OK)
            kviCsFatalRelease(site_, "kviCsSemPost", rc);
    }

  private:
    KviCsSemaphore *sem_;
    KviCallSite site_;
    SaErrorT rc_;
};
#define KVI_SEM_GUARD(var, sem, timeout) KviSemGuard var((sem), (timeout), KVI_CALL_SITE(#sem))

// Holds a reader/writer lock for reading or writing until release() or the
// end of the scope.
template <bool Write> class KviRwGuard
{
  public:
    KviRwGuard(KviCsRwLockT *lock, SaHpiUint32T timeout, const KviCallSite &site) noexcept
        : lock_(lock), site_(site)
    {
        rc_ = Write ? kviCsRwLockWrLock(site.file, site.func, site.line, lock, timeout)
                    : kviCsRwLockRdLock(site.file, site.func, site.line, lock, timeout);
    }
    ~KviRwGuard() { release(); }
    KviRwGuard(const KviRwGuard &) = delete;
    KviRwGuard &operator=(const KviRwGuard &) = delete;

    SaErrorT result() const noexcept { return rc_; }
    bool held() const noexcept { return rc_ == SA_OK; }
    void release() noexcept
    {
        if (!held())
            return;
        rc_ = SA_ERR_HPI_INVALID_REQUEST;
        SaErrorT rc = Write ? kviCsRwLockWrUnlock(site_.file, site_.func, site_.line, lock_)
                            : kviCsRwLockRdUnlock(site_.file, site_.func, site_.line, lock_);
        if (rc != SA_OK)
            kviCsFatalRelease(site_, Write ? "kviCsRwLockWrUnlock" : "kviCsRwLockRdUnlock", rc);
    }

  private:
    KviCsRwLockT *lock_;
    KviCallSite site_;
    SaErrorT rc_;
};
using KviReadLock = KviRwGuard<false>;
using KviWriteLock = KviRwGuard<true>;
#define KVI_READ_GUARD(var, lock, timeout) KviReadLock var((lock), (timeout), KVI_CALL_SITE(#lock))
#define KVI_WRITE_GUARD(var, lock, timeout)                                                        \
    KviWriteLock var((lock), (timeout), KVI_CALL_SITE(#lock))

// Entry trace of the current function with a printf-style message.
#define KVI_TRACE(...)                                                                             \
    KviFunctionTrace trace(__FILE__, __LINE__, __func__);                                          \
    if (kviCsLogWanted(KVI_LOG_FUNC_IN_NUM))                                                       \
    trace.enter(__VA_ARGS__)

// The integer stored in an enumeration that came from outside (a client, a
// plug-in, a file), read without taking it for one of the enumerators: such
// values are checked, not trusted.
template <typename E> std::underlying_type_t<E> kviCsRawEnum(const E &Value) noexcept
{
    std::underlying_type_t<E> raw;
    memcpy(&raw, &Value, sizeof raw);
    return raw;
}
