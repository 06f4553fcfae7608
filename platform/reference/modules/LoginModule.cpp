#pragma GCC visibility push(default)
#include "modules/LoginModule.h"
#pragma GCC visibility pop

#include <security/pam_appl.h>

#include <cstdlib>
#include <cstring>

namespace {

struct Credentials {
    const char* user;
    const char* password;
};

void FreeAnswers(struct pam_response* answers, int count) {
    for (int at = 0; at < count; ++at) {
        if (answers[at].resp != nullptr) {
            explicit_bzero(answers[at].resp, strlen(answers[at].resp));
            free(answers[at].resp);
        }
    }
    free(answers);
}

/** Answers a hidden prompt by the password and an open one by the name. Whatever else is asked ends the attempt. */
int Converse(int count, const struct pam_message** messages, struct pam_response** out, void* data) {
    if (count <= 0 || count > PAM_MAX_NUM_MSG) {
        return PAM_CONV_ERR;
    }
    const auto* credentials = static_cast<const Credentials*>(data);
    auto* answers = static_cast<struct pam_response*>(calloc(static_cast<size_t>(count), sizeof(struct pam_response)));
    if (answers == nullptr) {
        return PAM_BUF_ERR;
    }
    for (int at = 0; at < count; ++at) {
        const char* text = nullptr;
        switch (messages[at]->msg_style) {
            case PAM_PROMPT_ECHO_OFF:
                text = credentials->password;
                break;
            case PAM_PROMPT_ECHO_ON:
                text = credentials->user;
                break;
            case PAM_ERROR_MSG:
            case PAM_TEXT_INFO:
                continue;
            default:
                FreeAnswers(answers, at);
                return PAM_CONV_ERR;
        }
        answers[at].resp = strdup(text);
        if (answers[at].resp == nullptr) {
            FreeAnswers(answers, at);
            return PAM_BUF_ERR;
        }
    }
    *out = answers;
    return PAM_SUCCESS;
}

/** The caller settles how long a refusal takes. */
void NoDelay(int, unsigned int, void*) {}

int Check(pam_handle_t* handle, const char* user, const char* address) {
    const auto delay = reinterpret_cast<const void*>(&NoDelay);
    if (pam_set_item(handle, PAM_FAIL_DELAY, delay) != PAM_SUCCESS ||
        (*address != '\0' && pam_set_item(handle, PAM_RHOST, address) != PAM_SUCCESS)) {
        return PAM_SYSTEM_ERR;
    }
    int result = pam_authenticate(handle, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
    if (result == PAM_SUCCESS) {
        result = pam_acct_mgmt(handle, PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
    }
    const void* checked = nullptr;
    if (result == PAM_SUCCESS && (pam_get_item(handle, PAM_USER, &checked) != PAM_SUCCESS || checked == nullptr ||
                                  strcmp(static_cast<const char*>(checked), user) != 0)) {
        return PAM_PERM_DENIED;
    }
    return result;
}

}  // namespace

int ZovaLoginModuleCheck(const char* directory, const char* service, const char* user, const char* password,
                         const char* address) {
    Credentials credentials = {user, password};
    const struct pam_conv conversation = {Converse, &credentials};
    pam_handle_t* handle = nullptr;
    if (pam_start_confdir(service, user, &conversation, directory, &handle) != PAM_SUCCESS) {
        return ZOVA_LOGIN_MODULE_FAILED;
    }
    const int result = Check(handle, user, address);
    pam_end(handle, result);
    switch (result) {
        case PAM_SUCCESS:
            return ZOVA_LOGIN_MODULE_GOOD;
        case PAM_ABORT:
        case PAM_BUF_ERR:
        case PAM_SYSTEM_ERR:
            return ZOVA_LOGIN_MODULE_FAILED;
        default:
            return ZOVA_LOGIN_MODULE_REFUSED;
    }
}
