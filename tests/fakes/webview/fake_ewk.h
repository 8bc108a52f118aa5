#pragma once
#include "webview/ewk.h"
#include <string>
#include <vector>
void fake_ewk_reset();
int fake_ewk_views();
std::string fake_ewk_url();
int fake_ewk_cookies_cleared();
bool fake_ewk_navigate(const std::string &url);
void fake_ewk_start(const std::string &url); // decide + load,started only
void fake_ewk_finish();
void fake_ewk_hold(bool hold); // url_set and navigate start but don't finish
void fake_ewk_crash();
void fake_ewk_error(Ewk_Error_Type type);
void fake_ewk_open_window(const std::string &url);
std::vector<int> fake_ewk_context_menu(std::vector<int> tags);
void fake_ewk_fail_add();
