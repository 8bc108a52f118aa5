#include "velora_upload_file/upload_types.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_names.h"

struct FileTypeEntry {
    const char *ext;
    int type;
};

static const FileTypeEntry s_file_types[] = {
    {"BMP", 3},    {"GIF", 3},  {"JPG", 3},  {"JPEG", 3},  {"JPE", 3},   {"PNG", 3},   {"PJPEG", 3}, {"WBMP", 3},
    {"3GP", 4},    {"3GPP", 4}, {"3G2", 4},  {"ASF", 4},   {"AVI", 4},   {"MP4", 4},   {"MPG", 4},   {"MPEG", 4},
    {"MKV", 4},    {"SDP", 4},  {"WMV", 4},  {"AAC", 5},   {"FLAC", 5},  {"G72", 5},   {"MP3", 5},   {"M4A", 5},
    {"MKA", 5},    {"WMA", 5},  {"IMY", 6},  {"MMF", 6},   {"MID", 6},   {"MIDI", 6},  {"MXMF", 6},  {"ogg", 6},
    {"SPM", 6},    {"SMP", 6},  {"SPF", 6},  {"WAV", 6},   {"XMF", 6},   {"PDF", 7},   {"DOC", 8},   {"DOCX", 8},
    {"PPT", 9},    {"PPTX", 9}, {"XLS", 10}, {"XLSX", 10}, {"AMR", 11},  {"AWB", 11},  {"HTML", 12}, {"HTM", 12},
    {"XHTML", 12}, {"SWF", 13}, {"M3G", 13}, {"IPK", 15},  {"THM", 16},  {"TXT", 17},  {"VCF", 18},  {"VCS", 19},
    {"VNT", 20},   {"VBM", 21}, {"SCN", 24}, {"SVG", 25},  {"SVGZ", 25}, {"opml", 26}, {"PEM", 27},  {"JAD", 28},
    {"JAR", 28},   {"WGT", 29}, {"DCF", 30}, {"TPK", 31},  {"SNB", 32},  {"GUL", 33},  {"HWP", 34},
};

int __get_file_type(const char *name)
{
    if (!name) {
        VELORA_LOGE("file_name is NULL");
        return 32;
    }
    char *ext = __get_file_ext_name(name);
    if (!ext)
        return FILE_TYPE_NONE;
    int type = FILE_TYPE_OTHER;
    for (const FileTypeEntry &entry : s_file_types) {
        if (g_ascii_strcasecmp(ext, entry.ext) == 0) {
            type = entry.type;
            break;
        }
    }
    g_free(ext);
    return type;
}

char *__get_formatted_size(gint64 bytes)
{
    constexpr gint64 kib = 1024, mib = kib * 1024, gib = mib * 1024;
    const auto size = static_cast<double>(bytes);
    if (bytes >= gib)
        return g_strdup_printf("%.2fGB", size * (1.0 / gib));
    if (bytes >= mib)
        return g_strdup_printf("%.2fMB", size * (1.0 / mib));
    return g_strdup_printf("%.2fKB", size * (1.0 / kib));
}
