/*
 * The least that the agent's work can cost in plain C on this machine: read blocks, find line ends
 * (or cut records of 40 bytes), blank a row of 2864 bytes and copy the fields of each line into it.
 * The benchmark prints its lines per CPU second beside the agent's, so that the ratio holds on any
 * machine.
 *
 *     bench_baseline KIND FILE [OFFSET]    KIND is syslog, user or accounting;
 *                                          prints "LINES CPU_SECONDS WALL_SECONDS CHECKSUM"
 *     bench_baseline idle FILE SECONDS     looks at the ends of a thousand descriptors of the file
 *                                          once a second, with a thread for each; prints the same,
 *                                          the looks in place of the lines
 */
#include <fcntl.h>
#include <pthread.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/resource.h>
#include <sys/select.h>
#include <time.h>
#include <unistd.h>

enum {
    BLOCK = 256 * 1024,
    RECORD = 40,
    IDLE_LOGS = 1000,
    ROW = 2864,
    ENTRYTIME = 448,
    ENTRYSYS = 464,
    ENTRYSRC = 496,
    ENTRYTYPE = 528,
    ENTRYDESC = 560,
    UENTRYDESC = 2096,
    SYSLOG_STAMP = 15,
    USER_STAMP = 19
};

typedef void (*fill_function)(const char* line, const char* end);

static char block[BLOCK];
static char row[ROW];
static unsigned long checksum;
static long looks;

static void put(int offset, int width, const char* text, size_t length) {
    memcpy(row + offset, text, length < (size_t)width ? length : (size_t)width);
}

static void put_description(const char* text, const char* end) {
    put(ENTRYDESC, 256, text, (size_t)(end - text));
    put(UENTRYDESC, 768, text, (size_t)(end - text));
}

static void fill_from_syslog(const char* line, const char* end) {
    const char *system, *source, *description;
    if (end - line <= SYSLOG_STAMP + 1) {
        return;
    }
    put(ENTRYTIME, 16, line, SYSLOG_STAMP);
    system = line + SYSLOG_STAMP + 1;
    source = memchr(system, ' ', (size_t)(end - system));
    source = source != NULL ? source + 1 : end;
    description = memchr(source, ':', (size_t)(end - source));
    description = description != NULL && end - description >= 2 ? description + 2 : end;
    put(ENTRYSYS, 32, system, (size_t)(source - system));
    put(ENTRYSRC, 32, source, (size_t)(description - source));
    put_description(description, end);
}

static void fill_from_user(const char* line, const char* end) {
    const char *type, *description;
    if (end - line <= USER_STAMP + 1) {
        return;
    }
    put(ENTRYTIME, 16, line, USER_STAMP);
    type = line + USER_STAMP + 1;
    description = memchr(type, ' ', (size_t)(end - type));
    description = description != NULL ? description + 1 : end;
    put(ENTRYTYPE, 16, type, (size_t)(description - type));
    put_description(description, end);
}

static void fill_from_record(const char* record, const char* end) {
    put(ENTRYTIME, 16, end - 8, 8);
    put(ENTRYSRC, 32, record + 12, 12);
    put_description(record, record + 12);
}

/* The end of the line or record that begins here; null when it is not all there. */
static const char* end_of(const char* line, const char* limit, int is_record) {
    if (is_record) {
        return limit - line >= RECORD ? line + RECORD : NULL;
    }
    return memchr(line, '\n', (size_t)(limit - line));
}

static long read_lines(int descriptor, fill_function fill, int is_record) {
    size_t held = 0;
    long lines = 0;
    for (;;) {
        const ssize_t got = read(descriptor, block + held, BLOCK - held);
        const char *line = block, *end, *limit;
        if (got <= 0) {
            return lines;
        }
        limit = block + held + (size_t)got;
        while ((end = end_of(line, limit, is_record)) != NULL) {
            memset(row, ' ', ROW);
            fill(line, end);
            checksum += (unsigned char)row[UENTRYDESC];
            ++lines;
            line = is_record ? end : end + 1;
        }
        held = (size_t)(limit - line);
        if (held == BLOCK) {
            held = 0; /* a line as long as the block: not in these data */
        }
        memmove(block, line, held);
    }
}

static double wall_time(void) {
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return (double)now.tv_sec + 1e-9 * (double)now.tv_nsec;
}

/* One idle log: its end is asked for once a second. */
static void* look(void* path) {
    const int descriptor = open((const char*)path, O_RDONLY);
    for (;;) {
        struct timeval second = {1, 0};
        if (lseek(descriptor, 0, SEEK_END) < 0) {
            return NULL;
        }
        __atomic_add_fetch(&looks, 1, __ATOMIC_RELAXED);
        select(0, NULL, NULL, NULL, &second);
    }
}

static double cpu_time(void) {
    struct rusage usage;
    getrusage(RUSAGE_SELF, &usage);
    return (double)(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
           1e-6 * (double)(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec);
}

static int idle(char* path, unsigned seconds) {
    double cpu, begin;
    long before;
    int thread;
    for (thread = 0; thread < IDLE_LOGS; ++thread) {
        pthread_t started;
        if (pthread_create(&started, NULL, look, path) != 0) {
            fputs("cannot start a thread\n", stderr);
            return 1;
        }
    }
    sleep(2);
    before = looks;
    cpu = cpu_time();
    begin = wall_time();
    sleep(seconds);
    printf("%ld %.6f %.6f 0\n", looks - before, cpu_time() - cpu, wall_time() - begin);
    return 0;
}

static fill_function fill_of(const char* kind) {
    if (strcmp(kind, "syslog") == 0) {
        return fill_from_syslog;
    }
    return strcmp(kind, "user") == 0 ? fill_from_user : fill_from_record;
}

int main(int argc, char** argv) {
    const int descriptor = argc >= 3 ? open(argv[2], O_RDONLY) : -1;
    double begin;
    long lines;
    if (descriptor == -1) {
        fputs("usage: bench_baseline syslog|user|accounting FILE [OFFSET]\n"
              "       bench_baseline idle FILE SECONDS\n",
              stderr);
        return 2;
    }
    if (strcmp(argv[1], "idle") == 0) {
        return idle(argv[2], argc > 3 ? (unsigned)atoi(argv[3]) : 10);
    }
    begin = wall_time();
    if (argc > 3) {
        lseek(descriptor, (off_t)atoll(argv[3]), SEEK_SET);
    }
    lines = read_lines(descriptor, fill_of(argv[1]), strcmp(argv[1], "accounting") == 0);
    printf("%ld %.6f %.6f %lu\n", lines, cpu_time(), wall_time() - begin, checksum);
    return 0;
}
