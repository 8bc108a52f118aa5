#include "cloud_content_sync/dav.h"
#include "base/xml_guard.h"
#include "cloud_content_sync/names.h"
#include <cstring>
#include <curl/curl.h>
#include <glib.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>

namespace cloud {

static constexpr size_t ANSWER_BYTES_MAX = 64u << 20;
static constexpr size_t TEXT_BYTES_MAX = 64u << 10;
static constexpr char DAV_NAMESPACE[] = "DAV:";
static constexpr char DIGEST_NAMESPACE[] = "urn:velora:dav";

#define PROPFIND_START                                                                                                 \
    "<?xml version=\"1.0\" encoding=\"utf-8\"?>\n"                                                                     \
    "<D:propfind xmlns:D=\"DAV:\" xmlns:V=\"urn:velora:dav\"><D:prop>"                                                 \
    "<D:resourcetype/><D:getcontentlength/><D:getlastmodified/><D:getetag/>"
#define PROPFIND_END "</D:prop></D:propfind>"

const char *propfind_body(bool with_digest)
{
    return with_digest ? PROPFIND_START "<V:sha256/>" PROPFIND_END : PROPFIND_START PROPFIND_END;
}

struct MultistatusReader::State {
    State(std::string root_path, std::vector<DavEntry> &found) : root(std::move(root_path)), entries(found) {}

    struct Close {
        void operator()(xmlParserCtxt *context) const
        {
            if (context->myDoc)
                xmlFreeDoc(context->myDoc);
            xmlFreeParserCtxt(context);
        }
    };
    std::unique_ptr<xmlParserCtxt, Close> parser;
    XmlGuard guard;
    std::string root;
    std::vector<DavEntry> &entries;
    size_t received = 0;
    bool refused = false;
    bool is_multistatus = false;
    bool in_propstat = false;
    bool has_href = false;
    DavEntry entry;    // of the open response
    DavEntry propstat; // of the open propstat; counts only when its status is 200
    std::string href, status, text;

    void refuse()
    {
        refused = true;
        xmlStopParser(parser.get());
    }

    void start(const char *name, const char *uri);
    void end(const char *name, const char *uri);
    void close_propstat();
    void close_response();
};

static bool is(const char *name, const char *uri, const char *wanted)
{
    return uri && std::strcmp(uri, DAV_NAMESPACE) == 0 && std::strcmp(name, wanted) == 0;
}

static std::string trimmed(const std::string &text)
{
    static constexpr char SPACES[] = " \t\r\n";
    const size_t first = text.find_first_not_of(SPACES);
    return first == text.npos ? "" : text.substr(first, text.find_last_not_of(SPACES) - first + 1);
}

// -1 for what is no number of bytes.
static long long number_of(const std::string &text)
{
    guint64 number = 0;
    const bool is_number = g_ascii_string_to_unsigned(trimmed(text).c_str(), 10, 0, G_MAXINT64, &number, nullptr);
    return is_number ? static_cast<long long>(number) : -1;
}

void MultistatusReader::State::start(const char *name, const char *uri)
{
    text.clear();
    if (is(name, uri, "multistatus")) {
        is_multistatus = true;
    } else if (is(name, uri, "response")) {
        entry = {};
        href.clear();
        has_href = false;
    } else if (is(name, uri, "propstat")) {
        propstat = {};
        status.clear();
        in_propstat = true;
    } else if (in_propstat && is(name, uri, "collection")) {
        propstat.is_folder = true;
    }
}

void MultistatusReader::State::end(const char *name, const char *uri)
{
    if (is(name, uri, "response")) {
        close_response();
    } else if (is(name, uri, "propstat")) {
        close_propstat();
    } else if (is(name, uri, "href") && !in_propstat && !has_href) {
        href = trimmed(text);
        has_href = true;
    } else if (is(name, uri, "status") && in_propstat) {
        status = trimmed(text);
    } else if (is(name, uri, "getcontentlength")) {
        propstat.size = number_of(text);
    } else if (is(name, uri, "quota-used-bytes")) {
        propstat.quota_used = number_of(text);
    } else if (is(name, uri, "quota-available-bytes")) {
        propstat.quota_left = number_of(text);
    } else if (is(name, uri, "getlastmodified")) {
        const time_t time = curl_getdate(trimmed(text).c_str(), nullptr);
        propstat.mtime = time < 0 ? 0 : time;
    } else if (is(name, uri, "getetag")) {
        propstat.etag = trimmed(text);
    } else if (uri && std::strcmp(uri, DIGEST_NAMESPACE) == 0 && std::strcmp(name, "sha256") == 0) {
        g_autofree char *lower = g_ascii_strdown(trimmed(text).c_str(), -1);
        propstat.sha256 = lower;
    }
    text.clear();
}

void MultistatusReader::State::close_propstat()
{
    in_propstat = false;
    // "HTTP/1.1 200 OK"
    const size_t space = status.find(' ');
    if (space == status.npos || status.compare(space + 1, 3, "200") != 0)
        return;
    entry.is_folder |= propstat.is_folder;
    if (propstat.size >= 0)
        entry.size = propstat.size;
    if (propstat.quota_used >= 0)
        entry.quota_used = propstat.quota_used;
    if (propstat.quota_left >= 0)
        entry.quota_left = propstat.quota_left;
    if (propstat.mtime)
        entry.mtime = propstat.mtime;
    if (!propstat.etag.empty())
        entry.etag = propstat.etag;
    if (!propstat.sha256.empty())
        entry.sha256 = propstat.sha256;
}

void MultistatusReader::State::close_response()
{
    const auto path = path_of_href(href);
    if (!path)
        return;
    const bool at_top = root == "/";
    if (!at_top && path->compare(0, root.size(), root) != 0)
        return;
    entry.path = at_top ? *path : path->substr(root.size());
    if (entry.path.empty())
        entry.path = "/";
    if (entry.path.front() == '/')
        entries.push_back(std::move(entry));
    entry = {};
}

static MultistatusReader::State *state_of(void *data)
{
    return static_cast<MultistatusReader::State *>(data);
}

// libxml2 calls back with plain functions; the reader's state travels as the parser's user data.
struct Sax {
    static void start(void *data, const xmlChar *name, const xmlChar *, const xmlChar *uri, int, const xmlChar **, int,
                      int, const xmlChar **)
    {
        state_of(data)->start(reinterpret_cast<const char *>(name), reinterpret_cast<const char *>(uri));
    }
    static void end(void *data, const xmlChar *name, const xmlChar *, const xmlChar *uri)
    {
        state_of(data)->end(reinterpret_cast<const char *>(name), reinterpret_cast<const char *>(uri));
    }
    static void characters(void *data, const xmlChar *text, int size)
    {
        auto *state = state_of(data);
        state->text.append(reinterpret_cast<const char *>(text), static_cast<size_t>(size));
        if (state->text.size() > TEXT_BYTES_MAX)
            state->refuse();
    }
    static void doctype(void *data, const xmlChar *, const xmlChar *, const xmlChar *)
    {
        state_of(data)->refuse();
    }
    static void quiet(void *, xmlErrorPtr) {}
};

MultistatusReader::MultistatusReader(std::string root) : state(std::make_unique<State>(std::move(root), entries))
{
    xmlSAXHandler handler = {};
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = Sax::start;
    handler.endElementNs = Sax::end;
    handler.characters = Sax::characters;
    handler.cdataBlock = Sax::characters;
    handler.internalSubset = Sax::doctype;
    handler.serror = Sax::quiet;
    static const bool initialised = (xmlInitParser(), true);
    (void)initialised;
    state->parser.reset(xmlCreatePushParserCtxt(&handler, state.get(), nullptr, 0, nullptr));
    if (!state->parser)
        abort();
    xmlCtxtUseOptions(state->parser.get(), XML_PARSE_NONET | XML_PARSE_IGNORE_ENC);
}

MultistatusReader::~MultistatusReader() = default;

bool MultistatusReader::feed(const char *data, size_t size)
{
    state->received += size;
    if (state->received > ANSWER_BYTES_MAX || !state->guard.feed(data, size))
        state->refused = true;
    if (!state->refused && xmlParseChunk(state->parser.get(), data, static_cast<int>(size), 0) != XML_ERR_OK)
        state->refused = true;
    return !state->refused;
}

bool MultistatusReader::finish()
{
    if (!state->refused && xmlParseChunk(state->parser.get(), nullptr, 0, 1) != XML_ERR_OK)
        state->refused = true;
    return !state->refused && state->parser->wellFormed && state->is_multistatus;
}

} // namespace cloud
