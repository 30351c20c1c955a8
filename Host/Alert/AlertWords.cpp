#include "Host/Alert/AlertWords.h"

#include <algorithm>
#include <array>

namespace palisade {
namespace {

// "certain" and "claimed" say how much is known about the application's identity. English is first.
constexpr std::array<AlertWords, 13> allWords = {{
    {"en", "Application", "Account", "Identity", "Certain (sandboxed)", "Only claimed (not sandboxed)"},
    {"de", "Anwendung", "Konto", "Identität", "Gesichert (in einer Sandbox)", "Nur behauptet (nicht in einer Sandbox)"},
    {"fr", "Application", "Compte", "Identité", "Certaine (bac à sable)", "Seulement déclarée (hors bac à sable)"},
    {"es", "Aplicación", "Cuenta", "Identidad", "Segura (en un entorno aislado)", "Solo declarada (sin entorno aislado)"},
    {"pt_BR", "Aplicativo", "Conta", "Identidade", "Confirmada (em sandbox)", "Apenas declarada (fora de sandbox)"},
    {"it", "Applicazione", "Account", "Identità", "Certa (in sandbox)", "Solo dichiarata (non in sandbox)"},
    {"ru", "Приложение", "Учётная запись", "Подлинность", "Подтверждена (песочница)", "Только заявлена (без песочницы)"},
    {"ja", "アプリケーション", "アカウント", "身元", "確認済み（サンドボックス内）", "自己申告のみ（サンドボックス外）"},
    {"ko", "앱", "계정", "신원", "확인됨(샌드박스)", "앱의 주장일 뿐임(샌드박스 아님)"},
    {"zh_CN", "应用程序", "帐户", "身份", "已确认（在沙盒中）", "仅为自称（不在沙盒中）"},
    {"zh_TW", "應用程式", "帳號", "身分", "已確認（在沙箱中）", "僅為自稱（不在沙箱中）"},
    {"ar", "التطبيق", "الحساب", "الهوية", "مؤكدة (في بيئة معزولة)", "مزعومة فقط (خارج بيئة معزولة)"},
    {"he", "יישום", "חשבון", "זהות", "ודאית (בארגז חול)", "מוצהרת בלבד (לא בארגז חול)"},
}};

}  // namespace

const AlertWords& alertWordsFor(std::string_view languages) {
  while (!languages.empty()) {
    const std::string_view language = languages.substr(0, languages.find(':'));
    const auto found = std::ranges::find(allWords, language, &AlertWords::language);
    if (found != allWords.end()) return *found;
    languages.remove_prefix(std::min(languages.size(), language.size() + 1));
  }
  return allWords.front();
}

}  // namespace palisade
