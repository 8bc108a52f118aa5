#include "app/request.h"
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <unordered_map>

namespace {
constexpr struct {
    const char *name;
    std::optional<std::string> app_control_s::*field;
} text_fields[] = {
    {"operation", &app_control_s::operation},
    {"uri", &app_control_s::uri},
    {"mime", &app_control_s::mime},
    {"app-id", &app_control_s::app_id},
};

char *copy_out(const std::string &text)
{
    return strdup(text.c_str());
}

int set_text(app_control_h request, std::optional<std::string> app_control_s::*field, const char *value)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    if (value)
        request->*field = value;
    else
        (request->*field).reset();
    return APP_CONTROL_ERROR_NONE;
}

int get_text(app_control_h request, std::optional<std::string> app_control_s::*field, char **value)
{
    if (!request || !value)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *value = request->*field ? copy_out(*(request->*field)) : nullptr;
    return APP_CONTROL_ERROR_NONE;
}
} // namespace

Answer::Answer(Send to) : send(std::move(to)) {}

Answer::~Answer()
{
    give(nullptr, APP_CONTROL_RESULT_CANCELED);
}

bool Answer::give(const app_control_s *reply, app_control_result_e result)
{
    const Send once = std::exchange(send, nullptr);
    if (!once)
        return false;
    once(reply, result);
    return true;
}

const Extra *app_control_s::find(const std::string &key) const
{
    const auto found = std::ranges::find(extra, key, &Extra::key);
    return found == extra.end() ? nullptr : &*found;
}

void app_control_s::set(const std::string &key, bool array, std::vector<std::string> values)
{
    const auto found = std::ranges::find(extra, key, &Extra::key);
    if (found == extra.end())
        extra.push_back({key, array, std::move(values)});
    else
        *found = {key, array, std::move(values)};
}

GVariant *request_to_variant(const app_control_s &request)
{
    GVariantBuilder dictionary;
    g_variant_builder_init(&dictionary, G_VARIANT_TYPE_VARDICT);
    for (const auto &[name, field] : text_fields)
        if (const auto &text = request.*field)
            g_variant_builder_add(&dictionary, "{sv}", name, g_variant_new_bytestring(text->c_str()));
    if (request.window)
        g_variant_builder_add(&dictionary, "{sv}", "window", g_variant_new_uint32(request.window));
    if (!request.extra.empty()) {
        GVariantBuilder extra;
        g_variant_builder_init(&extra, G_VARIANT_TYPE("a(aybaay)"));
        for (const Extra &entry : request.extra) {
            GVariantBuilder values;
            g_variant_builder_init(&values, G_VARIANT_TYPE_BYTESTRING_ARRAY);
            for (const std::string &value : entry.values)
                g_variant_builder_add_value(&values, g_variant_new_bytestring(value.c_str()));
            g_variant_builder_add(&extra, "(^aybaay)", entry.key.c_str(), entry.array, &values);
        }
        g_variant_builder_add(&dictionary, "{sv}", "extra", g_variant_builder_end(&extra));
    }
    return g_variant_builder_end(&dictionary);
}

namespace {
// Values are taken child by child: whoever asks GLib for a part by a format or a key gets all of it made one block
// first, and in a block it finds the n-th text by looking at all before it.
struct VariantUnref {
    void operator()(GVariant *variant) const
    {
        g_variant_unref(variant);
    }
};
using Variant = std::unique_ptr<GVariant, VariantUnref>;

Variant child(const Variant &parent, gsize index)
{
    return Variant(g_variant_get_child_value(parent.get(), index));
}

void extra_from_variant(const Variant &entries, app_control_s &request)
{
    std::unordered_map<std::string, size_t> places; // a sender may give any number of keys
    const gsize count = g_variant_n_children(entries.get());
    for (gsize i = 0; i < count; i++) {
        const Variant entry = child(entries, i), texts = child(entry, 2);
        Extra extra{
            g_variant_get_bytestring(child(entry, 0).get()), g_variant_get_boolean(child(entry, 1).get()) != 0, {}};
        const gsize length = g_variant_n_children(texts.get());
        if (!extra.array && length != 1)
            continue;
        extra.values.reserve(length);
        for (gsize at = 0; at < length; at++)
            extra.values.emplace_back(g_variant_get_bytestring(child(texts, at).get()));
        const auto [place, is_new] = places.emplace(extra.key, request.extra.size());
        if (is_new)
            request.extra.push_back(std::move(extra));
        else
            request.extra[place->second] = std::move(extra);
    }
}
} // namespace

void request_from_variant(GVariant *dictionary, app_control_s &request)
{
    const Variant whole(g_variant_ref(dictionary));
    const gsize count = g_variant_n_children(dictionary);
    for (gsize i = 0; i < count; i++) {
        const Variant pair = child(whole, i), name = child(pair, 0);
        const Variant value(g_variant_get_variant(child(pair, 1).get()));
        const std::string key = g_variant_get_string(name.get(), nullptr);
        for (const auto &[text_name, field] : text_fields)
            if (key == text_name && g_variant_is_of_type(value.get(), G_VARIANT_TYPE_BYTESTRING))
                request.*field = g_variant_get_bytestring(value.get());
        if (key == "window" && g_variant_is_of_type(value.get(), G_VARIANT_TYPE_UINT32))
            request.window = g_variant_get_uint32(value.get());
        if (key == "extra" && g_variant_is_of_type(value.get(), G_VARIANT_TYPE("a(aybaay)")))
            extra_from_variant(value, request);
    }
}

int app_control_create(app_control_h *request)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *request = new app_control_s;
    return APP_CONTROL_ERROR_NONE;
}

int app_control_destroy(app_control_h request)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    delete request;
    return APP_CONTROL_ERROR_NONE;
}

int app_control_clone(app_control_h *clone, app_control_h request)
{
    if (!clone || !request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *clone = new app_control_s(*request);
    return APP_CONTROL_ERROR_NONE;
}

int app_control_set_operation(app_control_h request, const char *operation)
{
    return set_text(request, &app_control_s::operation, operation);
}

int app_control_get_operation(app_control_h request, char **operation)
{
    return get_text(request, &app_control_s::operation, operation);
}

int app_control_set_uri(app_control_h request, const char *uri)
{
    return set_text(request, &app_control_s::uri, uri);
}

int app_control_get_uri(app_control_h request, char **uri)
{
    return get_text(request, &app_control_s::uri, uri);
}

int app_control_set_mime(app_control_h request, const char *mime)
{
    return set_text(request, &app_control_s::mime, mime);
}

int app_control_get_mime(app_control_h request, char **mime)
{
    return get_text(request, &app_control_s::mime, mime);
}

int app_control_set_app_id(app_control_h request, const char *app_id)
{
    return set_text(request, &app_control_s::app_id, app_id);
}

int app_control_get_app_id(app_control_h request, char **app_id)
{
    return get_text(request, &app_control_s::app_id, app_id);
}

int app_control_set_window(app_control_h request, unsigned int xwin)
{
    if (!request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    request->window = xwin;
    return APP_CONTROL_ERROR_NONE;
}

int app_control_get_window(app_control_h request, unsigned int *xwin)
{
    if (!request || !xwin)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *xwin = request->window;
    return APP_CONTROL_ERROR_NONE;
}

int app_control_add_extra_data(app_control_h request, const char *key, const char *value)
{
    if (!request || !key || !value)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    request->set(key, false, {value});
    return APP_CONTROL_ERROR_NONE;
}

int app_control_get_extra_data(app_control_h request, const char *key, char **value)
{
    if (!request || !key || !value)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *value = nullptr;
    const Extra *entry = request->find(key);
    if (!entry)
        return APP_CONTROL_ERROR_KEY_NOT_FOUND;
    if (entry->array)
        return APP_CONTROL_ERROR_INVALID_DATA_TYPE;
    *value = copy_out(entry->values.front());
    return APP_CONTROL_ERROR_NONE;
}

int app_control_add_extra_data_array(app_control_h request, const char *key, const char *values[], int length)
{
    if (!request || !key || length < 0 || (!values && length))
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    std::vector<std::string> texts;
    for (int i = 0; i < length; i++)
        if (values[i])
            texts.emplace_back(values[i]);
    request->set(key, true, std::move(texts));
    return APP_CONTROL_ERROR_NONE;
}

int app_control_get_extra_data_array(app_control_h request, const char *key, char ***values, int *length)
{
    if (!request || !key || !values || !length)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *values = nullptr;
    *length = 0;
    const Extra *entry = request->find(key);
    if (!entry)
        return APP_CONTROL_ERROR_KEY_NOT_FOUND;
    if (!entry->array)
        return APP_CONTROL_ERROR_INVALID_DATA_TYPE;
    *values = static_cast<char **>(std::calloc(entry->values.size() + 1, sizeof(char *)));
    for (const std::string &value : entry->values)
        (*values)[(*length)++] = copy_out(value);
    return APP_CONTROL_ERROR_NONE;
}

int app_control_foreach_extra_data(app_control_h request, app_control_extra_data_cb callback, void *user_data)
{
    if (!request || !callback)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    std::vector<std::string> keys;
    for (const Extra &entry : request->extra)
        keys.push_back(entry.key);
    for (const std::string &key : keys)
        if (!callback(request, key.c_str(), user_data))
            break;
    return APP_CONTROL_ERROR_NONE;
}

int app_control_to_bundle(app_control_h request, bundle **out)
{
    if (!request || !out)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    const auto variant = g_variant_ref_sink(request_to_variant(*request));
    char *text = g_variant_print(variant, TRUE);
    request->text.text = text;
    g_free(text);
    g_variant_unref(variant);
    *out = &request->text;
    return APP_CONTROL_ERROR_NONE;
}

int app_control_from_bundle(const bundle *data, app_control_h *request)
{
    if (!data || !request)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *request = nullptr;
    GVariant *variant = g_variant_parse(G_VARIANT_TYPE_VARDICT, data->text.c_str(), nullptr, nullptr, nullptr);
    if (!variant)
        return APP_CONTROL_ERROR_INVALID_PARAMETER;
    *request = new app_control_s;
    request_from_variant(variant, **request);
    g_variant_unref(variant);
    return APP_CONTROL_ERROR_NONE;
}
