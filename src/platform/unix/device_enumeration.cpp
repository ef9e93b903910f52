// Device interfaces of the timing module: the sysfs layout below $TIKTAL_SYSROOT.
#include "platform/platform.h"
#include "platform/common.h"
#include "platform/unix/unix.h"

#include <limits.h>
#include <stdlib.h>

#include <algorithm>
#include <cerrno>
#include <new>

namespace platform {

namespace {

// The PCI path of a resolved device folder ".../sys/devices/pciDDDD:BB/F1/F2/...": the functions
// after the root folder, and the root folder's name.
int pciPathOf(const std::string& resolved, const std::string& devices, std::string& root, std::vector<std::string>& path) {
    if (resolved.compare(0, devices.size() + 1, devices + "/") != 0) return ENODEV;
    std::vector<std::string> parts;
    for (std::size_t at = devices.size() + 1, end; at < resolved.size(); at = end + 1) {
        end = std::min(resolved.find('/', at), resolved.size());
        parts.push_back(resolved.substr(at, end - at));
    }
    if (parts.size() < 2 || parts[0].compare(0, 3, "pci") != 0) return ENODEV;
    root = parts[0];
    path.assign(parts.begin() + 1, parts.end());
    return 0;
}

}  // namespace

OsError enumerateDeviceInterfaces(std::vector<DeviceInterfaceEntry>& entries, std::string& failedPath) noexcept {
    try {
        entries.clear();
        const std::string base = sysroot();
        const std::string classFolder = base + "/sys/class/tiktal";
        std::vector<std::string> names, roots;
        if (int error = listFolder(classFolder, names)) {
            if (error == ENOENT) return {};  // no driver: no devices
            failedPath = classFolder;
            return {"opendir", error};
        }
        char resolved[PATH_MAX];
        const std::string devices = ::realpath((base + "/sys/devices").c_str(), resolved) ? resolved : "";
        listFolder(devices, roots);
        roots.erase(std::remove_if(roots.begin(), roots.end(), [](const std::string& n) { return n.compare(0, 3, "pci") != 0; }),
                    roots.end());
        for (const std::string& name : names) {
            DeviceInterfaceEntry entry;
            entry.name = name;
            entry.classFolder = classFolder + "/" + name;
            entry.interfacePath = base + "/dev/" + name;
            failedPath = entry.classFolder + "/device";
            if (!::realpath(failedPath.c_str(), resolved)) {
                // Removed while the folder was listed (not present), or no folder (no device).
                if (errno == ENOENT || errno == ENOTDIR) continue;
                return {"realpath", errno};
            }
            entry.pciFolder = resolved;
            std::string root;
            if (int error = pciPathOf(entry.pciFolder, devices, root, entry.pciPath)) return {"realpath", error};
            entry.rootIndex = static_cast<int>(std::find(roots.begin(), roots.end(), root) - roots.begin());
            entries.push_back(std::move(entry));
        }
        failedPath.clear();
        return {};
    } catch (const std::bad_alloc&) {
        return {"malloc", ENOMEM};
    }
}

}  // namespace platform
