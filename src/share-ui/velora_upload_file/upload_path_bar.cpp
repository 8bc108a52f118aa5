#include "velora_upload_file/upload_path_bar.h"
#include "velora_common/velora_log.h"
#include "velora_upload_file/upload_text.h"
#include <cstdlib>

static const char s_root_label[] = "Velora";
static Evas_Object *s_bar;
static Ecore_Timer *s_timer;      // of a jump that waits
static Elm_Object_Item *s_tapped; // where it goes
static void (*s_jump)(UploadViewData *vd, const char *path);

static bool __is_root(Elm_Object_Item *item)
{
    return g_strcmp0(elm_object_item_text_get(item), s_root_label) == 0;
}

static Eina_Bool __timer_toolbar_append_cb(void *)
{
    if (!s_vd) {
        VELORA_LOGE("vd is NULL");
        return ECORE_CALLBACK_CANCEL;
    }
    if (!s_timer) {
        VELORA_LOGE("vd->pathinfo_timer is NULL");
        return ECORE_CALLBACK_CANCEL;
    }
    s_timer = nullptr;
    s_jump(s_vd, __is_root(s_tapped) ? nullptr : static_cast<const char *>(elm_object_item_data_get(s_tapped)));
    return ECORE_CALLBACK_CANCEL;
}

static void __toolbar_it_cb(void *, Evas_Object *, void *event_info)
{
    if (!s_vd) {
        VELORA_LOGE("vd is NULL");
        return;
    }
    if (s_timer) {
        VELORA_LOGI("vd->pathinfo_timer is not NULL");
        return;
    }
    auto *item = static_cast<Elm_Object_Item *>(event_info);
    if (item == elm_toolbar_last_item_get(s_bar))
        return;
    s_tapped = item;
    while (Elm_Object_Item *last = elm_toolbar_last_item_get(s_bar)) {
        if (last == item)
            break;
        elm_object_item_del(last);
    }
    s_timer = ecore_timer_add(0.25, __timer_toolbar_append_cb, nullptr);
}

static void __path_item_del_cb(void *data, Evas_Object *, void *)
{
    g_free(data);
}

static void __last_item_show()
{
    if (!s_bar)
        return;
    evas_smart_objects_calculate(evas_object_evas_get(s_bar));
    elm_toolbar_item_show(elm_toolbar_last_item_get(s_bar), ELM_TOOLBAR_ITEM_SCROLLTO_LAST);
}

static void __last_item_show_cb(void *)
{
    __last_item_show();
}

// The open folder stays in sight.
static void __bar_resized_cb(void *, Evas *, Evas_Object *, void *)
{
    ecore_job_add(__last_item_show_cb, nullptr);
}

static void __append(const char *label, const char *path)
{
    char *markup = __one_line_markup(label);
    char *data = g_strdup(path);
    Elm_Object_Item *item = elm_toolbar_item_append(s_bar, nullptr, markup, __toolbar_it_cb, data);
    elm_object_item_del_cb_set(item, __path_item_del_cb);
    elm_toolbar_item_bring_in(item, ELM_TOOLBAR_ITEM_SCROLLTO_LAST);
    ecore_job_add(__last_item_show_cb, nullptr); // once more when the bar has given the new item its place
    std::free(markup);
}

void __path_bar_append(UploadViewData *, const char *path)
{
    __append(__last_segment(path), path);
}

void __path_bar_remove_last()
{
    elm_object_item_del(elm_toolbar_last_item_get(s_bar));
}

void __path_bar_create(UploadViewData *vd, void (*jump)(UploadViewData *vd, const char *path))
{
    s_jump = jump;
    s_bar = elm_toolbar_add(vd->ad->naviframe);
    elm_object_style_set(s_bar, "navigationbar");
    elm_toolbar_shrink_mode_set(s_bar, ELM_TOOLBAR_SHRINK_SCROLL);
    elm_toolbar_transverse_expanded_set(s_bar, EINA_TRUE);
    elm_toolbar_align_set(s_bar, 0.0);
    elm_toolbar_homogeneous_set(s_bar, EINA_FALSE);
    elm_toolbar_select_mode_set(s_bar, ELM_OBJECT_SELECT_MODE_NONE);
    evas_object_event_callback_add(s_bar, EVAS_CALLBACK_RESIZE, __bar_resized_cb, nullptr);
    __append(s_root_label, "/");
    elm_object_part_content_set(vd->layout, "elm.swallow.folder", s_bar);
    evas_object_resize(s_bar, 480, 51);
}

void __path_bar_delete()
{
    if (s_timer)
        ecore_timer_del(s_timer);
    s_timer = nullptr;
    if (s_bar)
        evas_object_del(s_bar);
    s_bar = nullptr;
}

bool __path_bar_exists()
{
    return s_bar;
}

bool __path_bar_is_at_root()
{
    Elm_Object_Item *last = s_bar ? elm_toolbar_last_item_get(s_bar) : nullptr;
    return !last || __is_root(last);
}

bool __path_bar_is_jumping()
{
    return s_timer;
}
