#include "velora_upload_file/upload_listed.h"
#include "velora_common/velora_genlist.h"
#include "velora_upload_file/upload_text.h"
#include "velora_upload_file/upload_worker.h"
#include <algorithm>
#include <utility>

// The uploads that the list stands for.
struct Listed {
    RunHold run;                       // they are a run's
    std::vector<UploadItemHold> items; // or an earlier result's
    int type = ITEM_TYPE_UPLOADED;     // the latter's
    Evas_Smart_Cb tapped = nullptr;
    size_t next = 0;  // the first one that has not been given a row
    int appended = 0; // rows that were made
    int gone = 0;     // how many of those were taken out
    int seen = 0;     // how many of those were in sight or went
    Ecore_Timer *more = nullptr;

    size_t total() const
    {
        return run ? run->files.size() : items.size();
    }
    UploadItem *item(size_t nth) const
    {
        return run ? run->files[nth].item.get() : items[nth].get();
    }
};
static Listed s_listed;

// Of one without a row; ITEM_TYPE_CONTENT: it is to have none.
static int __type_of(size_t nth)
{
    const UploadItem *item = s_listed.item(nth);
    if (!s_listed.run && item->index < 0) // nobody has tried it again
        return s_listed.type;
    switch (item->state) {
    case UPLOAD_STATE_CANCELED:
        return ITEM_TYPE_CONTENT;
    case UPLOAD_STATE_DONE:
        return ITEM_TYPE_UPLOADED;
    case UPLOAD_STATE_FAILED:
        return ITEM_TYPE_FAILED;
    default:
        return ITEM_TYPE_UPLOADING;
    }
}

static void __upload_row_append(UploadViewData *vd, size_t nth, int type)
{
    UploadItem *item = s_listed.item(nth);
    auto *record = new ItemData;
    record->name = s_listed.run ? __landed_name(s_listed.run->files[nth]) : __last_segment(item->path);
    record->type = type;
    record->item.reset(_velora_upload_item_ref(item));
    record->place = s_listed.appended++;
    Elm_Genlist_Item_Class *const classes[] = {nullptr, vd->itc_uploading, vd->itc_file, vd->itc_fail};
    __row_append(vd, classes[type], record, s_listed.tapped);
    __row_tappable_set(record->gen_it, __is_tappable(vd, type));
}

// The list's bar is to tell how long it is with the rows that are not there yet.
static void __bar_update(UploadViewData *vd)
{
    const auto missing = static_cast<double>(s_listed.total() - s_listed.next);
    const double rows = s_listed.appended - s_listed.gone;
    edje_object_part_drag_value_set(elm_layout_edje_get(vd->genlist), "more_vbar", 0,
                                    missing > 0 ? missing / (missing + rows) : 0);
}

static constexpr int first_slice = 4, slice = 2; // rows made at once: the list needs milliseconds to measure each

// Makes some rows more. False when there are enough: more than any window shows beyond what has been seen.
static bool __rows_make(UploadViewData *vd, int count)
{
    constexpr int ahead = 100;
    for (; s_listed.next < s_listed.total() && s_listed.appended < s_listed.seen + ahead; s_listed.next++) {
        const int type = __type_of(s_listed.next);
        if (type == ITEM_TYPE_CONTENT)
            continue;
        if (count-- == 0)
            return true;
        __upload_row_append(vd, s_listed.next, type);
    }
    return false;
}

static Eina_Bool __more_rows_cb(void *data)
{
    auto *vd = static_cast<UploadViewData *>(data);
    const bool is_more = __rows_make(vd, slice);
    __bar_update(vd);
    if (is_more)
        return ECORE_CALLBACK_RENEW;
    s_listed.more = nullptr;
    return ECORE_CALLBACK_CANCEL;
}

static void __more_rows(UploadViewData *vd)
{
    if (!s_listed.more && s_listed.next < s_listed.total())
        s_listed.more = ecore_timer_add(0, __more_rows_cb, vd);
}

static void __row_seen(int seen)
{
    s_listed.seen = std::max(s_listed.seen, seen);
    if (s_vd)
        __more_rows(s_vd);
}

static void __row_realized_cb(void *, Evas_Object *, void *event_info)
{
    ItemData *record = __row_record(static_cast<Elm_Object_Item *>(event_info));
    if (!record->item)
        return;
    record->is_realized = true;
    __row_seen(record->place + 1);
}

static void __row_unrealized_cb(void *, Evas_Object *, void *event_info)
{
    __row_record(static_cast<Elm_Object_Item *>(event_info))->is_realized = false;
}

// A row that is taken out makes room for another.
static void __row_gone(const ItemData *)
{
    s_listed.gone++;
    __row_seen(s_listed.seen + 1);
}

static void __listed_begin(UploadViewData *vd, Listed listed)
{
    s_listed = std::move(listed);
    if (__rows_make(vd, first_slice))
        __more_rows(vd);
    __bar_update(vd);
}

void __listed_show_run(UploadViewData *vd, RunHold run, Evas_Smart_Cb tapped)
{
    __listed_begin(vd, {.run = std::move(run), .tapped = tapped});
}

void __listed_show_items(UploadViewData *vd, std::vector<UploadItemHold> items, int type, Evas_Smart_Cb tapped)
{
    __listed_begin(vd, {.items = std::move(items), .type = type, .tapped = tapped});
}

std::vector<UploadItem *> __listed(const UploadViewData *vd, int type)
{
    std::vector<UploadItem *> all;
    for (Elm_Object_Item *row = elm_genlist_first_item_get(vd->genlist); row; row = elm_genlist_item_next_get(row))
        if (const ItemData *record = __row_record(row); record->item && record->type == type)
            all.push_back(record->item.get());
    for (size_t nth = s_listed.next; nth < s_listed.total(); nth++)
        if (__type_of(nth) == type)
            all.push_back(s_listed.item(nth));
    return all;
}

bool __listed_is_empty(const UploadViewData *vd)
{
    if (elm_genlist_first_item_get(vd->genlist))
        return false;
    for (size_t nth = s_listed.next; nth < s_listed.total(); nth++)
        if (__type_of(nth) != ITEM_TYPE_CONTENT)
            return false;
    return true;
}

void __listed_watch(Evas_Object *genlist)
{
    evas_object_smart_callback_add(genlist, "realized", __row_realized_cb, nullptr);
    evas_object_smart_callback_add(genlist, "unrealized", __row_unrealized_cb, nullptr);
    __row_gone_cb_set(__row_gone);
}

void __listed_forget()
{
    if (s_listed.more)
        ecore_timer_del(s_listed.more);
    s_listed = {};
}

void __listed_clear(UploadViewData *vd)
{
    __listed_forget();
    __bar_update(vd);
    remove_genlist_item(vd->genlist);
}
