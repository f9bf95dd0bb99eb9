/* A C program that calls every flat entry point of libfileindex.so, in the appliance that
 * run_in_appliance.cmake makes under the root given as the only argument. */
#include <stdio.h>
#include <string.h>

#include "fileindex/fileidx.h"

int main(int argc, char **argv)
{
    char share[1024], folder[2048], queue[2048], database[2048];
    char queueOut[1024] = "", databaseOut[1024] = "";
    int failed = 0;
    if (argc != 2) {
        fprintf(stderr, "usage: %s ROOT\n", argv[0]);
        return 2;
    }
    snprintf(share, sizeof(share), "%s/volume1/photo", argv[1]);
    snprintf(folder, sizeof(folder), "%s/holiday/2023", share);
    snprintf(queue, sizeof(queue), "%s/@eaDir/VEXO@file_index_queue", share);
    snprintf(database, sizeof(database), "%s/@eaDir/VEXO@.fileindexdb", share);

    const struct {
        const char *call;
        int result;
        int expected;
    } calls[] = {
        {"FILEIDXIsPathIndexed(/photo/holiday/2023)", FILEIDXIsPathIndexed("/photo/holiday/2023"), 1},
        {"FILEIDXIsFullPathIndexed(<share>/holiday/2023)", FILEIDXIsFullPathIndexed(folder), 1},
        {"FILEIDXIsShareIndexed(photo)", FILEIDXIsShareIndexed("photo"), 1},
        {"FILEIDXQueuePathGet(photo)", FILEIDXQueuePathGet("photo", queueOut, sizeof(queueOut)), (int)strlen(queue)},
        {"FILEIDXDBPathGet(photo)", FILEIDXDBPathGet("photo", databaseOut, sizeof(databaseOut)), (int)strlen(database)},
    };
    for (size_t i = 0; i < sizeof(calls) / sizeof(calls[0]); ++i) {
        if (calls[i].result != calls[i].expected) {
            fprintf(stderr, "%s gave %d, expected %d\n", calls[i].call, calls[i].result, calls[i].expected);
            ++failed;
        }
    }
    if (strcmp(queueOut, queue) != 0 || strcmp(databaseOut, database) != 0) {
        fprintf(stderr, "paths: queue %s, database %s\n", queueOut, databaseOut);
        ++failed;
    }
    return failed == 0 ? 0 : 1;
}
