#include "PrivateFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace trelm {

uError createPrivateFile(String const& path) {
    int fd = ::open(path.cStr(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (fd < 0) {
        return TRELM_ERROR_MSG(kFailure, "cannot create " + path + ": " + std::strerror(errno));
    }
    struct stat st {};
    uError result = TRELM_OK();
    if (::fstat(fd, &st) != 0) {
        result = TRELM_ERROR_MSG(kFailure, "cannot stat " + path + ": " + std::strerror(errno));
    } else if ((st.st_mode & 07777) != 0600 && ::fchmod(fd, 0600) != 0) {
        result = TRELM_ERROR_MSG(kFailure, "cannot make " + path + " private: " + std::strerror(errno));
    }
    ::close(fd);
    return result;
}

}  // namespace trelm
