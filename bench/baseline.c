/*
 * The least that the agent's work can cost in plain C on this machine: read blocks, find line ends,
 * blank a row of 2864 bytes and copy the fields of each line into it. The benchmark prints its lines
 * per CPU second beside the agent's, so that the ratio holds on any machine.
 *
 *     bench_baseline FILE      prints "LINES CPU_SECONDS CHECKSUM"
 */
#include <fcntl.h>
#include <stdio.h>
#include <string.h>
#include <sys/resource.h>
#include <unistd.h>

enum {
    BLOCK = 256 * 1024,
    ROW = 2864,
    ENTRYTIME = 448,
    ENTRYSYS = 464,
    ENTRYSRC = 496,
    ENTRYDESC = 560,
    UENTRYDESC = 2096,
    STAMP = 15
};

static char block[BLOCK];
static char row[ROW];
static unsigned long checksum;

static void put(int offset, int width, const char* text, size_t length) {
    memcpy(row + offset, text, length < (size_t)width ? length : (size_t)width);
}

static void fill_row(const char* line, const char* end) {
    const char *system, *source, *description;
    memset(row, ' ', ROW);
    if (end - line <= STAMP + 1) {
        return;
    }
    put(ENTRYTIME, 16, line, STAMP);
    system = line + STAMP + 1;
    source = memchr(system, ' ', (size_t)(end - system));
    source = source != NULL ? source + 1 : end;
    description = memchr(source, ':', (size_t)(end - source));
    description = description != NULL && end - description >= 2 ? description + 2 : end;
    put(ENTRYSYS, 32, system, (size_t)(source - system));
    put(ENTRYSRC, 32, source, (size_t)(description - source));
    put(ENTRYDESC, 256, description, (size_t)(end - description));
    put(UENTRYDESC, 768, description, (size_t)(end - description));
}

static long read_lines(int descriptor) {
    size_t held = 0;
    long lines = 0;
    for (;;) {
        const ssize_t got = read(descriptor, block + held, BLOCK - held);
        const char *line = block, *end, *limit;
        if (got <= 0) {
            return lines;
        }
        limit = block + held + (size_t)got;
        while ((end = memchr(line, '\n', (size_t)(limit - line))) != NULL) {
            fill_row(line, end);
            checksum += (unsigned char)row[UENTRYDESC];
            ++lines;
            line = end + 1;
        }
        held = (size_t)(limit - line);
        if (held == BLOCK) {
            held = 0; /* a line as long as the block: not in these data */
        }
        memmove(block, line, held);
    }
}

int main(int argc, char** argv) {
    struct rusage usage;
    const int descriptor = argc == 2 ? open(argv[1], O_RDONLY) : -1;
    long lines;
    if (descriptor == -1) {
        fputs("usage: bench_baseline FILE\n", stderr);
        return 2;
    }
    lines = read_lines(descriptor);
    getrusage(RUSAGE_SELF, &usage);
    printf("%ld %.6f %lu\n", lines,
           (double)(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
               1e-6 * (double)(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec),
           checksum);
    return 0;
}
