// Helpers shared by the unit tests.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "KviDaemonCore.h"

// Opens the process's log in a fresh temporary file at the given level for the
// lifetime of the object, so a test can assert which lines were written.
// Logging is process-wide: one capture at a time.
class KviLogCapture
{
  public:
    explicit KviLogCapture(KviCsLogLevelSettingT level = KVI_LOG_DBG_L_NUM);
    ~KviLogCapture();
    KviLogCapture(const KviLogCapture &) = delete;
    KviLogCapture &operator=(const KviLogCapture &) = delete;

    const std::string &path() const { return path_; }
    std::vector<std::string> lines() const;
    // Lines that contain the text; the message part of a line is matched, so
    // pass the message (or a part of it) as it appears after the position.
    std::vector<std::string> matching(std::string_view text) const;
    bool contains(std::string_view text) const { return !matching(text).empty(); }
    // Forgets the lines written so far.
    void clear();

  private:
    std::string path_;
};

// A fresh empty directory under the build tree's temporary area, removed with
// everything in it when the object goes.
class KviTempDir
{
  public:
    KviTempDir();
    ~KviTempDir();
    KviTempDir(const KviTempDir &) = delete;
    KviTempDir &operator=(const KviTempDir &) = delete;
    const std::string &path() const { return path_; }
    std::string file(std::string_view name) const { return path_ + "/" + std::string(name); }
    // Writes a file in the directory and returns its path.
    std::string write(std::string_view name, std::string_view contents) const;

  private:
    std::string path_;
};

// The allocator's live-block count now.
SaHpiInt32T kviTestLiveBlocks();

// A TCP connection over 127.0.0.1 made with the library's own socket calls:
// a listener on a port the kernel picks, the client end and the accepted end.
// Closes whatever is still open when it goes, the client end first.
struct KviLoopback {
    KviLoopback();
    ~KviLoopback();
    KviLoopback(const KviLoopback &) = delete;
    KviLoopback &operator=(const KviLoopback &) = delete;
    SaHpiInt32T port = 0;
    SaHpiInt32T listener = -1;
    SaHpiInt32T client = -1;
    SaHpiInt32T server = -1;
};
