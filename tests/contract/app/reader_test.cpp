// Whether a screen reader is on, and the end of what it reads.
#include "../platform/bus.h"
#include "assist/assist.h"
#include "driver.h"
#include <gtest/gtest.h>

namespace {
constexpr char status[] = "<node><interface name='org.a11y.Status'/><interface name='org.a11y.Bus'>"
                          "<method name='GetAddress'><arg type='s' direction='out'/></method></interface></node>";

GVariant *changed(bool on)
{
    return g_variant_new_parsed("('org.a11y.Status', {'ScreenReaderEnabled': <%b>}, @as [])", on);
}

TEST(Reader, IsKnownAndReadsToTheEnd)
{
    // Its end would wait for the connection that the library keeps; it goes with the program.
    static const PrivateBus &bus = *new PrivateBus("DBUS_SESSION_BUS_ADDRESS");
    Program desktop(bus, "org.a11y.Bus", "/org/a11y/bus", status,
                    [](const std::string &, GVariant *) { return std::string("('',)"); });
    driver::start();
    Evas_Object *window = elm_win_util_standard_add("reader", "reader");
    evas_object_show(window);
    ea_screen_reader_support_set(window, false);
    ea_screen_reader_support_set(window, true);
    EXPECT_FALSE(ea_screen_reader_is_on());
    for (const bool on : {true, false, true}) {
        desktop.emit("org.freedesktop.DBus.Properties", "PropertiesChanged", changed(on));
        EXPECT_TRUE(driver::run_until([on] { return ea_screen_reader_is_on() == on; })) << on;
    }

    static int ends = 0;
    const auto popup_add = [window] {
        Evas_Object *popup = elm_popup_add(window);
        evas_object_smart_callback_add(
            popup, "access,read,stop",
            [](void *, Evas_Object *obj, void *) {
                ends++;
                evas_object_del(obj); // as a notice does
            },
            nullptr);
        evas_object_show(popup);
        ea_screen_reader_read(popup, "Wi-Fi connection required.");
        return popup;
    };
    evas_object_del(popup_add());
    Evas_Object *popup = popup_add();
    ea_screen_reader_read(popup, "Wi-Fi connection required. Try again."); // in place of the first
    const double begin = ecore_time_get();
    EXPECT_TRUE(driver::run_until([] { return ends > 0; }, 10));
    EXPECT_GE(ecore_time_get() - begin, 5.9);
    driver::settle();
    EXPECT_EQ(ends, 1);
    evas_object_del(window);
    driver::settle();
}
} // namespace
