/// @file
/// A /dev of this process's own, for the fixed device path.
#pragma once

#include <cerrno>
#include <cstring>
#include <fstream>
#include <string>

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

namespace kz::test {

/// Covers /dev, for this process alone, with an empty directory that tests may fill as they like.
/// The machine's own /dev is not touched. Needs root or unprivileged user namespaces.
class PrivateDevices {
public:
    /// Why /dev could not be covered; empty when it was. The first call covers it permanently.
    static const std::string& obstacle()
    {
        static const std::string obstacle = cover();
        return obstacle;
    }

    /// Puts a link at the device's path; an empty target: nothing is there.
    static void insert(const std::string& target)
    {
        static_cast<void>(::unlink("/dev/dvd"));
        if (!target.empty() && ::symlink(target.c_str(), "/dev/dvd") != 0) {
            throw std::system_error(errno, std::generic_category(), "/dev/dvd");
        }
    }

private:
    static std::string cover()
    {
        if (::unshare(CLONE_NEWNS) != 0 && !become_root_of_own_user_namespace()) {
            return failed("a private mount namespace");
        }
        // Private first: what is mounted must not be seen outside.
        if (::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
            return failed("keeping mounts private");
        }
        if (::mount("tmpfs", "/dev", "tmpfs", 0, "mode=0755") != 0) {
            return failed("covering /dev");
        }
        return {};
    }

    static bool become_root_of_own_user_namespace()
    {
        const uid_t user = ::getuid();
        const gid_t group = ::getgid();
        if (::unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) {
            return false;
        }
        std::ofstream("/proc/self/setgroups") << "deny";
        std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
        std::ofstream("/proc/self/gid_map") << "0 " << group << " 1";
        return true;
    }

    static std::string failed(const char* what)
    {
        return std::string("nothing can be put at /dev/dvd: ") + what + " is refused (" +
               std::strerror(errno) + "); run as root, or allow user namespaces";
    }
};

} // namespace kz::test
