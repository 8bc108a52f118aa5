#include "fake_ewk.h"
#include <Elementary.h>
#include <algorithm>
struct Ewk_Policy_Decision { std::string url; bool ignored = false; };
struct Ewk_Context_Menu_Item { int tag; };
struct Ewk_Context_Menu { std::vector<Ewk_Context_Menu_Item*> items; };
static struct State { Evas_Object *view=nullptr; std::string url, base; int cookies=0, views=0; bool hold=false, fail=false, loading=false; } st;
void fake_ewk_reset(){ st.url.clear(); st.cookies=0; st.hold=st.fail=false; }
int fake_ewk_views(){return st.views;}
std::string fake_ewk_url(){return st.url;}
int fake_ewk_cookies_cleared(){return st.cookies;}
void fake_ewk_hold(bool h){st.hold=h;}
void fake_ewk_fail_add(){st.fail=true;}
void fake_ewk_finish(){ if(st.view&&st.loading){st.loading=false;evas_object_smart_callback_call(st.view,"load,finished",nullptr);} }
void fake_ewk_start(const std::string&url){ fake_ewk_finish(); Ewk_Policy_Decision d{url}; evas_object_smart_callback_call(st.view,"policy,navigation,decide",&d); if(d.ignored||!st.view)return; st.url=url; st.loading=true; evas_object_smart_callback_call(st.view,"load,started",nullptr);}
bool fake_ewk_navigate(const std::string&url){ if(!st.view) return false; fake_ewk_start(url); if(!st.hold) fake_ewk_finish(); return true; }
void fake_ewk_crash(){evas_object_smart_callback_call(st.view,"webprocess,crashed",nullptr);}
void fake_ewk_error(Ewk_Error_Type t){ Ewk_Error e{t,st.url.c_str(),"asked for"}; evas_object_smart_callback_call(st.view,"load,error",&e); st.loading=true; fake_ewk_finish(); }
void fake_ewk_open_window(const std::string&u){evas_object_smart_callback_call(st.view,"create,window",const_cast<char*>(u.c_str()));}
std::vector<int> fake_ewk_context_menu(std::vector<int> tags){ Ewk_Context_Menu m; for(int t:tags)m.items.push_back(new Ewk_Context_Menu_Item{t}); evas_object_smart_callback_call(st.view,"contextmenu,customize",&m); std::vector<int> r; for(auto*i:m.items){r.push_back(i->tag);delete i;} return r;}
Evas_Object*ewk_view_add(Evas_Object*p){ if(st.fail)return nullptr; Evas_Object*o=elm_button_add(p); st.view=o; st.views++; evas_object_event_callback_add(o,EVAS_CALLBACK_DEL,[](void*,Evas*,Evas_Object*d,void*){st.views--; if(st.view==d)st.view=nullptr;},nullptr); return o;}
void ewk_prepare(){}
void ewk_view_base_set(Evas_Object*,const char*b,const char*){st.base=b;}
void ewk_view_patience_set(Evas_Object*,double){}
void ewk_view_url_set(Evas_Object*v,const char*u){ std::string url=u; static std::string pending; pending=url; (void)v; ecore_job_add([](void*){ if(st.view) fake_ewk_navigate(pending);},nullptr);}
const char*ewk_view_url_get(const Evas_Object*){return st.url.c_str();}
void ewk_view_stop(Evas_Object*){ fake_ewk_finish(); }
void ewk_view_text_zoom_set(Evas_Object*,double){}
void ewk_view_dark_set(Evas_Object*,bool){}
Ewk_Context*ewk_view_context_get(const Evas_Object*){return reinterpret_cast<Ewk_Context*>(&st);}
Ewk_Cookie_Manager*ewk_context_cookie_manager_get(const Ewk_Context*c){return reinterpret_cast<Ewk_Cookie_Manager*>(const_cast<Ewk_Context*>(c));}
void ewk_cookie_manager_cookies_clear(Ewk_Cookie_Manager*){st.cookies++;}
const char*ewk_policy_decision_url_get(const Ewk_Policy_Decision*d){return d->url.c_str();}
void ewk_policy_decision_ignore(Ewk_Policy_Decision*d){d->ignored=true;}
void ewk_policy_decision_use(Ewk_Policy_Decision*){}
unsigned int ewk_context_menu_item_count(const Ewk_Context_Menu*m){return (unsigned)m->items.size();}
Ewk_Context_Menu_Item*ewk_context_menu_nth_item_get(const Ewk_Context_Menu*m,unsigned n){return n<m->items.size()?m->items[n]:nullptr;}
Ewk_Context_Menu_Item_Tag ewk_context_menu_item_tag_get(const Ewk_Context_Menu_Item*i){return (Ewk_Context_Menu_Item_Tag)i->tag;}
void ewk_context_menu_item_remove(Ewk_Context_Menu*m,Ewk_Context_Menu_Item*i){std::erase(m->items,i);delete i;}
