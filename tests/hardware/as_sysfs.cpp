// Preloaded into `sensors`, which asks whether /sys is one: a recorded host's is.
#include <dlfcn.h>
#include <linux/magic.h>
#include <sys/vfs.h>

extern "C" int statfs(const char* path, struct statfs* about) {
    using Function = int (*)(const char*, struct statfs*);
    static const auto real = reinterpret_cast<Function>(dlsym(RTLD_NEXT, "statfs"));
    const int result = real(path, about);
    about->f_type = SYSFS_MAGIC;
    return result;
}
