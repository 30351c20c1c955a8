#include "Host/Alert/AlertWords.h"

#include <algorithm>
#include <array>

namespace palisade {
namespace {

// "certain", "likely" and the two of "claimed" say how much is known about the application's identity, the last word which keys
// answer on a terminal. English is first.
constexpr std::array<AlertWords, 13> allWords = {{
    {"en", "Application", "Account", "Identity", "Certain (sandboxed)", "Likely (sandboxed)", "Only claimed (unknown sandbox)",
     "Only claimed (not sandboxed)", "Tab chooses a button, Return presses it, Escape closes."},
    {"de", "Anwendung", "Konto", "Identität", "Gesichert (in einer Sandbox)", "Wahrscheinlich (in einer Sandbox)",
     "Nur behauptet (unbekannte Sandbox)", "Nur behauptet (nicht in einer Sandbox)",
     "Tab wählt eine Schaltfläche, Eingabe drückt sie, Esc schließt."},
    {"fr", "Application", "Compte", "Identité", "Certaine (bac à sable)", "Probable (bac à sable)",
     "Seulement déclarée (bac à sable inconnu)", "Seulement déclarée (hors bac à sable)",
     "Tab choisit un bouton, Entrée l’active, Échap ferme."},
    {"es", "Aplicación", "Cuenta", "Identidad", "Segura (en un entorno aislado)", "Probable (en un entorno aislado)",
     "Solo declarada (entorno aislado desconocido)", "Solo declarada (sin entorno aislado)",
     "Tab elige un botón, Intro lo pulsa y Esc cierra."},
    {"pt_BR", "Aplicativo", "Conta", "Identidade", "Confirmada (em sandbox)", "Provável (em sandbox)",
     "Apenas declarada (sandbox desconhecida)", "Apenas declarada (fora de sandbox)",
     "Tab escolhe um botão, Enter o pressiona e Esc fecha."},
    {"it", "Applicazione", "Account", "Identità", "Certa (in sandbox)", "Probabile (in sandbox)",
     "Solo dichiarata (sandbox sconosciuta)", "Solo dichiarata (non in sandbox)",
     "Tab sceglie un pulsante, Invio lo preme, Esc chiude."},
    {"ru", "Приложение", "Учётная запись", "Подлинность", "Подтверждена (песочница)", "Вероятна (песочница)",
     "Только заявлена (неизвестная песочница)", "Только заявлена (без песочницы)",
     "Tab выбирает кнопку, Enter нажимает её, Esc закрывает."},
    {"ja", "アプリケーション", "アカウント", "身元", "確認済み（サンドボックス内）", "おそらく正しい（サンドボックス内）",
     "自己申告のみ（不明なサンドボックス）", "自己申告のみ（サンドボックス外）",
     "Tabキーでボタンを選び、Enterキーで押します。Escキーで閉じます。"},
    {"ko", "앱", "계정", "신원", "확인됨(샌드박스)", "가능성 높음(샌드박스)", "앱의 주장일 뿐임(알 수 없는 샌드박스)",
     "앱의 주장일 뿐임(샌드박스 아님)", "Tab 키로 단추를 고르고 Enter 키로 누릅니다. Esc 키로 닫습니다."},
    {"zh_CN", "应用程序", "帐户", "身份", "已确认（在沙盒中）", "可能属实（在沙盒中）", "仅为自称（未知沙盒）",
     "仅为自称（不在沙盒中）", "按 Tab 选择按钮，按 Enter 确认，按 Esc 关闭。"},
    {"zh_TW", "應用程式", "帳號", "身分", "已確認（在沙箱中）", "可能屬實（在沙箱中）", "僅為自稱（未知沙箱）",
     "僅為自稱（不在沙箱中）", "按 Tab 選擇按鈕，按 Enter 確認，按 Esc 關閉。"},
    {"ar", "التطبيق", "الحساب", "الهوية", "مؤكدة (في بيئة معزولة)", "مرجّحة (في بيئة معزولة)",
     "مزعومة فقط (بيئة معزولة غير معروفة)", "مزعومة فقط (خارج بيئة معزولة)",
     "اختر زرًا بمفتاح Tab واضغط عليه بمفتاح Enter، وأغلق بمفتاح Esc."},
    {"he", "יישום", "חשבון", "זהות", "ודאית (בארגז חול)", "סבירה (בארגז חול)", "מוצהרת בלבד (ארגז חול לא מוכר)",
     "מוצהרת בלבד (לא בארגז חול)", "Tab בוחר כפתור, Enter לוחץ עליו, Esc סוגר."},
}};

}  // namespace

std::string_view AlertWords::wordFor(AlertCertainty certainty) const {
  switch (certainty) {
    case AlertCertainty::certain: return certain;
    case AlertCertainty::likely: return likely;
    case AlertCertainty::claimedInSandbox: return claimedInSandbox;
    case AlertCertainty::claimed: break;
  }
  return claimed;
}

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
