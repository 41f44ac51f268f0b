// Fixed texts of the launcher: option words, property keys, file names and
// placeholders. They are the launcher's external interface, so every one of
// them is named here once and used by name everywhere else.
#ifndef RCP_LAUNCHER_CONSTANTS_H
#define RCP_LAUNCHER_CONSTANTS_H

// ---- Launcher options (compared exactly and case-sensitively) ----
inline constexpr const wchar_t* VERSIONARG = L"-version";
inline constexpr const wchar_t* RESTARTARG = L"-restart";
inline constexpr const wchar_t* DEBUGARG = L"-debug";
inline constexpr const wchar_t* CONSOLEARG = L"-console";
inline constexpr const wchar_t* CONSOLELOGARG = L"-consoleLog";
inline constexpr const wchar_t* RCPLAUNCHERWAIT = L"-rcpLauncherWait";
inline constexpr const wchar_t* PROVMANIFESTARG = L"-provManifest";
inline constexpr const wchar_t* RESETCONFIGARG = L"-resetconfig";
inline constexpr const wchar_t* VMARG = L"-vm";
inline constexpr const wchar_t* VMARGS = L"-vmargs";
inline constexpr const wchar_t* INITMUSERVICEARG = L"-initMUService";
inline constexpr const wchar_t* DATAARG = L"-data";
inline constexpr const wchar_t* CONFIGARG = L"-configuration";
inline constexpr const wchar_t* APPARG = L"-application";
inline constexpr const wchar_t* PLUGINCUSTARG = L"-plugincustomization";
inline constexpr const wchar_t* PRODUCTARG = L"-product";
inline constexpr const wchar_t* PERSONALITYARG = L"-personality";
inline constexpr const wchar_t* NLARG = L"-nl";
inline constexpr const wchar_t* DIRARG = L"-dir";
inline constexpr const wchar_t* CONFIGOPTARG = L"-config";
inline constexpr const wchar_t* INITIALCOMPLETEFLAG = L"-initialCompleteFlag";
inline constexpr const wchar_t* PERFJARARG = L"-perfJar";
inline constexpr const wchar_t* STARTUPARG = L"-startup";
inline constexpr const wchar_t* CPARG = L"-cp";
inline constexpr const wchar_t* USEDAEMON = L"-useDaemon";
inline constexpr const wchar_t* NOSPLASHARG = L"-nosplash";
inline constexpr const wchar_t* USERPROVLAUNCHARG = L"-userProvLaunch";
inline constexpr const wchar_t* _JVMARG_XstartOnFirstThread = L"-XstartOnFirstThread";

inline constexpr const char* BUILDDATE_A = "2006-06-27";
inline constexpr const wchar_t* BUILDDATE = L"2006-06-27";

// ---- Files and directories ----
inline constexpr const wchar_t* RCP_LAUNCHER_PROPERTIES_FILE = L"/rcp/rcplauncher.properties";
inline constexpr const wchar_t* INSTALL_PROPS = L"rcpinstall.properties";
inline constexpr const wchar_t* JVM_PROPERTIES = L"jvm.properties";
inline constexpr const wchar_t* ARGS_PROPERTIES = L"args.properties";
inline constexpr const wchar_t* CONFIG_INI = L"config.ini";
inline constexpr const wchar_t* PLATFORM_XML = L"platform.xml";
inline constexpr const wchar_t* UPDATE_DIR = L"org.eclipse.update";
inline constexpr const wchar_t* RCP_LOCK_FILE = L".rcp.lock";
inline constexpr const wchar_t* SID_FILE = L".sid";
inline constexpr const wchar_t* LOG_DIR = L"logs";
inline constexpr const wchar_t* RCP_LOG_FILE = L"rcplauncher.log";
inline constexpr const char* LOG_FILE = "/var/log/rcplauncher.log";
// The shared temporary directory: the log of a launch that ends early, and
// the preload link "kel.rcp.<user>.<id>.<library>".
inline constexpr const wchar_t* TEMP_DIR = L"/tmp";
inline constexpr const wchar_t* TEMP_PREFIX = L"kel.rcp";
inline constexpr const wchar_t* WORKSPACE_LOC = L"/eclipse/.workspace";
inline constexpr const wchar_t* CONFIG_LOC = L"/eclipse/.config";
inline constexpr const wchar_t* MUSVC_WORKSPACE_LOC = L"/eclipse/.muservice";
inline constexpr const wchar_t* MUSVC_CONFIG_LOC = L"/eclipse/.muservice/.config";
inline constexpr const wchar_t* USER_WORKSPACE_MIDDLE = L"/KEL/RCP/";
inline constexpr const wchar_t* CONFIG_SUBDIR = L"/.config";
inline constexpr const wchar_t* BASE_ECLIPSE_PATH = L"/macosx/x86/eclipse";
inline constexpr const wchar_t* LAUNCHER_JAR = L"launcher.jar";
inline constexpr const wchar_t* STARTUP_JAR = L"startup.jar";
inline constexpr const wchar_t* MAIN_CLASS = L"org.eclipse.core.launcher.Main";
inline constexpr const char* CMD_FILE = "/tmp/zon_shutdown";
// Site of the user's own features and plug-ins inside the workspace, and the
// installation's shared extension marker copied into it.
inline constexpr const wchar_t* SITE_LOC = L"/applications/eclipse";
inline constexpr const wchar_t* SITE_FEATURES_DIR = L"/features";
inline constexpr const wchar_t* SITE_PLUGINS_DIR = L"/plugins";
inline constexpr const wchar_t* ECLIPSE_EXTENSION_FILE = L"/.eclipseextension";
inline constexpr const wchar_t* SHARED_EXTENSION_LOC = L"/shared/eclipse/.eclipseextension";
inline constexpr int MAX_RETRIES = 10;

// ---- Property keys ----
inline constexpr const wchar_t* CONFIGURATION_PROPERTY = L"install.configuration";
inline constexpr const wchar_t* RCP_BASE_LOC_PROPERTY = L"rcp.base.location";
inline constexpr const wchar_t* RCP_INSTALL_ID_PROPERTY = L"rcp.install.id";
inline constexpr const wchar_t* RCP_DATA_PROPERTY = L"rcp.data";
inline constexpr const wchar_t* JVM_LOCATION = L"jvm.location";
inline constexpr const wchar_t* VM = L"vm";
inline constexpr const wchar_t* CLASSPATH = L"cp";
inline constexpr const wchar_t* VMARG_PROPERTY = L"vmarg.";
inline constexpr const wchar_t* VMFIXARG_PROPERTY = L"vmfix.noconsole";
inline constexpr const wchar_t* XBOOTCLASSPATH_PREPEND = L"Xbootclasspath.prepend";
inline constexpr const wchar_t* XBOOTCLASSPATH_APPEND = L"Xbootclasspath.append";
inline constexpr const wchar_t* OSGI_SPLASH_PATH = L"osgi.splashPath";
inline constexpr const wchar_t* UPDATE_POLICY_MGD = L"update.policy.managed";
inline constexpr const wchar_t* LOCALE_PROPERTY = L"com.kel.rcp.core.locale";
inline constexpr const wchar_t* BIDI_PROPERTY = L"com.kel.rcp.core.bidi";
inline constexpr const wchar_t* APPLICATION_PROPERTY = L"application";
inline constexpr const wchar_t* PLUGINCUST_PROPERTY = L"plugincustomization";
inline constexpr const wchar_t* PRODUCT_PROPERTY = L"product";
inline constexpr const wchar_t* PERSONALITY_PROPERTY = L"personality";
inline constexpr const wchar_t* ENV_SET_PREFIX = L"env.set";
inline constexpr const wchar_t* LIBRARY_PATH_PREPEND = L"library.path.prepend";
inline constexpr const wchar_t* LIBRARY_PATH_APPEND = L"library.path.append";
inline constexpr const wchar_t* LD_PRELOAD = L"library.preload";
inline constexpr const wchar_t* ENV_JAVA_HIGH_ZIPFDS = L"env.JAVA_HIGH_ZIPFDS";
inline constexpr const wchar_t* RESET_DIR_PREFIX = L"resetDir.";
inline constexpr const wchar_t* PROVISIONING = L"provisioning";
inline constexpr const wchar_t* PROV_MANIFEST_VERSION = L"provisioning.manifest.version";
inline constexpr const wchar_t* PROV_APP_PROPERTY = L"provisioning.application";
inline constexpr const wchar_t* SHARECLASSES_PROPERTY = L"jvm.shareclasses.fullpath";
inline constexpr const wchar_t* CONFIG_INITIAL_PREFIX = L"config.initial.";

// ---- Install configuration words ----
inline constexpr const wchar_t* SERVICE_CFG = L"service";
inline constexpr const wchar_t* USER_CFG = L"user";
inline constexpr const wchar_t* SERIAL_USER_CFG = L"serial.multiuser";
inline constexpr const wchar_t* LOCKDOWN_CFG = L"lockdown";
inline constexpr const wchar_t* USERPB_CFG = L"userpb";
inline constexpr const wchar_t* MULTIUSER_CFG = L"multiuser";

// ---- Placeholders ----
inline constexpr const wchar_t* RCPHOME_REPLACE = L"${rcp.home}";
inline constexpr const wchar_t* RCPDATA_REPLACE = L"${rcp.data}";
inline constexpr const wchar_t* WORKSPACELOCATION_REPLACE = L"${workspace.location}";
inline constexpr const wchar_t* JVM_FEATUREID_REPLACE = L"${jvm.feature.id}";
inline constexpr const wchar_t* JVM_PARENT_FEATUREID_REPLACE = L"${jvm.parent.feature.id}";

// ---- System properties written for the JVM ----
inline constexpr const wchar_t* D_RCP_HOME = L"-Drcp.home";
inline constexpr const wchar_t* D_RCP_DATA = L"-Drcp.data";
inline constexpr const wchar_t* D_RCP_INSTALL_ID_PROP = L"-Dcom.kel.rcp.install.id";
inline constexpr const wchar_t* D_CONFIG = L"-Drcp.install.config";
inline constexpr const wchar_t* D_OSGI_INSTALL_AREA = L"-Drcp.osgi.install.area";
inline constexpr const wchar_t* INSTALL_AREA_DIR = L"/eclipse";
inline constexpr const wchar_t* INSTALL_AREA_FALLBACK_DIR = L"/rcp/eclipse";
inline constexpr const wchar_t* SYSPROP_PREFIX = L"-D";  // install properties passed as system properties
inline constexpr const wchar_t* XARG_PREFIX = L"-X";     // install properties passed as -X options
inline constexpr const wchar_t* TRUE_VALUE = L"true";
inline constexpr const wchar_t* XBOOTCLASSPATH_P = L"-Xbootclasspath/p:";
inline constexpr const wchar_t* XBOOTCLASSPATH_A = L"-Xbootclasspath/a:";
inline constexpr const wchar_t* EQUALS_CHAR = L"=";
inline constexpr const wchar_t* NEWLINE = L"\n";
inline constexpr const wchar_t* BS_CHAR = L"\\";

// ---- Environment ----
inline constexpr const wchar_t* USER_IN_ENV = L"USER";
inline constexpr const wchar_t* USER_HOME = L"HOME";
inline constexpr const wchar_t* JAVA_HOME_KEY = L"JAVA_HOME";
inline constexpr const wchar_t* LIBRARY_PATH_ENV_VAR = L"LD_LIBRARY_PATH";
inline constexpr const wchar_t* LD_PRELOAD_ENV_VAR = L"LD_PRELOAD";
inline constexpr const wchar_t* ENV_JAVA_HIGH_ZIPFDS_ENV_VAR = L"JAVA_HIGH_ZIPFDS";
inline constexpr const wchar_t* JAVA_HIGH_ZIPFDS_DEFAULT = L"500";
inline constexpr const wchar_t* PATH_SEPARATOR = L":";
inline constexpr const wchar_t* MUSERVICE_USER = L"muservice";

// ---- Texts of single modules ----
// Placeholder syntax
inline constexpr const wchar_t* PH_OPEN = L"${";
inline constexpr wchar_t PH_CLOSE = L'}';
inline constexpr const wchar_t* ENV_PREFIX = L"env.";
inline constexpr const wchar_t* PROP_PREFIX = L"prop.";
// Template sub-folders below <core>/config and the startup record keys
inline constexpr const wchar_t* CORE_CONFIG_DIR = L"config";
inline constexpr const wchar_t* CORE_SUBDIR_MUSERVICE = L"muservice";
inline constexpr const wchar_t* CORE_SUBDIR_USER = L"user";
inline constexpr const wchar_t* CORE_SUBDIR_PBUILDER = L"pbuilder";
inline constexpr const wchar_t* ARG_KEY_PREFIX = L"arg";
inline constexpr const wchar_t* ARGC_KEY = L"argc";
// Reset: saved copies, the backup suffix and the plug-in state directory
inline constexpr const wchar_t* REGISTRY_FILE = L"registry";
inline constexpr const wchar_t* REGISTRY_SAVED = L"registry.old";
inline constexpr const wchar_t* PLATFORM_XML_SAVED = L"platform.xml.old";
inline constexpr const wchar_t* BACKUP_SUFFIX = L"bak";
inline constexpr const wchar_t* METADATA_DIR = L".metadata";
inline constexpr const wchar_t* PLUGINS_DIR = L".plugins";
// Per-user files: work names (".base": the plain copy of the base file while
// the per-user file is being made) and the line written for a JVM feature.
inline constexpr const wchar_t* WORK_FILE_SUFFIX = L".new";
inline constexpr const wchar_t* BASE_COPY_SUFFIX = L".base";
inline constexpr const wchar_t* FEATURE_LINE = L"<feature>";

#endif  // RCP_LAUNCHER_CONSTANTS_H
