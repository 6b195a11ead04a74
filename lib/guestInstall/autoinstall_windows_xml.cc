// Fills the user's answers into a copy of the unattend template. The template
// decides which settings exist; an element it lacks is simply not written, so
// a host may ship a reduced template for a guest family.
#include "lib/guestInstall/autoinstall_windows_xml.h"


#include <cstring>

#include "platform/file_replace.h"
#include "platform/xml_unique.h"

namespace tvx::autoinstall {
namespace {

#define OOBE_SHELL                                   \
  "//urn:settings[@pass='oobeSystem']/urn:component" \
  "[@name='Microsoft-Windows-Shell-Setup']"
#define PE_INTERNATIONAL                            \
  "//urn:settings[@pass='windowsPE']/urn:component" \
  "[@name='Microsoft-Windows-International-Core-WinPE']"
#define PE_SETUP                                    \
  "//urn:settings[@pass='windowsPE']/urn:component" \
  "[@name='Microsoft-Windows-Setup']"

constexpr char kLogonUser[] = OOBE_SHELL "/urn:AutoLogon/urn:Username";
constexpr char kAccountName[] =
    OOBE_SHELL "/urn:UserAccounts/urn:LocalAccounts/urn:LocalAccount/urn:Name";
constexpr char kLogonPassword[] = OOBE_SHELL "/urn:AutoLogon/urn:Password/urn:Value";
constexpr char kLogonEnabled[] = OOBE_SHELL "/urn:AutoLogon/urn:Enabled";
constexpr char kAccountPassword[] =
    OOBE_SHELL "/urn:UserAccounts/urn:LocalAccounts/urn:LocalAccount/urn:Password/urn:Value";
constexpr char kTimeZone[] = OOBE_SHELL "/urn:TimeZone";
constexpr const char *kLocales[] = {
    PE_INTERNATIONAL "/urn:InputLocale",
    PE_INTERNATIONAL "/urn:SystemLocale",
    PE_INTERNATIONAL "/urn:UILanguage",
    PE_INTERNATIONAL "/urn:UserLocale",
};
constexpr char kImageName[] =
    PE_SETUP "/urn:ImageInstall/urn:OSImage/urn:InstallFrom/urn:MetaData/urn:Value";
constexpr char kImageSource[] = PE_SETUP "/urn:ImageInstall/urn:OSImage/urn:InstallFrom";
constexpr char kProductKey[] = PE_SETUP "/urn:UserData/urn:ProductKey";
constexpr char kProductKeyValue[] = PE_SETUP "/urn:UserData/urn:ProductKey/urn:Key";
constexpr char kSizedPartitions[] =
    PE_SETUP "/urn:DiskConfiguration/urn:Disk/urn:CreatePartitions/urn:CreatePartition[urn:Size]";
constexpr char kPartitionOrder[] =
    PE_SETUP "/urn:DiskConfiguration/urn:Disk/urn:CreatePartitions/urn:CreatePartition/urn:Order";
constexpr char kTargetPartition[] =
    PE_SETUP "/urn:ImageInstall/urn:OSImage/urn:InstallTo/urn:PartitionID";

// The architecture goes onto every component that Windows setup processes on
// a 64-bit guest; setup ignores components of the wrong architecture.
constexpr const char *kArchComponents[] = {
    PE_SETUP,
    PE_INTERNATIONAL,
    OOBE_SHELL,
    "//urn:settings[@pass='specialize']/urn:component[@name='Microsoft-Windows-Deployment']",
    "//urn:settings[@pass='specialize']/urn:component"
    "[@name='Microsoft-Windows-Security-Licensing-SLC-UX']",
    "//urn:settings[@pass='specialize']/urn:component[@name='Microsoft-Windows-Shell-Setup']",
};

#undef OOBE_SHELL
#undef PE_INTERNATIONAL
#undef PE_SETUP

constexpr char kPowerPlanCommand[] = "powercfg -setactive 8c5e7fda-e8bf-4a96-9a85-a6e23a8c635c";
constexpr char kPasswordAgeCommand[] = "net accounts /MAXPWAGE:UNLIMITED";
constexpr char kNoAutoLogonCommand[] =
    "reg add \"HKLM\\SOFTWARE\\Microsoft\\Windows NT\\CurrentVersion\\Winlogon\" "
    "/v AutoAdminLogon /t REG_SZ /d 0 /f";
constexpr char kHelpStickerCommand[] =
    "reg.exe add HKLM\\Software\\Policies\\Microsoft\\Windows\\EdgeUI "
    "/v DisableHelpSticker /t REG_DWORD /d 1";

bool NonEmpty(const char *s) { return s != nullptr && *s != '\0'; }

// SetupScriptLine picks how the guest-tools setup script runs: releases whose
// tools installer cannot run from the first logon skip it, and servers must
// not reboot on their own.
const char *SetupScriptLine(const char *imageName) {
  for (const char *name : {"Windows Server 2008 R2", "Windows Server 2012", "Windows 7"}) {
    if (std::strstr(imageName, name) != nullptr) return "%TEMP%\\unattend.cmd noInstallTools";
  }
  if (std::strstr(imageName, "Windows Server") != nullptr) {
    return "%TEMP%\\unattend.cmd noautoreboot";
  }
  return "%TEMP%\\unattend.cmd";
}

bool IsEightPreset(uint32_t version) {
  return version == GUESS_VERSION_WINDOWS_8_ENTERPRISE || version == GUESS_VERSION_WINDOWS_8_TRIAL ||
         version == GUESS_VERSION_WINDOWS_81_TRIAL || version == GUESS_VERSION_WINDOWS_81_ENTERPRISE;
}

// SetProductKey: volume-licensed and trial media carry their own key, so the
// answer file must not offer one; retail media need the user's key.
void SetProductKey(xmlXPathContext *ctx, GuestOSID osId, uint32_t version,
                   const char *productKey) {
  if (GuestOS_IsWinEightClient(osId) || GuestOS_IsWinEightServer(osId)) {
    if (!IsEightPreset(version) && NonEmpty(productKey)) {
      AutoInstallXmlSetText(ctx, kProductKeyValue, productKey);
      // A client medium picks its edition from the key.
      if (GuestOS_IsWinEightClient(osId)) AutoInstallXmlRemoveNodes(ctx, kImageSource);
    } else {
      AutoInstallXmlSetText(ctx, kProductKeyValue, "");
    }
  } else if (GuestOS_IsWinTenClient(osId) || GuestOS_IsWinTenServer(osId) ||
             GuestOS_IsWinElevenServer(osId)) {
    if (version == GUESS_VERSION_WINDOWS_10_ENTERPRISE || version == GUESS_VERSION_WINDOWS_10_TRIAL) {
      AutoInstallXmlRemoveNodes(ctx, kProductKey);
    } else {
      AutoInstallXmlSetText(ctx, kProductKeyValue, NonEmpty(productKey) ? productKey : "");
    }
  } else if (!GuestOS_IsWinVista(osId)) {
    AutoInstallXmlRemoveNodes(ctx, kProductKey);
  }
}

void Edit(xmlDoc *doc, xmlXPathContext *ctx, const char *productKey, const char *fullName,
          const char *adminPassword, const char *timeZoneName, GuestOSID osId, uint32_t version,
          const char *language, const char *imageName, Bool autoLogon, Bool keepPartitions) {
  if (NonEmpty(fullName)) {
    AutoInstallXmlSetText(ctx, kLogonUser, fullName);
    AutoInstallXmlSetText(ctx, kAccountName, fullName);
  }

  AutoInstallXmlAddFirstLogonCommand(doc, SetupScriptLine(imageName));
  AutoInstallXmlAddFirstLogonCommand(doc, kPowerPlanCommand);
  AutoInstallXmlAddFirstLogonCommand(doc, kPasswordAgeCommand);

  if (NonEmpty(adminPassword)) {
    AutoInstallXmlSetText(ctx, kLogonPassword, adminPassword);
    AutoInstallXmlSetText(ctx, kLogonEnabled, "true");
    if (!autoLogon) AutoInstallXmlAddFirstLogonCommand(doc, kNoAutoLogonCommand);
    AutoInstallXmlSetText(ctx, kAccountPassword, adminPassword);
  }

  if (NonEmpty(timeZoneName)) AutoInstallXmlSetText(ctx, kTimeZone, timeZoneName);

  if (language != nullptr) {
    for (const char *locale : kLocales) AutoInstallXmlSetText(ctx, locale, language);
  }

  if (GuestOS_Is64Bit(osId)) {
    for (const char *component : kArchComponents) AutoInstallXmlSetAmd64(ctx, component);
  }

  AutoInstallXmlSetText(ctx, kImageName, imageName);
  SetProductKey(ctx, osId, version, productKey);

  if (!keepPartitions) {
    // Only the partition that takes the rest of the disk stays; it becomes
    // the first one and the installation target.
    AutoInstallXmlRemoveNodes(ctx, kSizedPartitions);
    AutoInstallXmlSetText(ctx, kPartitionOrder, "1");
    AutoInstallXmlSetText(ctx, kTargetPartition, "1");
  }

  if (version == GUESS_VERSION_WINDOWS_81_PLAIN || version == GUESS_VERSION_WINDOWS_81_TRIAL ||
      version == GUESS_VERSION_WINDOWS_81_ENTERPRISE) {
    AutoInstallXmlAddFirstLogonCommand(doc, kHelpStickerCommand);
  }
}

}  // namespace

Bool AutoInstallEditUnattendXml(const char *xmlPath, const char *productKey,
                                const char *fullName, const char *adminPassword,
                                const char *timeZoneName, GuestOSID osId, uint32_t version,
                                const char *language, const char *imageName, Bool autoLogon,
                                Bool keepPartitions) {
  if (xmlPath == nullptr || imageName == nullptr) return FALSE;
  // A text that XML cannot carry would be skipped element by element and
  // leave, say, the template's user name in place: refuse the whole edit.
  for (const char *text : {productKey, fullName, adminPassword, timeZoneName, language, imageName}) {
    if (!AutoInstallXmlTextIsValid(text)) return FALSE;
  }

  const tvx::XmlApi *xml = tvx::LoadXml();
  if (xml == nullptr) return FALSE;
  // Templates are local files: no network access, entities left as references
  // rather than expanded, and no parser chatter on the host's standard error.
  tvx::UniquePtr<xmlDoc> doc(
      xml->xmlReadFile(xmlPath, nullptr, XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
  if (doc == nullptr) return FALSE;
  tvx::UniquePtr<xmlXPathContext> ctx(AutoInstallXmlNewContext(doc.get()));
  if (ctx == nullptr) return FALSE;

  Edit(doc.get(), ctx.get(), productKey, fullName, adminPassword, timeZoneName, osId, version,
       language, imageName, autoLogon, keepPartitions);

  ctx.reset();
  // The file holds the password: it is replaced as a private file, never
  // written through whatever link its name might be.
  xmlChar *text = nullptr;
  int size = 0;
  xml->xmlDocDumpMemory(doc.get(), &text, &size);
  tvx::XmlChars owned(text);
  if (text == nullptr || size < 0) return FALSE;
  FileReplaceOptions options;
  options.links = FileLinkPolicy::kReplaceLink;
  options.secret = true;
  return File_ReplaceContents(
      xmlPath, std::string_view(reinterpret_cast<const char *>(text), static_cast<size_t>(size)),
      options);
}

}  // namespace tvx::autoinstall
