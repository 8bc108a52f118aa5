// WebDAV's answers: the same in one piece and in many. With 'n' first: names and addresses.
#include "cloud_content_sync/dav.h"
#include "cloud_content_sync/http.h"
#include "cloud_content_sync/names.h"
#include "fuzz.h"
#include <algorithm>

using namespace cloud;

static bool read(const std::string &answer, size_t piece, std::vector<DavEntry> *entries)
{
    MultistatusReader reader("/dav");
    for (size_t at = 0; at < answer.size(); at += piece)
        if (!reader.feed(answer.data() + at, std::min(piece, answer.size() - at)))
            return false;
    const bool is_whole = reader.finish();
    *entries = std::move(reader.entries);
    return is_whole;
}

static void names(const std::string &text)
{
    sha256_of(text);
    if (const auto path = path_of_href(text))
        must(path->empty() || path_of_href(percent_encode(*path)) == path);
    const std::string name = text.substr(0, text.find('/'));
    if (name.empty() || name.find('\0') != name.npos || name.size() > 255)
        return;
    const std::string next = next_free_name(name);
    must(next != name && !next.empty() && next.size() <= 255 && next.find('/') == next.npos);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size == 0)
        return 0;
    const std::string rest(reinterpret_cast<const char *>(data) + 1, size - 1);
    if (data[0] == 'n') {
        names(rest);
        return 0;
    }
    std::vector<DavEntry> whole, pieces;
    const bool is_whole = read(rest, std::max<size_t>(rest.size(), 1), &whole);
    const bool is_in_pieces = read(rest, data[0] % 16 + 1, &pieces);
    if (!is_whole || !is_in_pieces)
        return 0;
    must(whole.size() == pieces.size());
    for (size_t i = 0; i < whole.size(); i++)
        must(whole[i].path == pieces[i].path && whole[i].size == pieces[i].size && whole[i].etag == pieces[i].etag &&
             whole[i].sha256 == pieces[i].sha256 && whole[i].path.front() == '/');
    return 0;
}
