/* Prints the library's version, whether the headers agree with it, and the
 * media type of each file named. */
#include <metainfo/metainfo.h>
#include <stdio.h>
#include <string.h>

int main(int argc, char** argv) {
    int i;
    printf("version %s %s\n", MM_Version(), strcmp(MM_Version(), MM_VERSION_STRING) == 0 ? "matches" : "differs");
    for (i = 1; i < argc; ++i) {
        int type = -1;
        const int32_t result = MM_MediaExtractor_DetectMediaType(argv[i], &type);
        printf("%s type %d result %d\n", argv[i], type, (int)result);
    }
    return MM_VersionNumber() == MM_VERSION_NUMBER ? 0 : 1;
}
