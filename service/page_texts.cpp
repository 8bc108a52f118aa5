#include "page_texts.h"
#include <algorithm>
#include <cstdlib>
#include <glib.h>
#include <iterator>

static const size_t LANGUAGES = 6;

static constexpr const char *TEXTS[][LANGUAGES] = {
    {"Sign in", "Anmelden", "Se connecter", "Iniciar sesión", "로그인", "登录"},
    {"Sign in to connect “%1” to your account.", "Melden Sie sich an, um „%1“ mit Ihrem Konto zu verbinden.",
     "Connectez-vous pour associer « %1 » à votre compte.", "Inicie sesión para conectar «%1» a su cuenta.",
     "로그인하면 ‘%1’ 기기가 계정에 연결됩니다.", "登录后即可将“%1”连接到您的账户。"},
    {"Sign in to connect your device to your account.",
     "Melden Sie sich an, um Ihr Gerät mit Ihrem Konto zu verbinden.",
     "Connectez-vous pour associer votre appareil à votre compte.",
     "Inicie sesión para conectar su dispositivo a su cuenta.", "로그인하면 기기가 계정에 연결됩니다.",
     "登录后即可将您的设备连接到账户。"},
    {"E-mail address", "E-Mail-Adresse", "Adresse e-mail", "Correo electrónico", "이메일 주소", "电子邮件地址"},
    {"Password", "Passwort", "Mot de passe", "Contraseña", "비밀번호", "密码"},
    {"Cancel", "Abbrechen", "Annuler", "Cancelar", "취소", "取消"},
    {"No account yet?", "Noch kein Konto?", "Pas encore de compte ?", "¿Aún no tiene cuenta?",
     "아직 계정이 없으신가요?", "还没有账户？"},
    {"Create an account", "Konto anlegen", "Créer un compte", "Crear una cuenta", "계정 만들기", "创建账户"},
    {"Already have an account?", "Schon ein Konto?", "Vous avez déjà un compte ?", "¿Ya tiene una cuenta?",
     "이미 계정이 있으신가요?", "已有账户？"},
    {"The e-mail address or the password is wrong.", "Die E-Mail-Adresse oder das Passwort ist falsch.",
     "L’adresse e-mail ou le mot de passe est incorrect.", "El correo electrónico o la contraseña no son correctos.",
     "이메일 주소 또는 비밀번호가 올바르지 않습니다.", "电子邮件地址或密码不正确。"},
    {"Enter your e-mail address.", "Geben Sie Ihre E-Mail-Adresse ein.", "Saisissez votre adresse e-mail.",
     "Introduzca su correo electrónico.", "이메일 주소를 입력하세요.", "请输入电子邮件地址。"},
    {"Enter your password.", "Geben Sie Ihr Passwort ein.", "Saisissez votre mot de passe.",
     "Introduzca su contraseña.", "비밀번호를 입력하세요.", "请输入密码。"},
    {"Too many attempts. Try again in %1 seconds.", "Zu viele Versuche. Versuchen Sie es in %1 Sekunden wieder.",
     "Trop de tentatives. Réessayez dans %1 secondes.", "Demasiados intentos. Vuelva a intentarlo en %1 segundos.",
     "시도 횟수가 너무 많습니다. %1초 후에 다시 시도하세요.", "尝试次数过多，请在 %1 秒后重试。"},
    {"Too many attempts. Try again in %1 minutes.", "Zu viele Versuche. Versuchen Sie es in %1 Minuten wieder.",
     "Trop de tentatives. Réessayez dans %1 minutes.", "Demasiados intentos. Vuelva a intentarlo en %1 minutos.",
     "시도 횟수가 너무 많습니다. %1분 후에 다시 시도하세요.", "尝试次数过多，请在 %1 分钟后重试。"},
    {"Connect this device?", "Dieses Gerät verbinden?", "Associer cet appareil ?", "¿Conectar este dispositivo?",
     "이 기기를 연결할까요?", "连接此设备？"},
    {"Device", "Gerät", "Appareil", "Dispositivo", "기기", "设备"},
    {"Account", "Konto", "Compte", "Cuenta", "계정", "账户"},
    {"The device will be able to see, add, change and delete the files of this account.",
     "Das Gerät kann dann die Dateien dieses Kontos sehen, hinzufügen, ändern und löschen.",
     "L’appareil pourra voir, ajouter, modifier et supprimer les fichiers de ce compte.",
     "El dispositivo podrá ver, añadir, modificar y eliminar los archivos de esta cuenta.",
     "이 기기에서 이 계정의 파일을 보고, 추가, 변경 및 삭제할 수 있게 됩니다.",
     "该设备将可以查看、添加、更改和删除此账户中的文件。"},
    {"Allow it only if you have just started this on the device yourself.",
     "Erlauben Sie es nur, wenn Sie dies gerade selbst auf dem Gerät begonnen haben.",
     "Ne l’autorisez que si vous venez de lancer cette demande vous-même sur l’appareil.",
     "Permítalo solo si acaba de iniciarlo usted mismo en el dispositivo.",
     "방금 본인이 기기에서 직접 시작한 경우에만 허용하세요.", "仅当您刚刚亲自在该设备上发起此操作时才允许。"},
    {"The request came from another network than the one you use now. Make sure that it is your device.",
     "Die Anfrage kam aus einem anderen Netz als dem, das Sie jetzt benutzen. Prüfen Sie, ob es Ihr Gerät ist.",
     "La demande provient d’un autre réseau que celui que vous utilisez. Vérifiez qu’il s’agit bien de votre appareil.",
     "La solicitud procede de una red distinta de la que usa ahora. Compruebe que es su dispositivo.",
     "지금 사용 중인 네트워크와 다른 네트워크에서 온 요청입니다. 본인의 기기인지 확인하세요.",
     "该请求来自与您当前不同的网络。请确认这是您的设备。"},
    {"Allow", "Erlauben", "Autoriser", "Permitir", "허용", "允许"},
    {"Don’t allow", "Nicht erlauben", "Refuser", "No permitir", "허용 안 함", "不允许"},
    {"Not you? Use another account", "Nicht Sie? Anderes Konto verwenden",
     "Ce n’est pas vous ? Utiliser un autre compte", "¿No es usted? Usar otra cuenta",
     "본인이 아닌가요? 다른 계정 사용", "不是您？使用其他账户"},
    {"This sign-in is over", "Diese Anmeldung ist beendet", "Cette connexion n’est plus valable",
     "Este inicio de sesión ya no es válido", "이 로그인은 더 이상 유효하지 않습니다", "此次登录已失效"},
    {"It was used already or took too long. Start again on your device.",
     "Sie wurde schon benutzt oder hat zu lange gedauert. Beginnen Sie auf Ihrem Gerät von vorn.",
     "Elle a déjà servi ou a pris trop de temps. Recommencez sur votre appareil.",
     "Ya se ha utilizado o ha tardado demasiado. Empiece de nuevo en su dispositivo.",
     "이미 사용되었거나 시간이 초과되었습니다. 기기에서 다시 시작하세요.",
     "它已被使用或已超时。请在您的设备上重新开始。"},
    {"This sign-in cannot go on", "Diese Anmeldung kann nicht fortgesetzt werden",
     "Cette connexion ne peut pas continuer", "Este inicio de sesión no puede continuar", "로그인을 계속할 수 없습니다",
     "无法继续登录"},
    {"Whoever has sent you here is not known to this service. Nothing was passed on.",
     "Wer Sie hierher geschickt hat, ist diesem Dienst nicht bekannt. Es wurde nichts weitergegeben.",
     "Ce service ne connaît pas l’origine de cette demande. Rien n’a été transmis.",
     "Este servicio no reconoce el origen de esta solicitud. No se ha transmitido nada.",
     "이 서비스에서 알 수 없는 곳에서 온 요청입니다. 전달된 정보는 없습니다.",
     "本服务无法识别此请求的来源。未传递任何信息。"},
    {"At least 8 characters. Not your e-mail address, and none that everybody uses.",
     "Mindestens 8 Zeichen. Nicht Ihre E-Mail-Adresse und keines, das jeder benutzt.",
     "Au moins 8 caractères. Ni votre adresse e-mail, ni un mot de passe trop courant.",
     "Al menos 8 caracteres. Ni su correo electrónico ni una contraseña muy común.",
     "8자 이상이어야 합니다. 이메일 주소나 흔한 비밀번호는 사용할 수 없습니다.",
     "至少 8 个字符。不能是您的电子邮件地址，也不能是常见密码。"},
    {"This is not an e-mail address.", "Das ist keine E-Mail-Adresse.", "Ce n’est pas une adresse e-mail.",
     "No es una dirección de correo electrónico.", "올바른 이메일 주소가 아닙니다.", "这不是有效的电子邮件地址。"},
    {"The password needs at least 8 characters.", "Das Passwort braucht mindestens 8 Zeichen.",
     "Le mot de passe doit comporter au moins 8 caractères.", "La contraseña necesita al menos 8 caracteres.",
     "비밀번호는 8자 이상이어야 합니다.", "密码至少需要 8 个字符。"},
    {"The password is too long.", "Das Passwort ist zu lang.", "Le mot de passe est trop long.",
     "La contraseña es demasiado larga.", "비밀번호가 너무 깁니다.", "密码太长。"},
    {"The password must not be your e-mail address or a part of it.",
     "Das Passwort darf nicht Ihre E-Mail-Adresse oder ein Teil davon sein.",
     "Le mot de passe ne doit pas être votre adresse e-mail ni une partie de celle-ci.",
     "La contraseña no puede ser su correo electrónico ni una parte de él.",
     "이메일 주소나 그 일부를 비밀번호로 사용할 수 없습니다.", "密码不能是您的电子邮件地址或其中一部分。"},
    {"Too many people use this password. Choose another one.",
     "Dieses Passwort benutzen zu viele. Wählen Sie ein anderes.",
     "Ce mot de passe est trop courant. Choisissez-en un autre.",
     "Demasiadas personas usan esta contraseña. Elija otra.", "너무 흔한 비밀번호입니다. 다른 비밀번호를 선택하세요.",
     "使用此密码的人太多，请另选一个。"},
    {"There is an account with this address already.", "Mit dieser Adresse gibt es schon ein Konto.",
     "Un compte existe déjà avec cette adresse.", "Ya existe una cuenta con esta dirección.",
     "이 주소를 사용하는 계정이 이미 있습니다.", "此地址已有账户。"},
    {"Sign in instead", "Stattdessen anmelden", "Se connecter à ce compte", "Iniciar sesión con ella",
     "대신 로그인하기", "改为登录"},
    {"No new accounts here", "Hier gibt es keine neuen Konten", "Pas de nouveaux comptes ici",
     "Aquí no se crean cuentas nuevas", "새 계정을 만들 수 없습니다", "此处不开放注册"},
    {"Ask whoever runs this service for an account.", "Bitten Sie den Betreiber dieses Dienstes um ein Konto.",
     "Demandez un compte à la personne qui gère ce service.", "Pida una cuenta a quien administra este servicio.",
     "이 서비스의 운영자에게 계정을 요청하세요.", "请向本服务的运营者申请账户。"},
    {"The form has expired", "Das Formular ist abgelaufen", "Le formulaire a expiré", "El formulario ha caducado",
     "양식이 만료되었습니다", "表单已过期"},
    {"It was open for too long, or the browser keeps no cookies. Nothing was changed.",
     "Es war zu lange offen, oder der Browser behält keine Cookies. Es wurde nichts geändert.",
     "Il est resté ouvert trop longtemps, ou le navigateur refuse les cookies. Rien n’a été modifié.",
     "Estuvo abierto demasiado tiempo o el navegador no guarda cookies. No se ha cambiado nada.",
     "너무 오래 열려 있었거나 브라우저에서 쿠키를 저장하지 않습니다. 변경된 내용은 없습니다.",
     "页面打开时间过长，或浏览器不保存 Cookie。未作任何更改。"},
    {"Open the page again", "Seite neu öffnen", "Rouvrir la page", "Abrir la página de nuevo", "페이지 다시 열기",
     "重新打开页面"},
    {"That did not work", "Das hat nicht geklappt", "Une erreur s’est produite", "Algo no ha funcionado",
     "문제가 발생했습니다", "出现问题"},
    {"The service could not do this. Try again later.",
     "Der Dienst konnte das nicht tun. Versuchen Sie es später wieder.",
     "Le service n’a pas pu effectuer cette action. Réessayez plus tard.",
     "El servicio no ha podido hacerlo. Vuelva a intentarlo más tarde.",
     "서비스에서 요청을 처리하지 못했습니다. 나중에 다시 시도하세요.", "服务无法完成此操作，请稍后重试。"},
    {"All done", "Alles erledigt", "C’est fait", "Todo listo", "완료되었습니다", "已完成"},
    {"You can go back to your device.", "Sie können zu Ihrem Gerät zurückkehren.",
     "Vous pouvez revenir à votre appareil.", "Puede volver a su dispositivo.", "이제 기기로 돌아가도 됩니다.",
     "您可以返回您的设备了。"},
    {"Not connected", "Nicht verbunden", "Non associé", "No conectado", "연결되지 않았습니다", "未连接"},
    {"The device was not given access. You can go back to it.",
     "Das Gerät hat keinen Zugang bekommen. Sie können zu ihm zurückkehren.",
     "L’appareil n’a reçu aucun accès. Vous pouvez y revenir.",
     "El dispositivo no ha recibido acceso. Puede volver a él.",
     "기기에 접근 권한이 부여되지 않았습니다. 기기로 돌아가도 됩니다.", "该设备未获得访问权限。您可以返回设备了。"},
    {"Your account", "Ihr Konto", "Votre compte", "Su cuenta", "내 계정", "您的账户"},
    {"Storage", "Speicher", "Stockage", "Almacenamiento", "저장 공간", "存储空间"},
    {"%1 of %2 used", "%1 von %2 belegt", "%1 utilisés sur %2", "%1 de %2 en uso", "%2 중 %1 사용", "已使用 %1，共 %2"},
    {"Devices", "Geräte", "Appareils", "Dispositivos", "기기", "设备"},
    {"No device is signed in.", "Kein Gerät ist angemeldet.", "Aucun appareil n’est connecté.",
     "Ningún dispositivo ha iniciado sesión.", "로그인된 기기가 없습니다.", "没有已登录的设备。"},
    {"Signed in since %1", "Angemeldet seit %1", "Connecté depuis le %1", "Conectado desde el %1", "%1부터 로그인됨",
     "自 %1 起登录"},
    {"Last used %1", "Zuletzt benutzt %1", "Dernière utilisation : %1", "Último uso: %1", "마지막 사용: %1",
     "上次使用：%1"},
    {"Not used yet", "Noch nicht benutzt", "Pas encore utilisé", "Aún sin usar", "아직 사용되지 않음", "尚未使用"},
    {"Sign out", "Abmelden", "Déconnecter", "Cerrar sesión", "로그아웃", "退出登录"},
    {"Sign out of this page", "Von dieser Seite abmelden", "Se déconnecter de cette page",
     "Cerrar sesión en esta página", "이 페이지에서 로그아웃", "退出此页面"},
    {"Unnamed device", "Gerät ohne Namen", "Appareil sans nom", "Dispositivo sin nombre", "이름 없는 기기",
     "未命名设备"},
    {"Terms of use", "Nutzungs\u00adbedingungen", "Conditions d’utilisation", "Condiciones de uso", "이용 약관",
     "使用条款"},
    {"This service is run by the person or the organisation that gave you its address. They alone are responsible for "
     "it, "
     "and they are the ones to ask.",
     "Diesen Dienst betreibt die Person oder Organisation, von der Sie seine Adresse haben. Sie allein ist für ihn "
     "verantwortlich und für Fragen da.",
     "Ce service est géré par la personne ou l’organisation qui vous en a donné l’adresse. Elle seule en est "
     "responsable "
     "et peut répondre à vos questions.",
     "Este servicio lo administra la persona u organización que le dio su dirección. Solo ella es responsable de él y "
     "puede responder a sus preguntas.",
     "이 서비스는 주소를 알려 준 개인이나 단체가 운영합니다. 서비스에 대한 책임은 운영자에게만 있으며, 문의도 "
     "운영자에게 하시기 "
     "바랍니다.",
     "本服务由向您提供其地址的个人或组织运营。运营者对本服务负全部责任，如有疑问请向其咨询。"},
    {"Your files stay yours. They are kept on the operator’s machine as they are, so the operator can read them. "
     "Nothing is "
     "passed on to anybody by this program.",
     "Ihre Dateien bleiben Ihre. Sie liegen unverändert auf dem Rechner des Betreibers, der sie also lesen kann. "
     "Dieses "
     "Programm gibt nichts an andere weiter.",
     "Vos fichiers restent les vôtres. Ils sont conservés tels quels sur la machine de l’exploitant, qui peut donc les "
     "lire. Ce programme ne transmet rien à des tiers.",
     "Sus archivos siguen siendo suyos. Se guardan tal cual en el equipo de quien administra el servicio, que por "
     "tanto "
     "puede leerlos. Este programa no transmite nada a terceros.",
     "파일은 계속 사용자의 소유입니다. 파일은 운영자의 컴퓨터에 그대로 보관되므로 운영자가 읽을 수 있습니다. 이 "
     "프로그램은 "
     "누구에게도 정보를 전달하지 않습니다.",
     "您的文件仍归您所有。它们原样保存在运营者的机器上，因此运营者可以读取。本程序不会向任何人传递任何内容。"},
    {"Store only what you may store, and nothing that harms others. Keep your password to yourself.",
     "Speichern Sie nur, was Sie speichern dürfen, und nichts, was anderen schadet. Behalten Sie Ihr Passwort für "
     "sich.",
     "Ne stockez que ce que vous avez le droit de stocker, et rien qui nuise à autrui. Gardez votre mot de passe pour "
     "vous.",
     "Guarde solo lo que tenga derecho a guardar y nada que perjudique a otros. No comparta su contraseña.",
     "저장할 권리가 있는 것만 저장하고 다른 사람에게 해를 끼치는 것은 저장하지 마세요. 비밀번호를 다른 사람에게 알려 "
     "주지 "
     "마세요.",
     "只存储您有权存储的内容，不要存储会损害他人的内容。请勿向他人透露您的密码。"},
    {"The program comes without any warranty. Keep copies of what you cannot do without.",
     "Das Programm kommt ohne jede Gewährleistung. Behalten Sie Kopien von allem, was Sie nicht entbehren können.",
     "Le programme est fourni sans aucune garantie. Conservez des copies de ce qui vous est indispensable.",
     "El programa se ofrece sin garantía alguna. Conserve copias de lo que no pueda perder.",
     "이 프로그램은 어떠한 보증도 없이 제공됩니다. 중요한 파일은 사본을 따로 보관하세요.",
     "本程序不提供任何担保。请为不可缺少的内容保留副本。"},
    {"There is no such page", "Diese Seite gibt es nicht", "Cette page n’existe pas", "Esta página no existe",
     "페이지를 찾을 수 없습니다", "没有此页面"},
    {"The address may be mistyped.", "Vielleicht ist die Adresse falsch geschrieben.",
     "L’adresse est peut-être mal écrite.", "Puede que la dirección esté mal escrita.",
     "주소를 잘못 입력했을 수 있습니다.", "地址可能输入有误。"},
    {"Go to your account", "Zu Ihrem Konto", "Aller à votre compte", "Ir a su cuenta", "내 계정으로 이동",
     "前往您的账户"},
    {"%d %b %Y", "%d.%m.%Y", "%d/%m/%Y", "%d/%m/%Y", "%Y. %m. %d.", "%Y-%m-%d"},
    {".", ",", ",", ",", ".", "."},
};
static_assert(std::size(TEXTS) == static_cast<size_t>(Text::COUNT));

static constexpr bool are_whole()
{
    for (const auto &row : TEXTS)
        for (const char *text : row)
            if (!text || !*text)
                return false;
    return true;
}
static_assert(are_whole());

static const struct {
    const char *tag, *name;
} LANGUAGE_NAMES[LANGUAGES] = {{"en", "en"}, {"de", "de"}, {"fr", "fr"},
                               {"es", "es"}, {"ko", "ko"}, {"zh-CN", "zh_CN"}};

const char *text_of(Text text, Language language)
{
    return TEXTS[static_cast<size_t>(text)][static_cast<size_t>(language)];
}

const char *language_tag(Language language)
{
    return LANGUAGE_NAMES[static_cast<size_t>(language)].tag;
}

const char *language_name(Language language)
{
    return LANGUAGE_NAMES[static_cast<size_t>(language)].name;
}

bool read_language(const std::string &name, Language &language)
{
    const std::string first = name.substr(0, name.find_first_of("_-.@"));
    for (size_t i = 0; i < LANGUAGES; i++)
        if (first.size() == 2 && g_ascii_strncasecmp(first.c_str(), LANGUAGE_NAMES[i].tag, 2) == 0) {
            language = static_cast<Language>(i);
            return true;
        }
    return false;
}

Language accepted_language(const char *header)
{
    Language best = Language::EN, one;
    double best_quality = 0;
    char **items = g_strsplit(header ? header : "", ",", 32);
    for (char **item = items; *item; item++) {
        const std::string name(g_strstrip(*item));
        const size_t quality_at = name.find("q=");
        const double quality =
            quality_at == std::string::npos ? 1 : g_ascii_strtod(name.c_str() + quality_at + 2, nullptr);
        if (quality > best_quality && read_language(name.substr(0, name.find_first_of("; ")), one)) {
            best = one;
            best_quality = quality;
        }
    }
    g_strfreev(items);
    return best;
}
