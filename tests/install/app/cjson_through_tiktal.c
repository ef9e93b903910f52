/* Uses cJSON with nothing but the driver library on the link line. */
#include <cjson/cJSON.h>
#include <stdio.h>

int main(void) {
    cJSON* root = cJSON_Parse("{\"references\":[\"PTP1\",\"AS1\"]}");
    char* text;
    cJSON_AddNumberToObject(root, "count", cJSON_GetArraySize(cJSON_GetObjectItem(root, "references")));
    text = cJSON_PrintUnformatted(root);
    printf("%s\n", text);
    cJSON_free(text);
    cJSON_Delete(root);
    return 0;
}
