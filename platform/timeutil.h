// The host's time zone in the terms Windows setup uses.
#pragma once

// TimeUtil_GetLocalWindowsTimeZoneIndexAndName returns the host's current
// time zone as a Windows time-zone index (the number that pre-Vista answer
// files take), or -1 when the zone has no such number or is unknown. Through
// `out_name` (optional) it stores the zone's Windows name ("W. Europe Standard
// Time", malloc'd; free with free), or null when the zone has no Windows name.
// The host zone is, in this order: $TZ (a zone name, ":name", or a path below
// a zoneinfo directory), the link /etc/localtime, /etc/timezone, and finally
// what ICU settles on.
int TimeUtil_GetLocalWindowsTimeZoneIndexAndName(char **out_name);

// TimeUtil_WindowsZoneForId is the lookup behind it for an IANA zone id
// ("Europe/Berlin", aliases included): same results and ownership.
int TimeUtil_WindowsZoneForId(const char *zoneId, char **out_name);

// TimeUtil_WindowsZoneIndex maps a Windows zone name to its index number;
// -1 when the name has none.
int TimeUtil_WindowsZoneIndex(const char *windowsName);
