#include "ResourceStringTable.h"

#include <algorithm>
#include <array>

namespace {

// English texts are the program's own words; Japanese texts follow the usage
// of Japanese Windows utilities: accelerators as "(&X)" behind the word, "..."
// kept, technical names (COM, TCP/IP, Xon/Xoff) unchanged, and a trailing
// blank wherever the code appends a detail directly.
constexpr std::array kTable = std::to_array<ResourceStringEntry>({
    // Font of localised forms: family name, character set as decimal text.
    { 20, "Ms Sans Serif", "Noto Sans CJK JP" },
    { 21, "0", "128" },

    // Shared buttons
    { 1204, "Browse...", "参照..." },
    { 1207, "&OK", "&OK" },
    { 1208, "&Cancel", "キャンセル(&C)" },
    { 1301, "ASCII Chart", "ASCII コード表" },
    { 1604, "Continue...", "続行..." },
    { 1605, "Cancel", "キャンセル" },

    // Main window menus
    { 2101, "&Close", "閉じる(&C)" },
    { 2102, "&File", "ファイル(&F)" },
    { 2103, "&New", "新規作成(&N)" },
    { 2104, "&Open", "開く(&O)" },
    { 2105, "&Save", "上書き保存(&S)" },
    { 2106, "Save &As...", "名前を付けて保存(&A)..." },
    { 2107, "E&xit", "終了(&X)" },
    { 2108, "Options...", "オプション..." },
    { 2109, "Password...", "パスワード..." },
    { 2110, "&Window", "ウィンドウ(&W)" },
    { 2111, "&Cascade", "重ねて表示(&C)" },
    { 2112, "Tile &Horizontal", "上下に並べて表示(&H)" },
    { 2113, "Tile &Vertical", "左右に並べて表示(&V)" },
    { 2114, "&Arrange All", "アイコンの整列(&A)" },
    { 2120, "&Preferences...", "環境設定(&P)..." },
    { 2121, "&Activate", "有効化(&A)" },
    { 2122, "&Tools", "ツール(&T)" },
    { 2123, "&Ping IP Address...", "IP アドレスへの Ping(&P)..." },
    { 2124, "&Resolve IP Address from Host Name...", "ホスト名から IP アドレスを解決(&R)..." },
    { 2125, "&Help", "ヘルプ(&H)" },
    { 2126, "&Contents", "目次(&C)" },
    { 2127, "Orvane on the &Web", "Orvane の Web サイト(&W)" },
    { 2128, "&About...", "バージョン情報(&A)..." },
    { 2129, "&Search For Help On...", "ヘルプの検索(&S)..." },
    { 2130, "&Open Velloca", "Velloca を開く(&O)" },
    { 2131, "&Hide Velloca", "Velloca を隠す(&H)" },
    { 2132, "E&xit Velloca", "Velloca を終了(&X)" },

    // Serial settings captions and list entries
    { 2202, "&Connector", "コネクタ(&C)" },
    { 2203, "&Baud Rate", "ボーレート(&B)" },
    { 2204, "&Parity", "パリティ(&P)" },
    { 2205, "None", "なし" },
    { 2206, "Odd", "奇数" },
    { 2207, "Even", "偶数" },
    { 2208, "Mark", "マーク" },
    { 2209, "Space", "スペース" },
    { 2210, "&Data Bits", "データ ビット(&D)" },
    { 2211, "&Stop Bits", "ストップ ビット(&S)" },
    { 2212, "&Flow Control", "フロー制御(&F)" },
    { 2213, "None", "なし" },
    { 2214, "Xon/Xoff", "Xon/Xoff" },
    { 2215, "Hardware", "ハードウェア" },
    { 2216, "Opto-RS", "Opto-RS" },
    { 2217, "Buffer Size:", "バッファ サイズ:" },
    { 2218, "Output Buffer Size:", "出力バッファ サイズ:" },
    { 2219, "&OK", "&OK" },
    { 2220, "&Cancel", "キャンセル(&C)" },

    // Device and file messages
    { 4006, "Buffer Size Must Be Between 128 and 131072", "バッファ サイズは 128 から 131072 の範囲で指定してください" },
    { 4023, "Invalid or unsupported id", "ID が無効か、サポートされていません" },
    { 4024, "Device Not Open", "デバイスが開かれていません" },
    { 4025, "Unknown Device Error!", "不明なデバイス エラーです!" },
    { 4026, "Device Error#", "デバイス エラー#" },
    { 4030, "Device Not Available.", "デバイスを使用できません。" },
    { 4031, "Device Error", "デバイス エラー" },
    { 4032, "File is not a valid configuration file.", "このファイルは有効な構成ファイルではありません。" },

    // Session window captions
    { 5000, "Serial Port", "シリアル ポート" },
    { 5001, "TCP/IP Port", "TCP/IP ポート" },
    { 5002, "Create Virtual COM port", "仮想 COM ポートを作成する" },
    { 5003, "Buffer data if TCP/IP port closed", "TCP/IP ポートが閉じているときはデータをバッファに保持する" },
    { 5004, "Wait for timeout before transmit", "送信前にタイムアウトまで待つ" },
    { 5005, "Timeout value (ms):", "タイムアウト値 (ms):" },
    { 5006, "This PC will act as TCP Client", "この PC を TCP クライアントとして動作させる" },
    { 5007, "This PC will act as TCP Server", "この PC を TCP サーバーとして動作させる" },
    { 5008, "I/O Options...", "I/O オプション..." },
    { 5009, "Activate", "有効化" },

    // Password dialogs
    { 5010, "Velloca Password", "Velloca パスワード" },
    { 5011, "Enter Password:", "パスワードを入力:" },
    { 5012, "Confirm Password", "パスワードの確認" },

    // I/O options dialogs
    { 5013, "Client I/O Options", "クライアント I/O オプション" },
    { 5014, "2-Way I/O options:", "双方向 I/O オプション:" },
    { 5015, "Allow complete 2-way I/O.", "完全な双方向 I/O を許可する。" },
    { 5016, "Disable output to serial port.", "シリアル ポートへの出力を無効にする。" },
    { 5017, "Disable output to TCP/IP port.", "TCP/IP ポートへの出力を無効にする。" },
    { 5018, "Open TCP/IP port only when Virtual COM Port is open", "仮想 COM ポートが開いているときだけ TCP/IP ポートを開く" },
    { 5019, "Server I/O Options", "サーバー I/O オプション" },
    { 5020, "Allow multiple client connections", "複数のクライアント接続を許可する" },
    { 5021, "Inbound TCP/IP data options", "TCP/IP 受信データのオプション" },
    { 5022, "Transmit inbound TCP/IP data from all clients out serial port", "すべてのクライアントから受信した TCP/IP データをシリアル ポートへ送信する" },
    { 5023, "Ignore inbound TCP/IP data from all clients", "すべてのクライアントから受信した TCP/IP データを無視する" },
    { 5024, "Transmit inbound TCP/IP data from first connected client only", "最初に接続したクライアントから受信した TCP/IP データだけを送信する" },
    { 5025, "Inbound serial data options", "シリアル受信データのオプション" },
    { 5026, "Send inbound serial data to all TCP/IP clients", "シリアル受信データをすべての TCP/IP クライアントへ送信する" },
    { 5027, "Ignore inbound serial data", "シリアル受信データを無視する" },
    { 5028, "Send inbound serial data to first connected client only", "シリアル受信データを最初に接続したクライアントだけへ送信する" },

    // Global options dialog
    { 5029, "Velloca Options", "Velloca オプション" },
    { 5030, "Max bytes per TCP/IP packet:", "TCP/IP パケットあたりの最大バイト数:" },
    { 5031, "Load Velloca with Windows at startup", "Windows の起動時に Velloca を読み込む" },
    { 5032, "Log all errors to file: ErrorLog.txt", "すべてのエラーをファイルに記録する: ErrorLog.txt" },
    { 5033, "Run external program when errors occur:", "エラー発生時に外部プログラムを実行する:" },
    { 5034, "Command Line:", "コマンド ライン:" },
    { 5035, "Browse...", "参照..." },
    { 5036, "Ping remote IP Addresses to detect failed connections:", "リモート IP アドレスに Ping を送信して切断を検出する:" },
    { 5037, "Enable remote pings", "リモート Ping を有効にする" },
    { 5038, "Ping frequency (secs):", "Ping の間隔 (秒):" },
    { 5039, "Ping Timeout (ms):", "Ping のタイムアウト (ms):" },

    // Ping and resolve dialogs
    { 5040, "Ping IP Address", "IP アドレスへの Ping" },
    { 5041, "IP Address:", "IP アドレス:" },
    { 5042, "Echo Data:", "エコー データ:" },
    { 5043, "Ping Results:", "Ping の結果:" },
    { 5044, "Return Status:", "応答ステータス:" },
    { 5045, "Address (dec):", "アドレス (10 進):" },
    { 5046, "Round Trip Time:", "往復時間:" },
    { 5047, "Data Packet Size:", "データ パケット サイズ:" },
    { 5048, "Data Returned:", "応答データ:" },
    { 5049, "&Ping", "Ping(&P)" },
    { 5050, "&Cancel", "キャンセル(&C)" },
    { 5051, "Resolve IP Address from Host Name:", "ホスト名から IP アドレスを解決:" },
    { 5052, "Host Name:", "ホスト名:" },
    { 5053, "IP Address:", "IP アドレス:" },
    { 5054, "Help...", "ヘルプ..." },
    { 5055, "Resolve IP Address", "IP アドレスを解決" },
    { 5056, "Cancel", "キャンセル" },

    // About box
    { 5057, "About Velloca", "Velloca のバージョン情報" },
    { 5058, "RS232 to TCP/IP Converter", "RS232/TCP/IP コンバーター" },
    { 5059, "Version 4.0", "バージョン 4.0" },

    // Service messages
    { 5061, "service installed successfully.", "サービスは正常にインストールされました。" },
    { 5062, "service did not install successfully.", "サービスをインストールできませんでした。" },
    { 5063, "service uninstalled successfully.", "サービスは正常にアンインストールされました。" },
    { 5064, "service did not uninstall successfully.", "サービスをアンインストールできませんでした。" },

    { 5065, "Invalid password", "パスワードが正しくありません" },
    { 5073, "System Information Is Unavailable At This Time", "現在システム情報を利用できません" },

    // Session status texts and messages; several are joined with a
    // connector name or a detail behind them.
    { 5082, "COM Status: Error - ", "COM 状態: エラー - " },
    { 5083, "TCP/IP Status: Error - ", "TCP/IP 状態: エラー - " },
    { 5084, "Virtual port not closed", "仮想ポートは閉じられていません" },
    { 5085, "Virtual port closed", "仮想ポートは閉じられました" },
    { 5086, "TCP/IP Status: Closed", "TCP/IP 状態: クローズ" },
    { 5087, "Activate", "有効化" },
    { 5088, "Error - Invalid IP Address", "エラー - IP アドレスが無効です" },
    { 5089, "Error - Invalid Port Number", "エラー - ポート番号が無効です" },
    { 5090, "COM Status:", "COM 状態:" },
    { 5091, "TCP/IP Status:", "TCP/IP 状態:" },
    // Followed by " COMn": "Cannot create virtual COM5".
    { 5092, "Cannot create virtual", "仮想ポートを作成できません:" },
    // 5093 " COMn " 5094: "Virtual Port COM5 created".
    { 5093, "Virtual Port", "仮想ポート" },
    { 5094, "created", "を作成しました" },
    { 5095, "Error - Port not available", "エラー - ポートを使用できません" },
    { 5096, "Open", "オープン" },
    { 5097, "Connecting...", "接続中..." },
    { 5098, "Listening...", "待ち受け中..." },
    { 5099, "Error -", "エラー -" },
    { 5100, "Closed", "クローズ" },
    { 5101, "Connected Clients:", "接続中のクライアント:" },
    { 5102, "Port numbers must range between 0 and 65535", "ポート番号は 0 から 65535 の範囲で指定してください" },
    { 5103, "Error", "エラー" },
    { 5104, "Remote Host IP Address", "リモート ホストの IP アドレス" },
    { 5105, "Remote Port", "リモート ポート" },
    { 5106, "Local IP Address", "ローカル IP アドレス" },
    { 5107, "Local Port", "ローカル ポート" },
    { 5108, "Ping Failed - Ping Result =", "Ping 失敗 - Ping の結果 =" },
    { 5109, "Connected", "接続済み" },
    { 5110, "Your confirming password does not match your password. Please re-enter.", "確認用のパスワードがパスワードと一致しません。もう一度入力してください。" },

    // Network tool messages and tooltips
    { 5111, "Windows Sockets error occurred in Cleanup.", "Windows Sockets のクリーンアップ中にエラーが発生しました。" },
    { 5112, "Please enter an IP Address or host name for the computer or device that you want to ping.", "Ping を送信するコンピューターまたはデバイスの IP アドレスかホスト名を入力してください。" },
    { 5113, "Ping Error - Missing or invalid IP Address", "Ping エラー - IP アドレスが指定されていないか無効です" },
    { 5114, "Windows Sockets for 32 bit Windows environments is not successfully responding.", "32 ビット Windows 環境用の Windows Sockets が正常に応答していません。" },
    { 5115, "Cannot resolve the IP Address for host name:", "次のホスト名の IP アドレスを解決できません:" },

    { 5118, "De-Activate", "無効化" },
    { 5119, "New", "新規" },
    { 5120, "RS232 to TCP/IP", "RS232/TCP/IP 変換" },

    { 5122, "Enter the IP Address of the computer that you want to ping.", "Ping を送信するコンピューターの IP アドレスを入力してください。" },
    { 5123, "Enter the data string that you want to ping the computer with.", "Ping でコンピューターに送信するデータ文字列を入力してください。" },
    { 5124, "Enter the Workstation Name or the URL for the computer that you want to find the IP Address of", "IP アドレスを調べたいコンピューターのワークステーション名または URL を入力してください" },

    // Configuration files: messages that name the file and the cause after them
    { 5201, "The configuration file cannot be loaded:", "構成ファイルを読み込めません:" },
    { 5202, "Velloca starts with a new configuration and does not save it when it ends.", "Velloca は新しい構成で起動し、終了時に保存しません。" },
    { 5203, "Another copy of Velloca is using this configuration file; this copy does not save it when it ends:", "別の Velloca がこの構成ファイルを使用中です。このコピーは終了時に保存しません:" },
    { 5204, "The configuration was not saved:", "構成は保存されませんでした:" },
    { 5205, "Velloca opens at most 256 sessions. Close a session before you add another.", "Velloca が開けるセッションは 256 までです。追加する前にセッションを閉じてください。" },
});

constexpr bool strictlyAscending()
{
    return std::adjacent_find(kTable.begin(), kTable.end(),
                              [](const ResourceStringEntry &a, const ResourceStringEntry &b) {
                                  return a.id >= b.id;
                              })
        == kTable.end();
}

// Lookup is a binary search, so a row out of order or twice would hide texts.
static_assert(strictlyAscending(), "string table rows must be ascending and unique by id");

} // namespace

std::span<const ResourceStringEntry> resourceStringTable()
{
    return kTable;
}

const ResourceStringEntry *findResourceString(int id)
{
    const auto it = std::lower_bound(kTable.begin(), kTable.end(), id,
                                     [](const ResourceStringEntry &entry, int wanted) {
                                         return entry.id < wanted;
                                     });
    return it != kTable.end() && it->id == id ? &*it : nullptr;
}
