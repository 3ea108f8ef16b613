#include "input/kvt_current.hpp"

#include <cstdlib>

#include "run/messages.hpp"

void KvtUseFile(KvtHandle file) {
    gKvtAccess.currentFile = file;
    gKvtAccess.currentNode = 0;
    gKvtAccess.targetInstance = 1;
}

void KvtOpenTarget(std::string_view name, int instance, int* status) {
    if (instance > 0) gKvtAccess.targetInstance = instance;
    int found = 0;
    const KvtHandle target =
        KvtOpenTarget(gKvtAccess.currentFile, name, gKvtAccess.targetInstance, &found);
    if (found != 0) {
        if (status == nullptr)
            StopRun("KVT target: " + std::string(TrimRight(name)) + " not found");
        *status = -1;
        return;
    }
    gKvtAccess.currentNode = target;
    if (status != nullptr) *status = 0;
}

std::string NumberedSectionName(std::string_view name, int number) {
    std::string section(TrimRight(name));
    if (number == kKvtNoNumber) return section;
    if (number >= 0) return section + "_" + std::to_string(number);
    return section + "_M" + std::to_string(-static_cast<long long>(number));
}

void KvtOpenSection(std::string_view name, int number, int* status) {
    const std::string section = NumberedSectionName(name, number);
    int found = 0;
    const KvtHandle handle = KvtOpenSection(gKvtAccess.currentNode, section, 1, &found);
    if (found != 0) {
        if (status == nullptr) StopRun("KVT section: " + section + " not found");
        *status = -1;
        return;
    }
    gKvtAccess.currentNode = handle;
    if (status != nullptr) *status = 0;
}

void KvtCloseSection() {
    // The path from the target is the stack of open sections: walk it again
    // from the target, all but its last name.
    const char* path = kvtGetNameGlb(gKvtAccess.currentNode);
    if (path == nullptr) return;
    const std::string names(path);
    size_t dot = names.find('.');
    KvtHandle node = kvtTargetByNameNum(gKvtAccess.currentFile, names.substr(0, dot).c_str(), 1);
    while (node != 0 && dot != std::string::npos) {
        const size_t next = names.find('.', dot + 1);
        if (next == std::string::npos) break;  // the last name is the section being closed
        node = kvtSectionByNameNum(node, names.substr(dot + 1, next - dot - 1).c_str(), 1);
        dot = next;
    }
    if (node != 0) gKvtAccess.currentNode = node;
}

void KvtGetDouble(std::string_view key, double& value, int instance, int param,
                  const double* fallback, int* status) {
    if (fallback != nullptr) value = *fallback;
    KvtGetDouble(gKvtAccess.currentNode, key, value, instance, param, status);
}

void KvtGetReal(std::string_view key, float& value, int instance, int param, const float* fallback,
                int* status) {
    if (fallback != nullptr) value = *fallback;
    KvtGetReal(gKvtAccess.currentNode, key, value, instance, param, status);
}

void KvtGetInteger(std::string_view key, int32_t& value, int instance, int param,
                   const int32_t* fallback, int* status) {
    if (fallback != nullptr) value = *fallback;
    KvtGetInteger(gKvtAccess.currentNode, key, value, instance, param, status);
}

void KvtGetLogical(std::string_view key, bool& value, int instance, int param, const bool* fallback,
                   int* status) {
    if (fallback != nullptr) value = *fallback;
    KvtGetLogical(gKvtAccess.currentNode, key, value, instance, param, status);
}

void KvtGetString(std::string_view key, std::string& value, int instance, int param,
                  const std::string* fallback, int* status) {
    if (fallback != nullptr) value = *fallback;
    KvtGetString(gKvtAccess.currentNode, key, value, 0, instance, param, status);
}

void KvtGetFilename(std::string_view key, std::string& value, int instance, int param,
                    const std::string* fallback, int* status) {
    if (fallback != nullptr) value = *fallback;
    KvtGetFilename(gKvtAccess.currentNode, key, value, 0, instance, param, status);
}

void KvtGetIntegerList(std::string_view key, int32_t* values, int count, int* status) {
    KvtGetIntegerList(gKvtAccess.currentNode, key, values, count, status);
}

void KvtGetDoubleList(std::string_view key, double* values, int count, int* status) {
    KvtGetDoubleList(gKvtAccess.currentNode, key, values, count, status);
}
