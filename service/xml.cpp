#include "xml.h"
#include "base/xml_guard.h"
#include <cstring>
#include <libxml/parser.h>
#include <libxml/tree.h>

namespace {
struct FreeDoc {
    void operator()(xmlDoc *doc) const
    {
        xmlFreeDoc(doc);
    }
};
using Doc = std::unique_ptr<xmlDoc, FreeDoc>;
} // namespace

// Entities have no place in these bodies: a document type declaration is refused.
static Doc parse(const std::string &body)
{
    XmlGuard guard;
    if (!guard.feed(body.data(), body.size()))
        return nullptr;
    xmlParserCtxt *context = xmlNewParserCtxt();
    Doc doc(xmlCtxtReadMemory(context, body.data(), static_cast<int>(body.size()), nullptr, nullptr,
                              XML_PARSE_NONET | XML_PARSE_IGNORE_ENC | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
    if (!context->wellFormed || !context->nsWellFormed || (doc && doc->intSubset))
        doc.reset();
    xmlFreeParserCtxt(context);
    return doc;
}

static const char *text_of(const xmlChar *text)
{
    return text ? reinterpret_cast<const char *>(text) : "";
}

static std::string ns_of(const xmlNode *node)
{
    return node->ns ? text_of(node->ns->href) : "";
}

static bool is_dav(const xmlNode *node, const char *name)
{
    return node && node->type == XML_ELEMENT_NODE && ns_of(node) == "DAV:" && !std::strcmp(text_of(node->name), name);
}

static void read_names(xmlNode *prop, DeadProperties &properties)
{
    for (xmlNode *node = xmlFirstElementChild(prop); node; node = xmlNextElementSibling(node))
        properties.push_back({ns_of(node), text_of(node->name), ""});
}

bool read_propfind(const std::string &body, PropfindBody &propfind)
{
    propfind = {};
    if (body.empty())
        return true;
    const Doc doc = parse(body);
    xmlNode *root = doc ? xmlDocGetRootElement(doc.get()) : nullptr;
    if (!is_dav(root, "propfind"))
        return false;
    bool chosen = false;
    for (xmlNode *node = xmlFirstElementChild(root); node; node = xmlNextElementSibling(node)) {
        if (is_dav(node, "include")) {
            read_names(node, propfind.properties);
            continue;
        }
        const bool prop = is_dav(node, "prop"), names = is_dav(node, "propname"), all = is_dav(node, "allprop");
        if (!prop && !names && !all)
            continue;
        if (chosen)
            return false;
        chosen = true;
        propfind.kind = prop ? PropfindBody::NAMED : names ? PropfindBody::NAMES : PropfindBody::ALL;
        if (prop)
            read_names(node, propfind.properties);
    }
    return chosen;
}

// The element by itself, with the namespaces and the language that it has from the elements around it.
static std::string element_text(xmlNode *node)
{
    const Doc doc(xmlNewDoc(nullptr));
    xmlNode *copy = xmlDocCopyNode(node, doc.get(), 1);
    xmlDocSetRootElement(doc.get(), copy);
    if (xmlChar *language = xmlNodeGetLang(node)) {
        xmlNodeSetLang(copy, language);
        xmlFree(language);
    }
    xmlBuffer *buffer = xmlBufferCreate();
    xmlNodeDump(buffer, doc.get(), copy, 0, 0);
    const std::string text(text_of(xmlBufferContent(buffer)), static_cast<size_t>(xmlBufferLength(buffer)));
    xmlBufferFree(buffer);
    return text;
}

bool read_proppatch(const std::string &body, std::vector<PropertyUpdate> &updates)
{
    const Doc doc = parse(body);
    xmlNode *root = doc ? xmlDocGetRootElement(doc.get()) : nullptr;
    if (!is_dav(root, "propertyupdate"))
        return false;
    for (xmlNode *step = xmlFirstElementChild(root); step; step = xmlNextElementSibling(step)) {
        const bool remove = is_dav(step, "remove");
        if (!remove && !is_dav(step, "set"))
            continue;
        for (xmlNode *prop = xmlFirstElementChild(step); prop; prop = xmlNextElementSibling(prop))
            for (xmlNode *node = is_dav(prop, "prop") ? xmlFirstElementChild(prop) : nullptr; node;
                 node = xmlNextElementSibling(node))
                updates.push_back({{ns_of(node), text_of(node->name), remove ? "" : element_text(node)}, remove});
    }
    return !updates.empty();
}

bool read_lockinfo(const std::string &body, bool &exclusive, std::string &owner)
{
    const Doc doc = parse(body);
    xmlNode *root = doc ? xmlDocGetRootElement(doc.get()) : nullptr;
    bool scope = false, write = false;
    if (!is_dav(root, "lockinfo"))
        return false;
    owner.clear();
    for (xmlNode *node = xmlFirstElementChild(root); node; node = xmlNextElementSibling(node)) {
        xmlNode *inner = xmlFirstElementChild(node);
        if (is_dav(node, "lockscope")) {
            exclusive = is_dav(inner, "exclusive");
            scope = exclusive || is_dav(inner, "shared");
        } else if (is_dav(node, "locktype")) {
            write = is_dav(inner, "write");
        } else if (is_dav(node, "owner")) {
            owner = element_text(node);
        }
    }
    return scope && write;
}

void append_text(std::string &out, std::string_view text)
{
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (c == '&')
            out += "&amp;";
        else if (c == '<')
            out += "&lt;";
        else if (c == '>')
            out += "&gt;";
        else if (c == '"')
            out += "&quot;";
        else if (byte == '\t' || byte == '\n' || byte == '\r')
            out += "&#" + std::to_string(byte) + ";";
        else if (byte < ' ')
            out += "\xEF\xBF\xBD";
        else
            out += c;
    }
}

void append_empty_element(std::string &out, const DeadProperty &property)
{
    out += property.ns.empty() ? "<" + property.name : "<x:" + property.name + " xmlns:x=\"";
    if (!property.ns.empty()) {
        append_text(out, property.ns);
        out += '"';
    }
    out += "/>";
}
