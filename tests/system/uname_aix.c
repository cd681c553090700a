/* Preloaded, so that the system calls itself AIX. */

#include <string.h>
#include <sys/syscall.h>
#include <sys/utsname.h>
#include <unistd.h>

int uname(struct utsname* names) {
    const long result = syscall(SYS_uname, names);
    strcpy(names->sysname, "AIX");
    return (int)result;
}
