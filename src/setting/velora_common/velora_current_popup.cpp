#include "velora_common/velora_current_popup.h"
#include <cstring>
#include <utility>

static void __popup_deleted_cb(void *data, Evas *, Evas_Object *obj, void *)
{
    auto *ad = static_cast<AppData *>(data);
    if (ad->popup != obj)
        return;
    ad->popup = nullptr;
    ad->popup_owner = {};
    ad->popup_replaced = nullptr;
}

static void __back_ignored_cb(void *, Evas_Object *, void *) {}

void _velora_popup_show(AppData *ad, PopupOwner owner, Evas_Object *popup, void (*replaced)(void *data), void *data)
{
    if (!popup)
        return;
    if (Evas_Object *former = std::exchange(ad->popup, nullptr)) {
        auto *const tell = std::exchange(ad->popup_replaced, nullptr);
        void *const told = ad->popup_replaced_data;
        evas_object_del(former);
        if (tell)
            tell(told);
    }
    ad->popup = popup;
    ad->popup_owner = owner;
    ad->popup_replaced = replaced;
    ad->popup_replaced_data = data;
    evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, __popup_deleted_cb, ad);
    ea_object_event_callback_add(popup, EA_CALLBACK_BACK, __back_ignored_cb, nullptr);
}

bool _velora_popup_is_shown(const AppData *ad, PopupOwner owner)
{
    return ad->popup && ad->popup_owner.page == owner.page &&
           (!*owner.topic || std::strcmp(ad->popup_owner.topic, owner.topic) == 0);
}

bool _velora_popup_take_away(AppData *ad, PopupOwner owner)
{
    if (!_velora_popup_is_shown(ad, owner))
        return false;
    evas_object_del(ad->popup);
    return true;
}
