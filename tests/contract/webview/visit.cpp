#include "visit.h"
#include <gtest/gtest.h>

namespace {
constexpr char callback[] = "https://callback.invalid/";
constexpr const char *errors[] = {"network", "certificate", "refused", "other"};

std::string menu_trimmed(Ewk_Context_Menu *menu)
{
    for (unsigned int i = 0; i < ewk_context_menu_item_count(menu);) {
        Ewk_Context_Menu_Item *item = ewk_context_menu_nth_item_get(menu, i);
        const int tag = ewk_context_menu_item_tag_get(item);
        if (tag == 85 || (tag >= 1 && tag <= 3))
            ewk_context_menu_item_remove(menu, item);
        else
            i++;
    }
    std::string left;
    for (unsigned int i = 0; i < ewk_context_menu_item_count(menu); i++)
        left += ":" + std::to_string(ewk_context_menu_item_tag_get(ewk_context_menu_nth_item_get(menu, i)));
    EXPECT_EQ(ewk_context_menu_nth_item_get(menu, 99), nullptr);
    return left;
}

template <int Event> void happened(void *data, Evas_Object *obj, void *info)
{
    static constexpr const char *words[] = {"decide", "started", "finished", "error", "crashed", "window", "menu"};
    auto &visit = *static_cast<Visit *>(data);
    std::string word = words[Event];
    if (Event == 0) {
        auto *decision = static_cast<Ewk_Policy_Decision *>(info);
        if (std::string(ewk_policy_decision_url_get(decision)).starts_with(callback))
            ewk_policy_decision_ignore(decision);
    } else if (Event == 3) {
        word += std::string(":") + errors[static_cast<const Ewk_Error *>(info)->type];
    } else if (Event == 6) {
        word += menu_trimmed(static_cast<Ewk_Context_Menu *>(info));
    }
    visit.said += (visit.said.empty() ? "" : " ") + word;
    if (visit.delete_at == words[Event]) {
        visit.view = nullptr;
        evas_object_del(obj);
    }
}
} // namespace

Visit::Visit(const std::string &base, const std::string &ca_file)
{
    window = elm_win_add(nullptr, "visit", ELM_WIN_BASIC);
    evas_object_resize(window, 480, 600);
    evas_object_show(window);
    view = ewk_view_add(window);
    if (!view)
        return;
    constexpr std::pair<const char *, Evas_Smart_Cb> events[] = {{"policy,navigation,decide", happened<0>},
                                                                 {"load,started", happened<1>},
                                                                 {"load,finished", happened<2>},
                                                                 {"load,error", happened<3>},
                                                                 {"webprocess,crashed", happened<4>},
                                                                 {"create,window", happened<5>},
                                                                 {"contextmenu,customize", happened<6>}};
    for (const auto &[name, function] : events)
        evas_object_smart_callback_add(view, name, function, this);
    ewk_view_base_set(view, base.c_str(), ca_file.c_str());
    evas_object_geometry_set(view, 0, 0, 480, 600);
    evas_object_show(view);
    elm_object_focus_set(view, EINA_TRUE);
}

Visit::~Visit()
{
    evas_object_del(window);
    driver::settle();
}

bool Visit::says(const std::string &words, double seconds)
{
    const bool is_said = driver::run_until([&] { return said.size() >= words.size(); }, seconds) && said == words;
    EXPECT_EQ(said, words);
    said.clear();
    return is_said;
}

bool Visit::load(const std::string &address, const std::string &words, double seconds)
{
    ewk_view_url_set(view, address.c_str());
    return says(words, seconds);
}
