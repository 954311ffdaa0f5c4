#include "bench/speed/syllables.h"

#include <map>

namespace bench {
namespace {

constexpr const char* kSimplified =
    "文 件 管 理 系 统 设 置 网 络 用 户 照 片 音 乐 视 频 备 份 同 步 日 志 安 全 中 心 存 储 空 "
    "间 "
    "服 务 器 下 载 上 传 共 享 编 辑 查 看 搜 索 邮 箱 地 址 计 划 任 务 更 新 监 控 数 据 库 "
    "工 具 应 用 程 序 时 钟 天 气 图 书 电 影 相 册 笔 记 联 系 人 密 码 防 火 墙 远 端 云 "
    "打 印 机 语 言 字 体 主 题 通 知 权 限 报 表 分 析 开 发 测 试 运 行 停 止 帮 助 关 于";
constexpr const char* kTraditional =
    "檔 案 管 理 系 統 設 定 網 路 使 用 者 照 片 音 樂 視 訊 備 份 同 步 日 誌 安 全 中 心 儲 存 "
    "空 "
    "間 服 務 器 下 載 上 傳 共 享 編 輯 檢 視 搜 尋 郵 件 地 址 計 畫 任 務 更 新 監 控 資 料 庫 "
    "工 具 應 程 式 時 鐘 天 氣 圖 書 電 影 相 簿 筆 記 聯 絡 人 密 碼 防 火 牆 遠 端 雲 "
    "列 印 機 語 言 字 體 主 題 通 知 權 限 報 表 分 析 開 發 測 試 執 行 停 止 說 明 關 於";
constexpr const char* kKanji =
    "写 真 管 理 設 定 動 画 音 楽 文 書 予 定 表 共 有 保 存 検 索 更 新 電 話 帳 天 気 地 図 翻 "
    "訳 "
    "会 議 計 算 機 通 知 暗 号 鍵 接 続 監 視 記 録 編 集 印 刷 言 語 画 像 資 料 室 案 内 係";
constexpr const char* kKatakana =
    "ア イ ウ エ オ カ キ ク ケ コ サ シ ス セ タ チ ツ テ ト ナ ニ ネ ハ ヒ フ ヘ ホ マ ミ ム メ "
    "モ "
    "ラ リ ル レ ロ ワ ガ グ ゲ ゴ ジ ズ ダ デ ド バ ビ ブ ベ ボ パ ピ プ ポ カー サー ター ション";
constexpr const char* kHangul =
    "가 나 다 라 마 바 사 아 자 차 카 타 파 하 고 노 도 로 모 보 소 오 조 구 누 두 루 무 부 수 우 "
    "주 "
    "기 니 디 리 미 비 시 이 지 치 관 설 정 동 영 상 음 악 문 서 한 글 진 앨 범 파 일 공 유 검 색 "
    "업 데 트 보 안 백 연 결 암 호 달 력 날 씨 번 역 기 록 편 집 인 쇄 언 어 화 면 목 록";
constexpr const char* kThaiOnsets =
    "ก ข ค ง จ ช ซ ด ต ท น บ ป ผ พ ฟ ม ย ร ล ว ส ห อ เก เข เด เร เส แก แบ แผ แฟ โท โม โป";
constexpr const char* kThaiNuclei = "า ิ ี ุ ู ่า ้า ื อ ร ์ -";
constexpr const char* kThaiCodas = "น ง ม ก บ ย ว - -";

constexpr const char* kLatinOnsets =
    "b c d f g h k l m n p r s t v bl br dr fl gr kl kr pl pr sk st tr s t m k";
constexpr const char* kLatinCodas = "- - - n r s l t m nd nt rk st";

Writing Latin(const char* onsets, const char* nuclei, const char* codas) {
  return {{{onsets, nuclei, codas, 1, 3}}, " "};
}

std::map<std::string, Writing> MakeWritings() {
  std::map<std::string, Writing> writings;
  writings["chs"] = {{{kSimplified, "", "", 1, 3}}, ""};
  writings["cht"] = {{{kTraditional, "", "", 1, 3}}, ""};
  writings["jpn"] = {{{kKatakana, "", "", 2, 4}, {kKanji, "", "", 1, 3}}, ""};
  writings["krn"] = {{{kHangul, "", "", 2, 4}}, " "};
  writings["tha"] = {{{kThaiOnsets, kThaiNuclei, kThaiCodas, 1, 3}}, ""};
  writings["rus"] = Latin("б в г д ж з к л м н п р с т ф х ч ш пр ст тр кр гр сл вл",
                          "а е и о у ы я ю ё а о и", "- - н р с л т м й ть нь ст");
  writings["enu"] = Latin(kLatinOnsets, "a e i o u ea oo ai a e o", kLatinCodas);
  writings["ger"] = Latin("b d f g h k l m n p r s sch sp st t v w z", "a e i o u ä ö ü ei au e",
                          "- - n r s l t ß ng nd");
  writings["fre"] = Latin(kLatinOnsets, "a e i o u é è ê eau ou ç a é", "- - n r s l t");
  writings["ita"] = Latin(kLatinOnsets, "a e i o u à è ì ò ù a i o", "- - n r l");
  writings["spn"] =
      Latin("b c d f g h l ll m n ñ p r s t v ch br tr", "a e i o u á é í ó ú a o", "- - n r s l");
  writings["ptb"] = Latin(kLatinOnsets, "a e i o u ã õ á ê ç a o", "- - m r s l");
  writings["ptg"] = Latin(kLatinOnsets, "a e i o u ão õe á é â a e", "- - m r s l");
  writings["nld"] = Latin(kLatinOnsets, "a e i o u aa ee ij oe ui e", kLatinCodas);
  writings["dan"] = Latin(kLatinOnsets, "a e i o u æ ø å e i", kLatinCodas);
  writings["nor"] = Latin(kLatinOnsets, "a e i o u æ ø å a ei", kLatinCodas);
  writings["sve"] = Latin(kLatinOnsets, "a e i o u ä ö å a o", kLatinCodas);
  writings["csy"] = Latin("b c č d f h k l m n p r ř s š t v z ž st př", "a á e é ě i í o u ů ý",
                          "- - k n r t l");
  writings["hun"] = Latin("b c d f g gy h k l m n ny p r s sz t v z", "a á e é i í o ó ö ő u ü ű",
                          "- - k n r t l s");
  writings["plk"] =
      Latin("b c ć cz d f g k ł l m n p r rz s ś sz t w z ż", "a ą e ę i o ó u y", "- - k n r t ł");
  writings["trk"] =
      Latin("b c ç d f g ğ h k l m n p r s ş t v y z", "a e ı i o ö u ü", "- - k n r t l m");
  return writings;
}

}  // namespace

const Writing& WritingOf(const std::string& lang) {
  static const std::map<std::string, Writing> writings = MakeWritings();
  return writings.at(lang);
}

}  // namespace bench
