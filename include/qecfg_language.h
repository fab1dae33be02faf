// The words of the source language that every tool writes or reads: the
// stanza types (in the order the compiler's header lookup tries them) and
// the statement keywords. The compiler's keyword rows and the decompiler
// both take them from here.
#ifndef QECFG_LANGUAGE_H
#define QECFG_LANGUAGE_H

enum stanza_type {
    ST_CONTROL_DEFINITION,
    ST_CLASS_TO_MANAGER_MAPPING,
    ST_RESOURCE_VARIABLE_CLASS,
    ST_RESOURCE_CLASS,
    ST_PERSISTENT_RESOURCE_ATTRIBUTE,
    ST_PERSISTENT_CLASS_ATTRIBUTE,
    ST_DYNAMIC_RESOURCE_ATTRIBUTE,
    ST_DYNAMIC_CLASS_ATTRIBUTE,
    ST_CLASS_ACTION,
    ST_RESOURCE_ACTION,
    ST_PATTR_SD,
    ST_DATTR_SD,
    ST_DEFINE_SD,
    ST_UNDEFINE_SD,
    ST_ONLINE_SD,
    ST_OFFLINE_SD,
    ST_RESET_SD,
    ST_ACTION_IN_SD,
    ST_ACTION_OUT_SD,
    NUM_STANZA_TYPES
};

inline constexpr const char *stanza_names[NUM_STANZA_TYPES] = {
    "ControlDefinition",
    "ClassToManagerMapping",
    "ResourceVariableClass",
    "ResourceClass",
    "PersistentResourceAttribute",
    "PersistentClassAttribute",
    "DynamicResourceAttribute",
    "DynamicClassAttribute",
    "ClassAction",
    "ResourceAction",
    "PAttrSDDefinition",
    "DAttrSDDefinition",
    "DefineSDDefinition",
    "UndefineSDDefinition",
    "OnlineSDDefinition",
    "OfflineSDDefinition",
    "ResetSDDefinition",
    "ActionInSDDefinition",
    "ActionOutSDDefinition",
};

// Statement keywords, compared exactly.
namespace kw {
inline constexpr const char Alias[] = "Alias";
inline constexpr const char ClassPermTemplate[] = "ClassPermTemplate";
inline constexpr const char ConfirmationMsg[] = "ConfirmationMsg";
inline constexpr const char DataType[] = "DataType";
inline constexpr const char DefaultValue[] = "DefaultValue";
inline constexpr const char Description[] = "Description";
inline constexpr const char DescriptiveMessageSet[] = "DescriptiveMessageSet";
inline constexpr const char DisplayName[] = "DisplayName";
inline constexpr const char ElementIndex[] = "ElementIndex";
inline constexpr const char ElementName[] = "ElementName";
inline constexpr const char Expression[] = "Expression";
inline constexpr const char ExpressionDescription[] = "ExpressionDescription";
inline constexpr const char FileVersion[] = "FileVersion";
inline constexpr const char FirstKey[] = "FirstKey";
inline constexpr const char GroupID[] = "GroupID";
inline constexpr const char GroupName[] = "GroupName";
inline constexpr const char Id[] = "Id";
inline constexpr const char InitialValue[] = "InitialValue";
inline constexpr const char LastKey[] = "LastKey";
inline constexpr const char ListActionClass[] = "ListActionClass";
inline constexpr const char ListActionRsrc[] = "ListActionRsrc";
inline constexpr const char Locator[] = "Locator";
inline constexpr const char MessageCatalog[] = "MessageCatalog";
inline constexpr const char Name[] = "Name";
inline constexpr const char ObservationInterval[] = "ObservationInterval";
inline constexpr const char Permission[] = "Permission";
inline constexpr const char Properties[] = "Properties";
inline constexpr const char Range[] = "Range";
inline constexpr const char ReArmDescription[] = "ReArmDescription";
inline constexpr const char ReArmExpression[] = "ReArmExpression";
inline constexpr const char ReportingInterval[] = "ReportingInterval";
inline constexpr const char ResourceManager[] = "ResourceManager";
inline constexpr const char ResourcePermTemplate[] = "ResourcePermTemplate";
inline constexpr const char TimeOut[] = "TimeOut";
inline constexpr const char ValidStateValue[] = "ValidStateValue";
inline constexpr const char ValidValue[] = "ValidValue";
inline constexpr const char ValueDisplayName[] = "ValueDisplayName";
inline constexpr const char VariableClass[] = "VariableClass";
inline constexpr const char VariableType[] = "VariableType";
inline constexpr const char VarietyRange[] = "VarietyRange";
} // namespace kw

#endif
