/*
 * tiktal.h - C interface of the tiktal driver library.
 *
 * Open a session with tiktal_init and a resource name:
 *   "SyncTestInternal___"       a call-tracing session that prints every call;
 *   "sync://HOST/DEVICE"        a remote time service;
 *   a device alias or PXI name  a timing module in this machine.
 * Every function returns a ViStatus: 0 success, negative error, positive warning.
 * tiktal_error_message turns any status into its text.
 *
 * Text outputs follow the IVI size query: called with bufferSize 0 and a null buffer, the
 * function returns the size needed (text length + 1) as a positive status.
 */
#ifndef TIKTAL_TIKTAL_H
#define TIKTAL_TIKTAL_H

#ifdef __cplusplus
extern "C" {
#endif

/* ---- IVI scalar types ---------------------------------------------------------------- */

#ifndef TIKTAL_VI_TYPES_DEFINED
#define TIKTAL_VI_TYPES_DEFINED
typedef unsigned int ViUInt32;
typedef signed int ViInt32;
typedef unsigned short ViUInt16;
typedef signed short ViInt16;
typedef unsigned char ViUInt8;
typedef unsigned long long ViUInt64;
typedef ViUInt16 ViBoolean;
typedef double ViReal64;
typedef char ViChar;
typedef ViUInt32 ViSession;
typedef ViInt32 ViStatus;
typedef ViUInt32 ViAttr;
typedef const ViChar* ViConstString;
typedef const ViChar* ViRsrc;
#endif

#ifndef VI_SUCCESS
#define VI_SUCCESS ((ViStatus)0)
#endif
#ifndef VI_NULL
#define VI_NULL 0
#endif
#ifndef VI_TRUE
#define VI_TRUE ((ViBoolean)1)
#endif
#ifndef VI_FALSE
#define VI_FALSE ((ViBoolean)0)
#endif
/* On Windows every function is __stdcall, and the library's module-definition file names what it
   exports; applications import. */
#ifndef _VI_FUNC
#if defined(_WIN32)
#define _VI_FUNC __stdcall
#else
#define _VI_FUNC
#endif
#endif

#if defined(_WIN32) && defined(TIKTAL_BUILDING_LIBRARY)
#define TIKTAL_API
#elif defined(_WIN32)
#define TIKTAL_API __declspec(dllimport)
#elif defined(__GNUC__)
#define TIKTAL_API __attribute__((visibility("default")))
#else
#define TIKTAL_API
#endif

/* ---- Status codes -------------------------------------------------------------------- */

/* tiktal_error_message needs a buffer of this many bytes. */
#define TIKTAL_ERROR_MESSAGE_SIZE 256

#define tiktalerr_warn_unknownStatus                ((ViStatus)0x3FFF0085L)
#define tiktalerr_warn_networkClientInProgress      ((ViStatus)0x3FFA4064L)
#define tiktalerr_warn_notCalibrated                ((ViStatus)0x3FFA403CL)
#define tiktalerr_invParameter                      ((ViStatus)0xBFFF0078L)
#define tiktalerr_destTerminalInUse                 ((ViStatus)0xBFFF0042L)
#define tiktalerr_outOfMemory                       ((ViStatus)0xBFFF003CL)
#define tiktalerr_attrReadonly                      ((ViStatus)0xBFFF001FL)
#define tiktalerr_nsupAttrValue                     ((ViStatus)0xBFFF001EL)
#define tiktalerr_nsupAttr                          ((ViStatus)0xBFFF001DL)
#define tiktalerr_invalidObject                     ((ViStatus)0xBFFF000EL)
#define tiktalerr_remoteServiceCommunicationFailure ((ViStatus)0xBFFA406FL)
#define tiktalerr_attrNotAvailable                  ((ViStatus)0xBFFA406EL)
#define tiktalerr_trConflict                        ((ViStatus)0xBFFA406DL)
#define tiktalerr_remoteDeviceResourceNotFound      ((ViStatus)0xBFFA406CL)
#define tiktalerr_trAlreadyExists                   ((ViStatus)0xBFFA406BL)
#define tiktalerr_invalidResourceNameFormat         ((ViStatus)0xBFFA406AL)
#define tiktalerr_libLoadFailure                    ((ViStatus)0xBFFA4069L)
#define tiktalerr_remoteDeviceCommunicationFailure  ((ViStatus)0xBFFA4068L)
#define tiktalerr_remoteDeviceDataInvalid           ((ViStatus)0xBFFA4067L)
#define tiktalerr_trInstanceNotFound                ((ViStatus)0xBFFA4066L)
#define tiktalerr_trTypeMismatch                    ((ViStatus)0xBFFA4065L)
#define tiktalerr_boardTimeSnappedBack              ((ViStatus)0xBFFA4064L)
#define tiktalerr_futureTimeEventRearmViolation     ((ViStatus)0xBFFA4063L)
#define tiktalerr_decimationCountTooGreat           ((ViStatus)0xBFFA4062L)
#define tiktalerr_decimationCountZero               ((ViStatus)0xBFFA4061L)
#define tiktalerr_decimationNotSupported            ((ViStatus)0xBFFA4060L)
#define tiktalerr_noSharedTriggerLines              ((ViStatus)0xBFFA405FL)
#define tiktalerr_nicNotFound                       ((ViStatus)0xBFFA405EL)
#define tiktalerr_clockPeriodTooLarge               ((ViStatus)0xBFFA405DL)
#define tiktalerr_1588AdjustmentTooLarge            ((ViStatus)0xBFFA405CL)
#define tiktalerr_invalidInitialTime                ((ViStatus)0xBFFA405BL)
#define tiktalerr_1588SyncIntervalMismatch          ((ViStatus)0xBFFA405AL)
#define tiktalerr_duplicateFutureTimeEvent          ((ViStatus)0xBFFA4059L)
#define tiktalerr_clockPeriodTooShort               ((ViStatus)0xBFFA4058L)
#define tiktalerr_futureTimeEventTooSoon            ((ViStatus)0xBFFA4057L)
#define tiktalerr_ipAddressUnknown                  ((ViStatus)0xBFFA4056L)
#define tiktalerr_attrNotSettableInPtpState         ((ViStatus)0xBFFA4055L)
#define tiktalerr_ptpNotStarted                     ((ViStatus)0xBFFA4054L)
#define tiktalerr_ptpAlreadyStarted                 ((ViStatus)0xBFFA4053L)
#define tiktalerr_1588TimeTooLate                   ((ViStatus)0xBFFA4052L)
#define tiktalerr_1588TimeTooEarly                  ((ViStatus)0xBFFA4051L)
#define tiktalerr_1588TimeOverflow                  ((ViStatus)0xBFFA4050L)
#define tiktalerr_terminalNotSpecified              ((ViStatus)0xBFFA404EL)
#define tiktalerr_abortInProgress                   ((ViStatus)0xBFFA404DL)
#define tiktalerr_sessionAborted                    ((ViStatus)0xBFFA404CL)
#define tiktalerr_socketFailure                     ((ViStatus)0xBFFA404BL)
#define tiktalerr_softwareBufferFull                ((ViStatus)0xBFFA404AL)
#define tiktalerr_hardwareBufferFull                ((ViStatus)0xBFFA4049L)
#define tiktalerr_rsrcNotReserved                   ((ViStatus)0xBFFA4048L)
#define tiktalerr_rsrcAlreadyReserved               ((ViStatus)0xBFFA4047L)
#define tiktalerr_rsrcUnavailable                   ((ViStatus)0xBFFA4046L)
#define tiktalerr_calNotPermitted                   ((ViStatus)0xBFFA403EL)
#define tiktalerr_calPasswordTooLong                ((ViStatus)0xBFFA403DL)
#define tiktalerr_calPasswordIncorrect              ((ViStatus)0xBFFA403CL)
#define tiktalerr_clk10InNotInSystemTimingSlot      ((ViStatus)0xBFFA403BL)
#define tiktalerr_starDestNotInSystemTimingSlot     ((ViStatus)0xBFFA403AL)
#define tiktalerr_starSrcNotInSystemTimingSlot      ((ViStatus)0xBFFA4039L)
#define tiktalerr_chassisNotIdentifiedDest          ((ViStatus)0xBFFA4038L)
#define tiktalerr_chassisNotIdentifiedSrc           ((ViStatus)0xBFFA4037L)
#define tiktalerr_invalidTerminal                   ((ViStatus)0xBFFA4036L)
#define tiktalerr_syncClkInvalid                    ((ViStatus)0xBFFA4035L)
#define tiktalerr_terminalNotConnected              ((ViStatus)0xBFFA4034L)
#define tiktalerr_invalidDestTerminal               ((ViStatus)0xBFFA4033L)
#define tiktalerr_invalidSrcTerminal                ((ViStatus)0xBFFA4032L)
#define tiktalerr_ddsIncompatibleSyncClk            ((ViStatus)0xBFFA402BL)
#define tiktalerr_ddsRunning                        ((ViStatus)0xBFFA402AL)
#define tiktalerr_ddsNotSupported                   ((ViStatus)0xBFFA4029L)
#define tiktalerr_pllNotSupported                   ((ViStatus)0xBFFA4028L)
#define tiktalerr_clk10NotPresent                   ((ViStatus)0xBFFA4020L)
#define tiktalerr_deviceNotInitialized              ((ViStatus)0xBFFA401FL)
#define tiktalerr_firmwareLoadFailure               ((ViStatus)0xBFFA401EL)
#define tiktalerr_remoteDeviceNotAllowed            ((ViStatus)0xBFFA401AL)
#define tiktalerr_overflow                          ((ViStatus)0xBFFA4019L)
#define tiktalerr_internalHardware                  ((ViStatus)0xBFFA4018L)
#define tiktalerr_deviceNotReady                    ((ViStatus)0xBFFA4017L)
#define tiktalerr_deviceNotFound                    ((ViStatus)0xBFFA4016L)
#define tiktalerr_writeFailure                      ((ViStatus)0xBFFA4015L)
#define tiktalerr_readFailure                       ((ViStatus)0xBFFA4014L)
#define tiktalerr_timeout                           ((ViStatus)0xBFFA400BL)
#define tiktalerr_driverInitFailure                 ((ViStatus)0xBFFA400AL)
#define tiktalerr_runtimeCommunicationFailure       ((ViStatus)0xBFFA4009L)
#define tiktalerr_invalidType                       ((ViStatus)0xBFFA4008L)
#define tiktalerr_resetNotSupported                 ((ViStatus)0xBFFA4007L)
#define tiktalerr_fileIO                            ((ViStatus)0xBFFA4006L)
#define tiktalerr_internalSoftware                  ((ViStatus)0xBFFA4005L)
#define tiktalerr_versionMismatch                   ((ViStatus)0xBFFA4004L)
#define tiktalerr_featureNotSupported               ((ViStatus)0xBFFA4003L)
#define tiktalerr_invalidMode                       ((ViStatus)0xBFFA4002L)
#define tiktalerr_invalidDescriptor                 ((ViStatus)0xBFFA4001L)
/* Statuses of the platform layer and of the device configuration, passed on as they are. */
#define tiktalerr_warn_operationPending             ((ViStatus)52011L)
#define tiktalerr_osFault                           ((ViStatus)-52008L)
#define tiktalerr_accessDenied                      ((ViStatus)-52009L)
#define tiktalerr_objectNameCollision               ((ViStatus)-52013L)
#define tiktalerr_bufferTooSmall                    ((ViStatus)-52019L)
#define tiktalerr_configFileTooNew                  ((ViStatus)0xBFFA917DL)
#define tiktalerr_configFileTooOld                  ((ViStatus)0xBFFA917EL)
#define tiktalerr_deviceEntryNotFound               ((ViStatus)0xBFFA917FL)

/* ---- Attributes of a timing module (terminalName is ignored) ------------------------- */

#define TIKTAL_ATTR_SERIAL_NUMBER        1150001UL /* Int32, read */
#define TIKTAL_ATTR_DEVICE_ID            1150002UL /* Int32, read */
#define TIKTAL_ATTR_TERMINAL_58_VALUE    1150100UL /* Real64, read and write */
#define TIKTAL_ATTR_TERMINAL_65_VALUE    1150101UL /* Real64, read and write */
#define TIKTAL_ATTR_TERMINAL_72_VALUE    1150102UL /* Real64, read and write */
#define TIKTAL_ATTR_TERMINAL_79_VALUE    1150103UL /* Real64, read and write */
#define TIKTAL_ATTR_TERMINAL_86_VALUE    1150104UL /* Real64, read and write */
#define TIKTAL_ATTR_TERMINAL_93_VALUE    1150105UL /* Real64, read and write */

/* ---- Attributes of a time service (terminalName names the time reference) ----------- */

#define TIKTAL_ATTR_1588_PORT_STATE                      1150712UL /* Int32 */
#define TIKTAL_ATTR_1588_STEPS_REMOVED                   1150716UL /* Int32 */
#define TIKTAL_ATTR_1588_CLOCK_ID                        1150729UL /* String */
#define TIKTAL_ATTR_1588_CLOCK_CLASS                     1150730UL /* Int32 */
#define TIKTAL_ATTR_1588_CLOCK_ACCURACY                  1150731UL /* Int32 */
#define TIKTAL_ATTR_1588_PRIORITY1                       1150732UL /* Int32 */
#define TIKTAL_ATTR_1588_PRIORITY2                       1150733UL /* Int32 */
#define TIKTAL_ATTR_1588_GM_CLOCK_ID                     1150734UL /* String */
#define TIKTAL_ATTR_1588_GM_CLOCK_CLASS                  1150735UL /* Int32 */
#define TIKTAL_ATTR_1588_GM_CLOCK_ACCURACY               1150736UL /* Int32 */
#define TIKTAL_ATTR_1588_GM_PRIORITY1                    1150737UL /* Int32 */
#define TIKTAL_ATTR_1588_GM_PRIORITY2                    1150738UL /* Int32 */
#define TIKTAL_ATTR_1588_LOG_SYNC_INTERVAL               1150739UL /* Int32 */
#define TIKTAL_ATTR_1588_MEAN_PATH_DELAY                 1150740UL /* Real64 */
#define TIKTAL_ATTR_1588_GM_IP_ADDRESS                   1150741UL /* String */
#define TIKTAL_ATTR_1588_BMCA_MODE                       1150742UL /* Int32 */
#define TIKTAL_ATTR_1588_INTERFACE                       1150743UL /* String */
#define TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET       1150802UL /* Real64 */
#define TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET_NS    1150808UL /* Real64 */
#define TIKTAL_ATTR_SELECTED_TIME_REFERENCE_TYPE         1150809UL /* String */
#define TIKTAL_ATTR_TIME_REFERENCE_TYPE                  1150810UL /* String */
#define TIKTAL_ATTR_SELECTED_TIME_REFERENCE              1150811UL /* String */
#define TIKTAL_ATTR_TIME_REFERENCE_ENABLED               1150812UL /* Boolean */
#define TIKTAL_ATTR_TIME_REFERENCE_SELECTED              1150813UL /* Boolean */
#define TIKTAL_ATTR_8021AS_PORT_STATE                    1151100UL /* Int32 */
#define TIKTAL_ATTR_8021AS_CLOCK_ID                      1151101UL /* String */
#define TIKTAL_ATTR_8021AS_CLOCK_CLASS                   1151102UL /* Int32 */
#define TIKTAL_ATTR_8021AS_CLOCK_ACCURACY                1151103UL /* Int32 */
#define TIKTAL_ATTR_8021AS_PRIORITY1                     1151104UL /* Int32 */
#define TIKTAL_ATTR_8021AS_PRIORITY2                     1151105UL /* Int32 */
#define TIKTAL_ATTR_8021AS_GM_CLOCK_ID                   1151106UL /* String */
#define TIKTAL_ATTR_8021AS_GM_CLOCK_CLASS                1151107UL /* Int32 */
#define TIKTAL_ATTR_8021AS_GM_CLOCK_ACCURACY             1151108UL /* Int32 */
#define TIKTAL_ATTR_8021AS_GM_PRIORITY1                  1151109UL /* Int32 */
#define TIKTAL_ATTR_8021AS_GM_PRIORITY2                  1151110UL /* Int32 */
#define TIKTAL_ATTR_8021AS_LOG_SYNC_INTERVAL             1151111UL /* Int32 */
#define TIKTAL_ATTR_8021AS_LOG_ANNOUNCE_INTERVAL         1151112UL /* Int32 */
#define TIKTAL_ATTR_8021AS_INTERFACE                     1151113UL /* String */
#define TIKTAL_ATTR_8021AS_NEIGHBOR_PROP_DELAY_THRESHOLD 1151114UL /* Int32 */
#define TIKTAL_ATTR_8021AS_AS_CAPABLE                    1151115UL /* Boolean */

/* ---- Functions ----------------------------------------------------------------------- */

TIKTAL_API ViStatus _VI_FUNC tiktal_init(ViRsrc resourceName, ViBoolean idQuery, ViBoolean reset, ViSession* vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_close(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_GVInit(ViRsrc resourceName, ViBoolean idQuery, ViBoolean reset, ViSession* vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_GVClose(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_error_message(ViSession vi, ViStatus errorCode, ViChar errorMessage[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetErrorInfo(ViSession vi, ViStatus* errorCode, ViInt32 bufferSize, ViChar description[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_reset(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_self_test(ViSession vi, ViInt16* selfTestResult, ViChar selfTestMessage[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_revision_query(ViSession vi, ViChar instrumentDriverRevision[], ViChar firmwareRevision[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_ConfigureFPGA(ViSession vi, ViConstString fpgaProgramPath);
TIKTAL_API ViStatus _VI_FUNC tiktal_DownloadFPGABitArray(ViSession vi, ViUInt8* bitArray, ViInt32 bitArraySize);
TIKTAL_API ViStatus _VI_FUNC tiktal_PersistConfig(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_ConnectTrigTerminals(ViSession vi, ViConstString srcTerminal, ViConstString destTerminal, ViConstString syncClock, ViInt32 invert, ViInt32 updateEdge);
TIKTAL_API ViStatus _VI_FUNC tiktal_DisconnectTrigTerminals(ViSession vi, ViConstString srcTerminal, ViConstString destTerminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetTrigTerminalConnectionInfo(ViSession vi, ViConstString destTerminal, ViChar srcTerminal[], ViChar syncClock[], ViInt32* invert, ViInt32* updateEdge);
TIKTAL_API ViStatus _VI_FUNC tiktal_ConnectSWTrigToTerminal(ViSession vi, ViConstString srcTerminal, ViConstString destTerminal, ViConstString syncClock, ViInt32 invert, ViInt32 updateEdge, ViReal64 delay);
TIKTAL_API ViStatus _VI_FUNC tiktal_DisconnectSWTrigFromTerminal(ViSession vi, ViConstString srcTerminal, ViConstString destTerminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetSWTrigConnectionInfo(ViSession vi, ViConstString destTerminal, ViChar srcTerminal[], ViChar syncClk[], ViInt32* invert, ViInt32* updateEdge, ViReal64* delay);
TIKTAL_API ViStatus _VI_FUNC tiktal_SendSoftwareTrigger(ViSession vi, ViConstString srcTerminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_ConnectClkTerminals(ViSession vi, ViConstString srcTerminal, ViConstString destTerminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_DisconnectClkTerminals(ViSession vi, ViConstString srcTerminal, ViConstString destTerminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetClkTerminalConnectionInfo(ViSession vi, ViConstString destTerminal, ViChar srcTerminal[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_MeasureFrequency(ViSession vi, ViConstString srcTerminal, ViReal64 duration, ViReal64* actualDuration, ViReal64* frequency, ViReal64* error);
TIKTAL_API ViStatus _VI_FUNC tiktal_MeasureFrequencyEx(ViSession vi, ViConstString srcTerminal, ViReal64 duration, ViUInt32 decimationCount, ViReal64* actualDuration, ViReal64* frequency, ViReal64* frequencyError);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetAttributeViInt32(ViSession vi, ViConstString terminalName, ViAttr attribute, ViInt32* value);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetAttributeViReal64(ViSession vi, ViConstString terminalName, ViAttr attribute, ViReal64* value);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetAttributeViBoolean(ViSession vi, ViConstString terminalName, ViAttr attribute, ViBoolean* value);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetAttributeViSession(ViSession vi, ViConstString terminalName, ViAttr attribute, ViSession* value);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetAttributeViString(ViSession vi, ViConstString terminalName, ViAttr attribute, ViInt32 bufferSize, ViChar valueString[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetAttributeViInt32(ViSession vi, ViConstString terminalName, ViAttr attribute, ViInt32 value);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetAttributeViReal64(ViSession vi, ViConstString terminalName, ViAttr attribute, ViReal64 value);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetAttributeViBoolean(ViSession vi, ViConstString terminalName, ViAttr attribute, ViBoolean value);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetAttributeViSession(ViSession vi, ViConstString terminalName, ViAttr attribute, ViSession value);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetAttributeViString(ViSession vi, ViConstString terminalName, ViAttr attribute, ViConstString value);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetAttributeGVStrHandle(ViSession vi, ViConstString terminalName, ViAttr attribute, void* gvStrHandle);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetAttributeGVStrHandle(ViSession vi, ViConstString terminalName, ViAttr attribute, void* gvStrHandle);
TIKTAL_API ViStatus _VI_FUNC tiktal_InitExtCal(ViSession vi, ViConstString password, void* reserved);
TIKTAL_API ViStatus _VI_FUNC tiktal_CloseExtCal(ViSession vi, ViInt32 action);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetExtCalLastDateAndTime(ViSession vi, ViInt32* year, ViInt32* month, ViInt32* day, ViInt32* hour, ViInt32* minute);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetExtCalLastTemp(ViSession vi, ViReal64* temp);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetExtCalRecommendedInterval(ViSession vi, ViInt32* months);
TIKTAL_API ViStatus _VI_FUNC tiktal_ChangeExtCalPassword(ViSession vi, ViConstString oldPassword, ViConstString newPassword);
TIKTAL_API ViStatus _VI_FUNC tiktal_ReadCurrentTemperature(ViSession vi, ViReal64* temperature);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalAdjustOscillatorVoltage(ViSession vi, ViReal64 measuredVoltage, ViReal64* oldVoltage);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalAdjustClk10PhaseVoltage(ViSession vi, ViReal64 measuredVoltage, ViReal64* oldVoltage);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalAdjustDDSStartPulsePhaseVoltage(ViSession vi, ViReal64 measuredVoltage, ViReal64* oldVoltage);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalGetOscillatorVoltage(ViSession vi, ViReal64* voltage);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalGetClk10PhaseVoltage(ViSession vi, ViReal64* voltage);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalGetDDSStartPulsePhaseVoltage(ViSession vi, ViReal64* voltage);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalGetDDSInitialPhase(ViSession vi, ViReal64* phase);
TIKTAL_API ViStatus _VI_FUNC tiktal_CalAdjustDDSInitialPhase(ViSession vi, ViReal64 measuredPhase, ViReal64* oldPhase);
TIKTAL_API ViStatus _VI_FUNC tiktal_StartPTP(ViSession vi, ViInt32 initialTimeSource, ViUInt32 initialTimeSeconds, ViUInt32 initialTimeNanoseconds, ViUInt16 initialTimeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_StopPTP(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_Get1588Time(ViSession vi, ViUInt32* timeSeconds, ViUInt32* timeNanoseconds, ViUInt16* timeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_CreateFutureTimeEvent(ViSession vi, ViConstString terminal, ViInt32 outputLevel, ViUInt32 timeSeconds, ViUInt32 timeNanoseconds, ViUInt16 timeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_ClearFutureTimeEvents(ViSession vi, ViConstString terminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_EnableTimeStampTrigger(ViSession vi, ViConstString terminal, ViInt32 activeEdge);
TIKTAL_API ViStatus _VI_FUNC tiktal_ReadTriggerTimeStamp(ViSession vi, ViConstString terminal, ViReal64 timeout, ViUInt32* timeSeconds, ViUInt32* timeNanoseconds, ViUInt16* timeFractionalNanoseconds, ViInt32* detectedEdge);
TIKTAL_API ViStatus _VI_FUNC tiktal_DisableTimeStampTrigger(ViSession vi, ViConstString terminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_CreateClock(ViSession vi, ViConstString terminal, ViUInt32 highTicks, ViUInt32 lowTicks, ViUInt32 startTimeSeconds, ViUInt32 startTimeNanoseconds, ViUInt16 startTimeFractionalNanoseconds, ViUInt32 stopTimeSeconds, ViUInt32 stopTimeNanoseconds, ViUInt16 stopTimeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_ClearClock(ViSession vi, ViConstString terminal);
TIKTAL_API ViStatus _VI_FUNC tiktal_ReadMultipleTriggerTimeStamp(ViSession vi, ViConstString terminal, ViUInt32 timestampsToRead, ViReal64 timeout, ViUInt32* timeSecondsBuffer, ViUInt32* timeNanosecondsBuffer, ViUInt16* timeFractionalNanosecondsBuffer, ViInt32* detectedEdgeBuffer, ViUInt32* timestampsRead);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetTime(ViSession vi, ViUInt32* timeSeconds, ViUInt32* timeNanoseconds, ViUInt16* timeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTime(ViSession vi, ViInt32 timeSource, ViUInt32 timeSeconds, ViUInt32 timeNanoseconds, ViUInt16 timeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_ResetFrequency(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_Start1588(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_Stop1588(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_EnableTimeStampTriggerWithDecimation(ViSession vi, ViConstString terminal, ViInt32 activeEdge, ViUInt32 decimationCount);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTimeReferenceFreeRunning(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTimeReferenceGPS(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTimeReferenceIRIG(ViSession vi, ViInt32 irigType, ViConstString terminalName);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTimeReferencePPS(ViSession vi, ViConstString terminalName, ViBoolean useManualTime, ViUInt32 initialTimeSeconds, ViUInt32 initialTimeNanoseconds, ViUInt16 initialTimeFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTimeReference1588OrdinaryClock(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetTimeReferenceNames(ViSession vi, ViInt32 bufferSize, ViChar valueString[]);
TIKTAL_API ViStatus _VI_FUNC tiktal_SetTimeReference8021AS(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_EnableGPSTimestamping(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_EnableIRIGTimestamping(ViSession vi, ViInt32 irigType, ViConstString terminalName);
TIKTAL_API ViStatus _VI_FUNC tiktal_ReadLastGPSTimestamp(ViSession vi, ViUInt32* timestampSeconds, ViUInt32* timestampNanoseconds, ViUInt16* timestampFractionalNanoseconds, ViUInt32* gpsSeconds, ViUInt32* gpsNanoseconds, ViUInt16* gpsFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_ReadLastIRIGTimestamp(ViSession vi, ViConstString terminal, ViUInt32* timestampSeconds, ViUInt32* timestampNanoseconds, ViUInt16* timestampFractionalNanoseconds, ViUInt32* irigbSeconds, ViUInt32* irigbNanoseconds, ViUInt16* irigbFractionalNanoseconds);
TIKTAL_API ViStatus _VI_FUNC tiktal_DisableGPSTimestamping(ViSession vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_DisableIRIGTimestamping(ViSession vi, ViConstString terminalName);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetLocation(ViSession vi, ViReal64* latitude, ViReal64* longitude, ViReal64* altitude);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetVelocity(ViSession vi, ViReal64* eastVelocity, ViReal64* northVelocity, ViReal64* upVelocity);
TIKTAL_API ViStatus _VI_FUNC tiktal_initAdvanced(ViRsrc resourceName, ViInt32 reserved1, ViInt32 reserved2, ViBoolean reset, ViSession* vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_GVInitAdvanced(ViRsrc resourceName, ViInt32 reserved1, ViInt32 reserved2, ViBoolean reset, ViSession* vi);
TIKTAL_API ViStatus _VI_FUNC tiktal_ConfigureLogicBlock(ViSession vi, ViConstString logicBlock, ViUInt32 operation, ViUInt32 dStarCMask, ViUInt32 pfiMask);
TIKTAL_API ViStatus _VI_FUNC tiktal_GetLogicBlockConfiguration(ViSession vi, ViConstString logicBlock, ViUInt32* operation, ViUInt32* dStarCMask, ViUInt32* pfiMask);
TIKTAL_API ViStatus _VI_FUNC tiktal_AdjustTime_beta(ViSession vi, ViUInt64 timeReferenceNanos, ViUInt64 timeKeeperNanos);
/* The graphical environment Graviton tells the library its run-time module, with which
 * tiktal_GVInit and tiktal_GVInitAdvanced register, and tiktal_GVClose withdraws, the clean-up of
 * a session (RTSetCleanupProc). SetGVRTModule takes the handle that dlopen returned for the run
 * time; SetGVRTTLSIndex a pthread_key_t that the run time created, whose value in a thread is
 * that thread's run-time module (0xFFFFFFFF: none). Without either, the run time is the main
 * program when it defines gGVRTVersion or AZNewHandle, else libgrrt.so or libgrffrt.so when
 * loaded. The three variants end the process (a line on standard error, exit status 1) when
 * there is no run time: call them only from a Graviton process. */
TIKTAL_API void _VI_FUNC SetGVRTModule(void* module);
TIKTAL_API void _VI_FUNC SetGVRTModuleHook(void);
TIKTAL_API void _VI_FUNC SetGVRTTLSIndex(ViUInt32 index);
TIKTAL_API void _VI_FUNC SetGVRTTLSIndexHook(void);

#ifdef __cplusplus
}
#endif

#endif /* TIKTAL_TIKTAL_H */
