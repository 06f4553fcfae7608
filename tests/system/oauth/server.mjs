// The OAuth 2.0 server of the system tests, at a free port of 127.0.0.1: node server.mjs MODULES KEY CERTIFICATE.
//
// MODULES is the folder with its packages, KEY and CERTIFICATE are files in PEM. Its first line of output is JSON: the
// port, and id and secret of two clients, made anew at each start. "application" gets tokens by the authorization code
// flow, "device" asks what they stand for. Any name can log in; no password counts.

import { generateKeyPairSync, randomBytes } from "node:crypto";
import { readFileSync } from "node:fs";
import { createServer } from "node:https";
import { createRequire } from "node:module";
import { pathToFileURL } from "node:url";

const [modules, key, certificate] = process.argv.slice(2);
const find = createRequire(pathToFileURL(`${modules}/`));
const { Provider } = await import(pathToFileURL(find.resolve("oidc-provider")));

const SCOPES = ["users", "users.list", "core", "batches", "elsewhere", "unknown"];
const secret = () => randomBytes(24).toString("hex");
const application = { id: "application", secret: secret() };
const device = { id: "device", secret: secret() };

const server = createServer({ key: readFileSync(key), cert: readFileSync(certificate) });
server.listen(0, "127.0.0.1", () => {
    const { port } = server.address();
    const signing = generateKeyPairSync("rsa", { modulusLength: 2048 }).privateKey.export({ format: "jwk" });
    const provider = new Provider(`https://127.0.0.1:${port}`, {
        clients: [
            {
                client_id: application.id,
                client_secret: application.secret,
                redirect_uris: ["https://application.test/back"],
                grant_types: ["authorization_code"],
                response_types: ["code"],
            },
            {
                client_id: device.id,
                client_secret: device.secret,
                redirect_uris: [],
                grant_types: [],
                response_types: [],
            },
        ],
        scopes: SCOPES,
        jwks: { keys: [{ ...signing, use: "sig", alg: "RS256" }] },
        cookies: { keys: [secret()] },
        features: {
            devInteractions: { enabled: true },
            introspection: { enabled: true },
            revocation: { enabled: true },
        },
        findAccount: (_, id) => ({ accountId: id, claims: () => ({ sub: id }) }),
    });
    server.on("request", provider.callback());
    console.log(JSON.stringify({ port, application, device }));
});
