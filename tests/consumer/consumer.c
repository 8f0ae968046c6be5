/* Prints the library's version, whether the headers agree with it, and the
 * media type and format of each file named. */
#include <metainfo/metainfo.h>
#include <metainfo/probe.h>
#include <stdio.h>
#include <string.h>

int main(int argc, char** argv) {
    int i;
    printf("version %s %s\n", MM_Version(), strcmp(MM_Version(), MM_VERSION_STRING) == 0 ? "matches" : "differs");
    for (i = 1; i < argc; ++i) {
        int type = -1;
        mi_info* info = NULL;
        const int32_t result = MM_MediaExtractor_DetectMediaType(argv[i], &type);
        printf("%s type %d result %d\n", argv[i], type, (int)result);
        if (mi_probe(argv[i], &info) == MI_OK) printf("%s format %s\n", argv[i], info->format);
        mi_info_free(info);
    }
    return MM_VersionNumber() == MM_VERSION_NUMBER ? 0 : 1;
}
